#include "mount/ssl_verify.h"

#include <fcntl.h>
#include <gmock/gmock.h>
#include <openssl/ssl.h>

#include "core/error_cell.h"
#include "core/handle.h"
#include "support/seams.h"
#include "unit/mount/ssl_fixture.h"

namespace ZYROVFS {
namespace {

using testing::HasSubstr;
using testing::Not;

tls::CertSpec Named(const std::string& dns, long starts = -3600, long ends = 86400) {
    tls::CertSpec spec;
    spec.dns_names = {dns};
    spec.starts = starts;
    spec.ends = ends;
    return spec;
}

// --- what counts as the bundle ----------------------------------------------------------------

TEST(TrustRootCA, IsTheBundleItself) {
    EXPECT_TRUE(Utils::isTrustRootCA("/etc/ssl/certs/ca-certificates.crt"));
}

TEST(TrustRootCA, IsALinkWhoseTextIsTheBundle) {
    const std::string link = testing::TempDir() + "link";
    for (const auto& [target, trusted] :
         std::map<std::string, bool>{{"/etc/ssl/certs/ca-certificates.crt", true},
                                     {"/etc/ssl/certs/ca-certificates.crt.old", false},
                                     {"/etc/ssl/certs/ca-certificates.cr", false},
                                     {"../etc/ssl/certs/ca-certificates.crt", false},
                                     {"/etc//ssl/certs/ca-certificates.crt", false},
                                     {std::string(4000, 'x'), false}}) {
        unlink(link.c_str());
        ASSERT_EQ(symlink(target.c_str(), link.c_str()), 0);
        EXPECT_EQ(Utils::isTrustRootCA(link.c_str()), trusted) << target;
    }
}

TEST(TrustRootCA, IsNothingElse) {
    EXPECT_FALSE(Utils::isTrustRootCA(nullptr));
    EXPECT_FALSE(Utils::isTrustRootCA(""));
    EXPECT_FALSE(Utils::isTrustRootCA("/etc/ssl/certs/none.crt"));
    EXPECT_FALSE(Utils::isTrustRootCA("/etc/ssl/certs/../certs/ca-certificates.crt"));
    EXPECT_FALSE(Utils::isTrustRootCA("/etc/ssl/certs"));
    EXPECT_FALSE(Utils::isTrustRootCA(WriteFile("plain", Authority().certificate).c_str()));
}

// --- reading a saved certificate --------------------------------------------------------------

std::string Data(const std::string& path) {
    const UniqueCString data(Utils::GetCertData(path.c_str()));
    return data == nullptr ? "(null)" : data.get();
}

TEST(CertData, IsTheWholeFileWithANulBehindIt) {
    for (const size_t size : {1U, 1023U, 1024U, 1025U, 200000U}) {
        EXPECT_EQ(Data(WriteFile("data", std::string(size, 'c'))), std::string(size, 'c'));
    }
}

TEST(CertData, OfAnEmptyFileIsEmpty) {
    EXPECT_EQ(Data(WriteFile("data", "")), "");
}

TEST(CertData, FollowsALinkToTheBundle) {
    TrustAuthority();
    const std::string link = testing::TempDir() + "bundle-link";
    unlink(link.c_str());
    ASSERT_EQ(symlink(paths::kCaBundle, link.c_str()), 0);
    EXPECT_EQ(Data(link), Authority().certificate);
}

TEST(CertData, OfAMissingFileIsNull) {
    EXPECT_EQ(Data("/none/file"), "(null)");
    EXPECT_TRUE(seams::LoggedPart("Failed to open [/none/file], ")) << seams::LogDump();
    EXPECT_EQ(Utils::GetCertData(nullptr), nullptr);
}

TEST(CertData, OfADirectoryIsNull) {
    EXPECT_EQ(Data("/etc/ssl"), "(null)");
    EXPECT_TRUE(seams::LoggedPart("Failed to read data, ")) << seams::LogDump();
}

TEST(CertData, OfAFifoIsNullAndNotWaitedFor) {
    const std::string fifo = testing::TempDir() + "fifo";
    unlink(fifo.c_str());
    ASSERT_EQ(mkfifo(fifo.c_str(), 0600), 0);
    EXPECT_EQ(Data(fifo), "(null)");
}

TEST(CertData, OfAFileBeyondAllMeasureIsNull) {
    const std::string path = WriteFile("huge", "");
    ASSERT_EQ(truncate(path.c_str(), off_t{1} << 40), 0);
    EXPECT_EQ(Data(path), "(null)");
    EXPECT_TRUE(seams::LoggedPart("Failed to read data, ")) << seams::LogDump();
}

// --- the check in the handshake ---------------------------------------------------------------

using UniqueContext = std::unique_ptr<SSL_CTX, FreeWith<SSL_CTX_free>>;

TEST(VerifyCertCtx, WithoutAContextIsACertificateProblem) {
    EXPECT_EQ(static_cast<int>(Utils::VerifyCertCtxFn(nullptr, nullptr, nullptr)), 58);
}

TEST(VerifyCertCtx, DemandsACertificateAndLooksOneLevelDeep) {
    const UniqueContext context(SSL_CTX_new(TLS_client_method()));
    EXPECT_EQ(Utils::VerifyCertCtxFn(nullptr, context.get(), nullptr), CURLE_OK);
    EXPECT_EQ(SSL_CTX_get_verify_mode(context.get()),
              SSL_VERIFY_PEER | SSL_VERIFY_FAIL_IF_NO_PEER_CERT);
    EXPECT_EQ(SSL_CTX_get_verify_depth(context.get()), 1);
}

TEST(VerifyCertCtx, LooksNoDeeperOnceTheBundleWasAsked) {
    TrustAuthority();
    const Answer same_depth = fresh::Ask([] {
        const std::string url = "https://localhost:" + std::to_string(tls::RefusedPort()) + "/";
        Utils::VerifyCert(nullptr, nullptr, url.c_str(), paths::kCaBundle);
        const UniqueContext context(SSL_CTX_new(TLS_client_method()));
        Utils::VerifyCertCtxFn(nullptr, context.get(), nullptr);
        return SSL_CTX_get_verify_depth(context.get()) == 1;
    });
    EXPECT_TRUE(same_depth.ok) << same_depth;
}

// --- a saved copy -----------------------------------------------------------------------------

class SavedCopy : public testing::Test {
  protected:
    void SetUp() override {
        TrustAuthority();
        ResetError();
        VFSSetJson(Json::Value());
    }

