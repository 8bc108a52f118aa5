#pragma once
// Digests, random values and password hashes. The cryptography is GnuTLS's and libcrypt's.
#include <gnutls/crypto.h>
#include <string>

// A running SHA-256.
struct Sha256 {
    gnutls_hash_hd_t handle = nullptr;

    Sha256();
    ~Sha256();
    Sha256(const Sha256 &) = delete;
    Sha256 &operator=(const Sha256 &) = delete;
    void add(const void *bytes, size_t size);
    // The 32 bytes of the digest; the computation starts anew.
    std::string finish();
};

std::string sha256(const std::string &bytes);                              // 32 bytes
std::string hmac_sha256(const std::string &key, const std::string &bytes); // 32 bytes
std::string random_bytes(size_t count);
std::string hex(const std::string &bytes);
std::string base64(const std::string &bytes);
// Compares in a time that depends on the lengths alone.
bool equal_in_constant_time(const std::string &a, const std::string &b);

// A yescrypt hash with a fresh salt. Takes some ten milliseconds of CPU time, on purpose.
std::string password_hash(const std::string &password);
bool password_matches(const std::string &password, const std::string &hash);
