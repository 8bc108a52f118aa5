#include "secrets.h"
#include <crypt.h>
#include <cstdlib>
#include <glib.h>
#include <memory>

Sha256::Sha256()
{
    if (gnutls_hash_init(&handle, GNUTLS_DIG_SHA256) != 0)
        std::abort();
}

Sha256::~Sha256()
{
    gnutls_hash_deinit(handle, nullptr);
}

void Sha256::add(const void *bytes, size_t size)
{
    gnutls_hash(handle, bytes, size);
}

std::string Sha256::finish()
{
    std::string digest(32, '\0');
    gnutls_hash_output(handle, digest.data());
    return digest;
}

std::string sha256(const std::string &bytes)
{
    std::string digest(32, '\0');
    gnutls_hash_fast(GNUTLS_DIG_SHA256, bytes.data(), bytes.size(), digest.data());
    return digest;
}

std::string hmac_sha256(const std::string &key, const std::string &bytes)
{
    std::string digest(32, '\0');
    gnutls_hmac_fast(GNUTLS_MAC_SHA256, key.data(), key.size(), bytes.data(), bytes.size(), digest.data());
    return digest;
}

std::string random_bytes(size_t count)
{
    std::string bytes(count, '\0');
    if (gnutls_rnd(GNUTLS_RND_KEY, bytes.data(), count) != 0)
        std::abort();
    return bytes;
}

std::string hex(const std::string &bytes)
{
    static const char digits[] = "0123456789abcdef";
    std::string text;
    for (const unsigned char byte : bytes) {
        text += digits[byte >> 4];
        text += digits[byte & 15];
    }
    return text;
}

std::string base64(const std::string &bytes)
{
    const std::unique_ptr<char, decltype(&g_free)> text(
        g_base64_encode(reinterpret_cast<const guchar *>(bytes.data()), bytes.size()), g_free);
    return text.get();
}

bool equal_in_constant_time(const std::string &a, const std::string &b)
{
    return a.size() == b.size() && gnutls_memcmp(a.data(), b.data(), a.size()) == 0;
}

// The hash of `password` under the settings of `setting`; empty when libcrypt refuses them.
static std::string crypt_text(const std::string &password, const char *setting)
{
    const auto data = std::make_unique<crypt_data>();
    const char *hash = crypt_r(password.c_str(), setting, data.get());
    return hash && *hash != '*' ? hash : "";
}

std::string password_hash(const std::string &password)
{
    char setting[CRYPT_GENSALT_OUTPUT_SIZE];
    const std::string salt = random_bytes(16);
    if (!crypt_gensalt_rn("$y$", 0, salt.data(), static_cast<int>(salt.size()), setting, sizeof setting))
        std::abort();
    return crypt_text(password, setting);
}

bool password_matches(const std::string &password, const std::string &hash)
{
    const std::string computed = crypt_text(password, hash.c_str());
    return !computed.empty() && equal_in_constant_time(computed, hash);
}