    /** The answer for a server that shows `shown` while `saved` lies in the file. */
    static Answer Compare(const tls::Identity& shown, const std::string& saved) {
        const tls::TlsServer server(shown);
        return Verify(server.Url(), WriteFile("saved.pem", saved));
    }
};

TEST_F(SavedCopy, IsAcceptedByItsFingerprint) {
    const tls::Identity identity = tls::Make({});
    const Answer answer = Compare(identity, identity.certificate);
    EXPECT_TRUE(answer.ok) << answer;
}

TEST_F(SavedCopy, IsToldFromAnotherCertificateInOneProcess) {
    // In the test's own process, so that leaks are seen.
    const tls::Identity identity = tls::Make({});
    const tls::TlsServer server(identity);
    const std::string file = WriteFile("saved.pem", identity.certificate);
    EXPECT_TRUE(Utils::VerifyCert("amy", "secret", server.Url("/dav/a b").c_str(), file.c_str()))
        << seams::LogDump();
    const tls::TlsServer other(tls::Make({}));
    EXPECT_FALSE(Utils::VerifyCert(nullptr, nullptr, other.Url().c_str(), file.c_str()));
    EXPECT_EQ(GetError(), VFS_ERR_CERT_UNTRUSTED);
}

TEST_F(SavedCopy, OfAnExpiredCertificateIsAccepted) {
    const tls::Identity identity = tls::Make(Named("localhost", -7200, -3600));
    EXPECT_TRUE(Compare(identity, identity.certificate).ok);
}

TEST_F(SavedCopy, OfACertificateForAnotherHostIsAccepted) {
    const tls::Identity identity = tls::Make(Named("other.example"));
    EXPECT_TRUE(Compare(identity, identity.certificate).ok);
}

TEST_F(SavedCopy, OfACertificateWithChainIsAccepted) {
    const tls::Identity between = tls::MakeAuthority("Between", &Authority());
    const tls::Identity identity = tls::Make({}, &between);
    EXPECT_TRUE(Compare(identity, identity.certificate).ok);
}

TEST_F(SavedCopy, OfAnotherCertificateIsRefusedWithTheOneThatWasShown) {
    tls::CertSpec spec;
    spec.common_names = {"first", "shown.example"};
    const Answer answer = Compare(tls::Make(spec, &Authority()), tls::Make({}).certificate);
    EXPECT_FALSE(answer.ok);
    EXPECT_EQ(answer.code, VFS_ERR_CERT_UNTRUSTED);
    EXPECT_EQ(answer.detail["subject"], "shown.example");
    EXPECT_EQ(answer.detail["issuer"], "Test CA");
    EXPECT_TRUE(answer.detail["availDate"].isInt64());
    EXPECT_LT(answer.detail["availDate"].asInt64(), answer.detail["expDate"].asInt64());
    EXPECT_TRUE(answer.Logged("Fingerprint verify failed, ")) << answer;
}

TEST_F(SavedCopy, FingerprintsInTheLogAreSha1) {
    const tls::Identity shown = tls::Make({});
    const tls::Identity saved = tls::Make({});
    const auto hex = [](const tls::Identity& identity) {
        unsigned char digest[20];
        unsigned int length = 0;
        X509_digest(tls::Parse(identity.certificate).get(), EVP_sha1(), digest, &length);
        std::string text;
        char pair[3];
        for (unsigned int i = 0; i < length; ++i) {
            snprintf(pair, sizeof pair, "%02X", digest[i]);
            text += pair;
        }
        return text;
    };
    EXPECT_THAT(Compare(shown, saved.certificate).log, HasSubstr(hex(shown) + " " + hex(saved)));
}

TEST_F(SavedCopy, ThatIsEmptyIsRefused) {
    const Answer answer = Compare(tls::Make({}), "");
    EXPECT_EQ(answer.code, VFS_ERR_CERT_UNTRUSTED) << answer;
    EXPECT_TRUE(answer.Logged("Failed to read bio to X509")) << answer;
}

TEST_F(SavedCopy, ThatIsGarbageIsRefused) {
    std::string garbage = "-----BEGIN CERTIFICATE-----\nAAAA\n-----END CERTIFICATE-----\n";
    EXPECT_EQ(Compare(tls::Make({}), garbage).code, VFS_ERR_CERT_UNTRUSTED);
    EXPECT_EQ(Compare(tls::Make({}), std::string("\x7f"
                                                 "ELF\0\xff",
                                                 6))
                  .code,
              VFS_ERR_CERT_UNTRUSTED);
    EXPECT_EQ(Compare(tls::Make({}), std::string(100000, 'A')).code, VFS_ERR_CERT_UNTRUSTED);
}

TEST_F(SavedCopy, UnderAPassPhraseIsRefusedAndNobodyIsAsked) {
    const std::string text =
        "-----BEGIN CERTIFICATE-----\nProc-Type: 4,ENCRYPTED\n"
        "DEK-Info: AES-256-CBC,00112233445566778899AABBCCDDEEFF\n\n"
        "AAAAAAAAAAAAAAAAAAAAAAAAAAAAAAAAAAAAAAAAAAA=\n-----END CERTIFICATE-----\n";
    EXPECT_EQ(Compare(tls::Make({}), text).code, VFS_ERR_CERT_UNTRUSTED);
}

TEST_F(SavedCopy, ThatIsMissingIsAFailureOfItsOwn) {
    SetErr(VFS_ERR_CERT_UNTRUSTED);  // a code of an earlier call must not pass for this one's
    EXPECT_FALSE(Utils::VerifyCert(nullptr, nullptr, "https://localhost:1/", "/none/file"));
    EXPECT_EQ(GetError(), VFS_ERR_FAILED);
}

TEST_F(SavedCopy, NeedsUrlAndPath) {
    EXPECT_FALSE(Utils::VerifyCert(nullptr, nullptr, nullptr, "/etc/hosts"));
    EXPECT_EQ(GetError(), VFS_ERR_BAD_PARAM);
    ResetError();
    EXPECT_FALSE(Utils::VerifyCert(nullptr, nullptr, "https://localhost/", nullptr));
    EXPECT_EQ(GetError(), VFS_ERR_BAD_PARAM);
}

struct OddName {
    const char* label;
    tls::CertSpec spec;
    std::string told;
};

TEST_F(SavedCopy, CertificatesWithOddNamesAreToldWithoutHarm) {
    const auto names = [](std::vector<std::string> common_names) {
        tls::CertSpec spec;
        spec.common_names = std::move(common_names);
        return spec;
    };
    const std::string with_nul("bank.example\0.evil.example", 26);
    const OddName rows[] = {
        {"a name of 1100 bytes", names({std::string(1100, 'n')}), std::string(1024, 'n')},
        {"a NUL in the name", names({with_nul}), with_nul},
        {"no name", names({}), ""},
        {"an empty name", names({""}), ""},
    };
    const std::string other = tls::Make({}).certificate;
    for (const OddName& row : rows) {
        const Answer answer = Compare(tls::Make(row.spec), other);
        EXPECT_EQ(answer.code, VFS_ERR_CERT_UNTRUSTED) << row.label << answer;
        EXPECT_EQ(answer.detail["subject"].asString(), row.told) << row.label;
    }
}

// --- the CA bundle ----------------------------------------------------------------------------

class Bundle : public testing::Test {
  protected:
    void SetUp() override { TrustAuthority(); }

