/** A simulated Box over TLS, with a certificate that the machine trusts, for benchmarks of calls.
 */
#ifndef ZYROVFS_BENCH_TLS_BOX_H
#define ZYROVFS_BENCH_TLS_BOX_H

#include <filesystem>
#include <fstream>
#include <string>

#include "support/cloudsim/cloudsim.h"
#include "support/test_certs.h"

namespace bench {

class TlsBox {
  public:
    static constexpr const char* kServerId = "box://amy@example.com";

    TlsBox() : service_(Options()), amy_(service_.AddAccount("amy@example.com")) {
        std::filesystem::create_directories("/usr/zyro/etc/zyrovfs");
        std::ofstream(kServiceConfig) << "{\"hosts\":{\"BoxApiHost\":\"" << Host() << "\"}}";
        std::filesystem::permissions(kServiceConfig, std::filesystem::perms(0640));
        token_ = amy_.IssueTokens(86400).access_token;
    }

    cloudsim::Account& Amy() { return amy_; }
    const std::string& Token() const { return token_; }
    std::string Host() const { return service_.ApiHost(); }
    /** So far, of all that came. */
    size_t Connections() const { return service_.Journal().Connections(); }

  private:
    static constexpr const char* kBundle = "/etc/ssl/certs/ca-certificates.crt";
    static constexpr const char* kServiceConfig = "/usr/zyro/etc/zyrovfs/cloud.conf";

    static cloudsim::BoxOptions Options() {
        tls::CertSpec spec;
        spec.dns_names = {"localhost", "upload.localhost", "dl.localhost"};
        const tls::Identity authority = tls::MakeAuthority("benchmark authority");
        const tls::Identity server = tls::Make(spec, &authority);
        std::ofstream(kBundle, std::ios::app) << authority.certificate;
        cloudsim::BoxOptions options;
        options.certificate = server.certificate;
        options.key = server.key;
        options.journal_hashes = false;
        return options;
    }

    cloudsim::BoxService service_;
    cloudsim::Account& amy_;
    std::string token_;
};

}  // namespace bench

#endif
