#ifndef ZYROVFS_TESTS_CLOUDSIM_SHA1_H
#define ZYROVFS_TESTS_CLOUDSIM_SHA1_H

#include <openssl/evp.h>

#include <memory>
#include <string>

namespace cloudsim {

class Sha1 {
  public:
    Sha1();
    void Add(const char* data, size_t size);
    std::string Hex();  ///< ends the sum

  private:
    std::unique_ptr<EVP_MD_CTX, void (*)(EVP_MD_CTX*)> context_;
};

}  // namespace cloudsim

#endif
