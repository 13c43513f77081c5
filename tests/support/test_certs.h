/** Keys and certificates made on the spot, also such as no honest authority would sign. */
#ifndef ZYROVFS_TESTS_TEST_CERTS_H
#define ZYROVFS_TESTS_TEST_CERTS_H

#include <openssl/x509.h>

#include <memory>
#include <string>
#include <vector>

namespace tls {

struct CertSpec {
    std::vector<std::string> common_names = {"localhost"};  ///< may hold NULs, may be empty
    int name_type = V_ASN1_UTF8STRING;
    std::vector<std::string> dns_names = {"localhost"};
    long starts = -3600;     ///< seconds from now
    long ends = 24 * 3600L;  ///< seconds from now
    bool authority = false;
};

/** PEM texts. `certificate` holds the server's own first and then those between it and the root. */
struct Identity {
    std::string certificate;
    std::string key;
};

/** Signed by `issuer`, or by itself. */
Identity Make(const CertSpec& spec, const Identity* issuer = nullptr);

/** An authority of its own name. */
Identity MakeAuthority(const std::string& name, const Identity* issuer = nullptr);

std::shared_ptr<X509> Parse(const std::string& pem);

}  // namespace tls

#endif
