#pragma once
// SHA-256 of what comes in pieces. One thread at a time.
#include <memory>
#include <openssl/evp.h>
#include <string>

namespace cloud {

class Sha256 {
  public:
    Sha256();
    void add(const void *data, size_t size);
    // In lower-case hexadecimal digits; nothing can be added afterwards.
    std::string hex();

  private:
    std::unique_ptr<EVP_MD_CTX, decltype(&EVP_MD_CTX_free)> context{EVP_MD_CTX_new(), EVP_MD_CTX_free};
};

} // namespace cloud
