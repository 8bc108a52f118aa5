#pragma once
// Digest authentication (RFC 7616), for services that ask for it. libcurl's own would send an upload first with an
// empty body, which a service that does not ask of every method would store.
#include "cloud_content_sync/credentials.h"
#include <chrono>
#include <optional>
#include <string>
#include <vector>

namespace cloud {

struct DigestChallenge {
    std::string realm, nonce, opaque, algorithm; // algorithm: as the service wrote it, or empty
    bool has_opaque = false, has_qop = false;
    std::chrono::steady_clock::time_point came = std::chrono::steady_clock::now();
    unsigned count = 0; // requests that were answered with it
};

// The best one that can be answered among the values of WWW-Authenticate headers: SHA-256 before MD5, each also in its
// "-sess" form, with the quality of protection "auth" or none.
std::optional<DigestChallenge> digest_challenge(const std::vector<std::string> &values);
// The Authorization header, with its name, of a request; target: path and query of its URL as they are sent.
std::string digest_authorization(DigestChallenge &challenge, const Credentials &credentials, const std::string &method,
                                 const std::string &target);

} // namespace cloud
