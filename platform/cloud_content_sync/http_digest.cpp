#include "cloud_content_sync/http_digest.h"
#include <algorithm>
#include <cstdio>
#include <cstdlib>
#include <glib.h>
#include <map>
#include <string_view>
#include <unistd.h>

namespace cloud {

namespace {

// Reads the challenges of one header: schemes, each followed by its parameters (RFC 9110, 11.6.1).
class Reader {
  public:
    explicit Reader(std::string_view header) : rest(header) {}

    // The next word, in lower case, and what it is set to; a scheme is set to nothing. False at the end.
    bool next(std::string &word, std::optional<std::string> &value)
    {
        skip(" \t,");
        const size_t end = std::min(rest.find_first_of(" \t,="), rest.size());
        word = rest.substr(0, end);
        std::ranges::transform(word, word.begin(), g_ascii_tolower);
        value.reset();
        rest.remove_prefix(end);
        skip(" \t");
        if (!word.empty() && rest.starts_with('='))
            value = text();
        return !word.empty();
    }

  private:
    void skip(const char *characters)
    {
        rest.remove_prefix(std::min(rest.find_first_not_of(characters), rest.size()));
    }
    std::string text()
    {
        rest.remove_prefix(1);
        skip(" \t");
        if (!rest.starts_with('"')) {
            const size_t end = std::min(rest.find_first_of(" \t,"), rest.size());
            const std::string plain(rest.substr(0, end));
            rest.remove_prefix(end);
            return plain;
        }
        std::string quoted;
        size_t at = 1;
        for (; at < rest.size() && rest[at] != '"'; at++) {
            at += rest[at] == '\\' && at + 1 < rest.size();
            quoted += rest[at];
        }
        rest.remove_prefix(std::min(at + 1, rest.size()));
        return quoted;
    }

    std::string_view rest;
};

} // namespace

static bool is(const std::string &algorithm, const char *name)
{
    return g_ascii_strcasecmp(algorithm.c_str(), name) == 0;
}

static bool is_sha256(const std::string &algorithm)
{
    return is(algorithm, "SHA-256") || is(algorithm, "SHA-256-sess");
}

// 0: it cannot be answered.
static int worth(const std::string &algorithm)
{
    const bool is_md5 = algorithm.empty() || is(algorithm, "MD5") || is(algorithm, "MD5-sess");
    return is_sha256(algorithm) ? 2 : is_md5 ? 1 : 0;
}

static bool offers_auth(const std::string &qop)
{
    g_auto(GStrv) words = g_strsplit_set(qop.c_str(), ", \t", -1);
    return g_strv_contains(words, "auth");
}

std::optional<DigestChallenge> digest_challenge(const std::vector<std::string> &values)
{
    using Parameters = std::map<std::string, std::string>;
    std::vector<Parameters> all;
    for (const std::string &header : values) {
        Reader reader(header);
        std::string word;
        std::optional<std::string> value;
        bool is_digest = false;
        while (reader.next(word, value)) {
            if (value && is_digest)
                all.back().emplace(word, *value);
            if (value)
                continue;
            is_digest = word == "digest";
            if (is_digest)
                all.emplace_back();
        }
    }
    std::optional<DigestChallenge> best;
    for (Parameters &one : all) {
        const bool has_qop = one.count("qop") > 0;
        const bool can_answer = worth(one["algorithm"]) && one.count("nonce") && (!has_qop || offers_auth(one["qop"]));
        if (!can_answer || (best && worth(best->algorithm) >= worth(one["algorithm"])))
            continue;
        best.emplace();
        best->has_opaque = one.count("opaque") > 0;
        best->has_qop = has_qop;
        best->realm = one["realm"];
        best->nonce = one["nonce"];
        best->opaque = one["opaque"];
        best->algorithm = one["algorithm"];
    }
    return best;
}

static std::string quoted(const std::string &text)
{
    std::string result = "\"";
    for (const char c : text) {
        if (c == '"' || c == '\\')
            result += '\\';
        result += c;
    }
    return result + '"';
}

std::string digest_authorization(DigestChallenge &challenge, const Credentials &credentials, const std::string &method,
                                 const std::string &target)
{
    const auto hash = [&](const std::string &text) {
        const GChecksumType type = is_sha256(challenge.algorithm) ? G_CHECKSUM_SHA256 : G_CHECKSUM_MD5;
        g_autofree char *hex = g_compute_checksum_for_string(type, text.c_str(), static_cast<gssize>(text.size()));
        return std::string(hex);
    };
    unsigned char random[16];
    if (getentropy(random, sizeof random) != 0)
        std::abort();
    char count[9];
    std::snprintf(count, sizeof count, "%08x", ++challenge.count);
    const std::string own = hash(std::string(reinterpret_cast<const char *>(random), sizeof random));
    const std::string middle = challenge.nonce + ":" + count + ":" + own + ":auth";
    std::string who = hash(credentials.user + ":" + challenge.realm + ":" + credentials.secret);
    if (g_str_has_suffix(challenge.algorithm.c_str(), "-sess"))
        who = hash(who + ":" + challenge.nonce + ":" + own);
    const std::string what = hash(method + ":" + target);
    std::string header = "Authorization: Digest username=" + quoted(credentials.user) +
                         ", realm=" + quoted(challenge.realm) + ", nonce=" + quoted(challenge.nonce) +
                         ", uri=" + quoted(target) + ", response=\"" +
                         hash(who + ":" + (challenge.has_qop ? middle : challenge.nonce) + ":" + what) + "\"";
    if (!challenge.algorithm.empty())
        header += ", algorithm=" + challenge.algorithm;
    if (challenge.has_opaque)
        header += ", opaque=" + quoted(challenge.opaque);
    if (challenge.has_qop)
        header += std::string(", qop=auth, nc=") + count;
    if (challenge.has_qop || g_str_has_suffix(challenge.algorithm.c_str(), "-sess"))
        header += ", cnonce=" + quoted(own);
    return header;
}

} // namespace cloud