    static Answer Ask(const tls::Identity& shown) {
        const tls::TlsServer server(shown);
        return Verify(server.Url(), paths::kCaBundle);
    }
};

TEST_F(Bundle, TrustsWhatItsAuthoritiesSigned) {
    const Answer answer = Ask(tls::Make({}, &Authority()));
    EXPECT_TRUE(answer.ok) << answer;
}

TEST_F(Bundle, TrustsAChainOfSeveral) {
    const tls::Identity upper = tls::MakeAuthority("Upper", &Authority());
    const tls::Identity lower = tls::MakeAuthority("Lower", &upper);
    const Answer answer = Ask(tls::Make({}, &lower));
    EXPECT_TRUE(answer.ok) << answer;
}

TEST_F(Bundle, RefusesACertificateThatSignedItself) {
    const Answer answer = Ask(tls::Make({}));
    EXPECT_EQ(answer.code, VFS_ERR_CERT_UNTRUSTED) << answer;
    EXPECT_EQ(answer.detail["subject"], answer.detail["issuer"]);
}

TEST_F(Bundle, RefusesAnExpiredCertificate) {
    const Answer answer = Ask(tls::Make(Named("localhost", -7200, -3600), &Authority()));
    EXPECT_EQ(answer.code, VFS_ERR_CERT_UNTRUSTED) << answer;
    EXPECT_LT(answer.detail["expDate"].asInt64(), time(nullptr));
}

TEST_F(Bundle, RefusesACertificateOfTomorrow) {
    const Answer answer = Ask(tls::Make(Named("localhost", 86400, 2 * 86400), &Authority()));
    EXPECT_EQ(answer.code, VFS_ERR_CERT_UNTRUSTED) << answer;
}

TEST_F(Bundle, RefusesACertificateForAnotherHostAndTellsIt) {
    tls::CertSpec spec = Named("other.example");
    spec.common_names = {"other.example"};
    const Answer answer = Ask(tls::Make(spec, &Authority()));
    EXPECT_EQ(answer.code, VFS_ERR_CERT_UNTRUSTED) << answer;
    EXPECT_EQ(answer.detail["subject"], "other.example");
}

TEST_F(Bundle, ThatIsEmptyOrMissingFails) {
    const tls::TlsServer server(tls::Make({}, &Authority()));
    std::ofstream(paths::kCaBundle) << "";
    EXPECT_FALSE(Verify(server.Url(), paths::kCaBundle).ok);
    unlink(paths::kCaBundle);
    const Answer missing = Verify(server.Url(), paths::kCaBundle);
    EXPECT_EQ(missing.code, VFS_ERR_FAILED) << missing;
}

TEST_F(Bundle, ALinkToItAsksItToo) {
    const std::string link = testing::TempDir() + "trust-link";
    unlink(link.c_str());
    ASSERT_EQ(symlink(paths::kCaBundle, link.c_str()), 0);
    const tls::TlsServer good(tls::Make({}, &Authority()));
    EXPECT_TRUE(Verify(good.Url(), link).ok);
    const tls::TlsServer bad(tls::Make({}));
    EXPECT_EQ(Verify(bad.Url(), link).code, VFS_ERR_CERT_UNTRUSTED);
}

// --- a saved copy in a process that has asked the bundle before ---------------------------------

class SavedCopyAfterTheBundle : public Bundle {
  protected:
    static Answer Ask(const tls::TlsServer& server, const std::string& file) {
        const tls::TlsServer known(tls::Make({}, &Authority()));
        return fresh::Ask([&] {
            const bool trusted =
                Utils::VerifyCert(nullptr, nullptr, known.Url().c_str(), paths::kCaBundle);
            ResetError();
            return trusted &&
                   Utils::VerifyCert(nullptr, nullptr, server.Url().c_str(), file.c_str());
        });
    }
};

// The letter of the design was one switch for the process. It shut out the genuine certificate and
// let in any of any authority, so each check is now its own: by the bundle the whole chain, by a
// saved copy nothing but that copy.

TEST_F(SavedCopyAfterTheBundle, StillCountsByItsFingerprint) {
    const tls::Identity identity = tls::Make({});
    const tls::TlsServer server(identity);
    const Answer answer = Ask(server, WriteFile("saved.pem", identity.certificate));
    EXPECT_TRUE(answer.ok) << answer;
}

TEST_F(SavedCopyAfterTheBundle, DoesNotLetInAnotherCertificateOfAKnownAuthority) {
    for (const char* name : {"localhost", "other.example"}) {
        const tls::TlsServer server(tls::Make(Named(name), &Authority()));
        const Answer answer = Ask(server, WriteFile("saved.pem", tls::Make({}).certificate));
        EXPECT_EQ(answer.code, VFS_ERR_CERT_UNTRUSTED) << name << answer;
        EXPECT_TRUE(answer.Logged("Fingerprint verify failed, ")) << answer;
        EXPECT_TRUE(server.Requests().empty());
    }
}

TEST_F(SavedCopyAfterTheBundle, CountsAlsoWhenTheBundleRefusedTheServer) {
    const tls::Identity identity = tls::Make({});
    const tls::TlsServer server(identity);
    const std::string file = WriteFile("saved.pem", identity.certificate);
    const Answer answer = fresh::Ask([&] {
        return !Utils::VerifyCert(nullptr, nullptr, server.Url().c_str(), paths::kCaBundle) &&
               Utils::VerifyCert(nullptr, nullptr, server.Url().c_str(), file.c_str());
    });
    EXPECT_TRUE(answer.ok) << answer;
}

}  // namespace
}  // namespace ZYROVFS
