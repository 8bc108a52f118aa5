// By libcrypto, which uses what the processor has for it, and which libcurl has loaded anyway.
#include "cloud_content_sync/digest.h"
#include <cstdlib>

namespace cloud {

Sha256::Sha256()
{
    if (!context || EVP_DigestInit_ex(context.get(), EVP_sha256(), nullptr) != 1)
        std::abort();
}

void Sha256::add(const void *data, size_t size)
{
    EVP_DigestUpdate(context.get(), data, size);
}

std::string Sha256::hex()
{
    static constexpr char DIGITS[] = "0123456789abcdef";
    unsigned char bytes[EVP_MAX_MD_SIZE];
    unsigned int size = 0;
    EVP_DigestFinal_ex(context.get(), bytes, &size);
    std::string text;
    for (unsigned int i = 0; i < size; i++)
        text += {DIGITS[bytes[i] >> 4], DIGITS[bytes[i] & 15]};
    return text;
}

} // namespace cloud
