#include "mount/ssl_verify.h"

#include <fcntl.h>
#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <openssl/ssl.h>
#include <sys/stat.h>
#include <unistd.h>

#include <fstream>

#include "core/error_cell.h"
#include "core/handle.h"
#include "core/paths.h"
#include "support/fresh_process.h"
#include "support/seams.h"
#include "support/shortened_waits.h"
#include "support/tls_server.h"
#include "zyrovfs/utils.h"

namespace ZYROVFS {
namespace {

using fresh::Answer;
using testing::HasSubstr;
using testing::Not;

const tls::Identity& Authority() {
    static const tls::Identity authority = tls::MakeAuthority("Test CA");
    return authority;
}

/** The CA bundle of this private host knows the test authority and nobody else. */
void TrustAuthority() {
    std::ofstream(paths::kCaBundle) << Authority().certificate;
}

std::string WriteFile(const std::string& name, const std::string& text) {
    const std::string path = testing::TempDir() + name;
    unlink(path.c_str());
    std::ofstream(path, std::ios::binary) << text;
    return path;
}

tls::CertSpec Named(const std::string& dns, long starts = -3600, long ends = 86400) {
    tls::CertSpec spec;
    spec.dns_names = {dns};
    spec.starts = starts;
    spec.ends = ends;
    return spec;
}

/** VerifyCert in a process that has not asked before. */
Answer Verify(const std::string& url, const std::string& file, const char* user = nullptr,
              const char* password = nullptr) {
    return fresh::Ask([&] { return Utils::VerifyCert(user, password, url.c_str(), file.c_str()); });
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

TEST(CertData, OfAFifoIsNotWaitedFor) {
    const std::string fifo = testing::TempDir() + "fifo";
    unlink(fifo.c_str());
    ASSERT_EQ(mkfifo(fifo.c_str(), 0600), 0);
    EXPECT_EQ(Data(fifo), "");
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

TEST(VerifyCertCtx, LooksAtTheWholeChainOnceTheBundleWasAsked) {
    TrustAuthority();
    const Answer depth_kept = fresh::Ask([] {
        const std::string url = "https://localhost:" + std::to_string(tls::RefusedPort()) + "/";
        Utils::VerifyCert(nullptr, nullptr, url.c_str(), paths::kCaBundle);
        const UniqueContext context(SSL_CTX_new(TLS_client_method()));
        Utils::VerifyCertCtxFn(nullptr, context.get(), nullptr);
        return SSL_CTX_get_verify_depth(context.get()) != 1;
    });
    EXPECT_TRUE(depth_kept.ok) << depth_kept;
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

TEST_F(SavedCopy, AndAnotherOneAreTellableInOneProcess) {
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

// --- the chain flag ---------------------------------------------------------------------------

class ChainFlag : public Bundle {
  protected:
    /** Verifies against the bundle first, then `url` against `file`, in one process. */
    static Answer AfterTheBundle(const std::string& url, const std::string& file) {
        const tls::TlsServer known(tls::Make({}, &Authority()));
        return fresh::Ask([&] {
            Utils::VerifyCert(nullptr, nullptr, known.Url().c_str(), paths::kCaBundle);
            ResetError();
            return Utils::VerifyCert(nullptr, nullptr, url.c_str(), file.c_str());
        });
    }
};

TEST_F(ChainFlag, OnceSetASavedCertificateNoLongerCountsByItsFingerprint) {
    const tls::Identity identity = tls::Make({});
    const tls::TlsServer server(identity);
    const std::string file = WriteFile("saved.pem", identity.certificate);
    EXPECT_TRUE(Verify(server.Url(), file).ok);
    const Answer answer = AfterTheBundle(server.Url(), file);
    EXPECT_FALSE(answer.ok);
    EXPECT_EQ(answer.code, VFS_ERR_CERT_UNTRUSTED) << answer;
    EXPECT_THAT(answer.log, Not(HasSubstr("Fingerprint")));
}

TEST_F(ChainFlag, OnceSetAnyCertificateOfAKnownAuthorityPassesForASavedOne) {
    const tls::TlsServer server(tls::Make({}, &Authority()));
    const std::string file = WriteFile("saved.pem", tls::Make({}).certificate);
    EXPECT_EQ(Verify(server.Url(), file).code, VFS_ERR_CERT_UNTRUSTED);
    const Answer answer = AfterTheBundle(server.Url(), file);
    EXPECT_TRUE(answer.ok) << answer;
}

TEST_F(ChainFlag, IsSetEvenWhenTheBundleRefused) {
    const tls::Identity identity = tls::Make({});
    const tls::TlsServer server(identity);
    const std::string file = WriteFile("saved.pem", identity.certificate);
    const Answer answer = fresh::Ask([&] {
        Utils::VerifyCert(nullptr, nullptr, server.Url().c_str(), paths::kCaBundle);
        return Utils::VerifyCert(nullptr, nullptr, server.Url().c_str(), file.c_str());
    });
    EXPECT_EQ(answer.code, VFS_ERR_CERT_UNTRUSTED) << answer;
}

// --- the conversation -------------------------------------------------------------------------

class Conversation : public testing::Test {
  protected:
    void SetUp() override {
        file_ = WriteFile("saved.pem", identity_.certificate);
        options_.identity = identity_;
    }

    Answer Ask(const std::string& path = "/", const char* user = nullptr,
               const char* password = nullptr) {
        tls::TlsServer server(options_);
        const Answer answer = Verify(server.Url(path), file_, user, password);
        requests_ = server.Requests();
        return answer;
    }

    tls::Identity identity_ = tls::Make({});
    tls::ServerOptions options_;
    std::string file_;
    std::vector<tls::Request> requests_;
};

TEST_F(Conversation, SendsUserAndPasswordAsTheyAre) {
    EXPECT_TRUE(Ask("/dav/", "dom\\am\xC3\xA9lie b@x%41", "p:w / \xE2\x82\xAC").ok);
    ASSERT_EQ(requests_.size(), 1U);
    EXPECT_EQ(requests_[0].headers["authorization"],
              tls::Basic("dom\\am\xC3\xA9lie b@x%41", "p:w / \xE2\x82\xAC"));
    EXPECT_EQ(requests_[0].method, "GET");
}

TEST_F(Conversation, SendsNoCredentialsWhenThereAreNone) {
    EXPECT_TRUE(Ask("/", "", "").ok);
    ASSERT_EQ(requests_.size(), 1U);
    EXPECT_EQ(requests_[0].headers.count("authorization"), 0U);
}

TEST_F(Conversation, AsksForTheEscapedPath) {
    EXPECT_TRUE(Ask("/my files/\xC3\xA9/50%").ok);
    ASSERT_EQ(requests_.size(), 1U);
    EXPECT_EQ(requests_[0].target, "/my%20files/%C3%A9/50%25");
}

TEST_F(Conversation, ARefusedPasswordIsAFailureWithoutAFinerCode) {
    options_.answer = [](const tls::Request&) { return tls::Response{401, {}, ""}; };
    const Answer answer = Ask("/", "amy", "wrong");
    EXPECT_EQ(answer.code, VFS_ERR_FAILED) << answer;
    EXPECT_TRUE(answer.Logged(", code=22, err=")) << answer;
}

TEST_F(Conversation, AServerThatFailsIsAFailureToo) {
    for (const int status : {403, 404, 405, 500, 503}) {
        options_.answer = [status](const tls::Request&) { return tls::Response{status, {}, ""}; };
        EXPECT_EQ(Ask().code, VFS_ERR_FAILED) << status;
    }
}

TEST_F(Conversation, FollowsARedirect) {
    options_.answer = [](const tls::Request& request) {
        return request.target == "/" ? tls::Response{302, {{"Location", "/dav/"}}, ""}
                                     : tls::Response();
    };
    EXPECT_TRUE(Ask().ok);
    ASSERT_EQ(requests_.size(), 2U);
    EXPECT_EQ(requests_[1].target, "/dav/");
}

TEST_F(Conversation, ChecksTheServerBehindARedirectAsWell) {
    const tls::TlsServer other(tls::Make({}));
    const std::string there = other.Url();
    options_.answer = [there](const tls::Request&) {
        return tls::Response{301, {{"Location", there}}, ""};
    };
    EXPECT_EQ(Ask().code, VFS_ERR_CERT_UNTRUSTED);
    EXPECT_TRUE(other.Requests().empty());
}

TEST_F(Conversation, ARedirectInCirclesEnds) {
    options_.answer = [](const tls::Request&) {
        return tls::Response{302, {{"Location", "/again"}}, ""};
    };
    EXPECT_EQ(Ask().code, VFS_ERR_FAILED);
}

TEST_F(Conversation, ThrowsALargeBodyAway) {
    options_.answer = [](const tls::Request&) {
        return tls::Response{200, {}, std::string(3000000, 'x')};
    };
    EXPECT_TRUE(Ask().ok);
}

TEST_F(Conversation, ARefusedPortIsAnUnreachableHost) {
    const std::string url = "https://localhost:" + std::to_string(tls::RefusedPort()) + "/";
    const Answer answer = Verify(url, file_);
    EXPECT_EQ(answer.code, VFS_ERR_HOST_UNREACHABLE) << answer;
    EXPECT_TRUE(answer.Logged(url + ", code=7, err=")) << answer;
    EXPECT_TRUE(answer.detail.isNull());
}

TEST_F(Conversation, ANameThatNobodyKnowsIsAnUnreachableHost) {
    const Answer answer = Verify("https://no-such-host.invalid/", file_);
    EXPECT_EQ(answer.code, VFS_ERR_HOST_UNREACHABLE) << answer;
}

TEST_F(Conversation, AServerThatHangsUpIsAnUnreachableHost) {
    options_.manner = tls::Manner::kCloseAtOnce;
    const Answer answer = Ask();
    EXPECT_EQ(answer.code, VFS_ERR_HOST_UNREACHABLE) << answer;
}

TEST_F(Conversation, AServerThatSpeaksNoTlsIsAnUnreachableHost) {
    options_.identity = {};
    const tls::TlsServer server(options_);
    const Answer answer = Verify("https://localhost:" + std::to_string(server.Port()) + "/", file_);
    EXPECT_EQ(answer.code, VFS_ERR_HOST_UNREACHABLE) << answer;
}

TEST_F(Conversation, AServerThatIsSilentIsAnUnreachableHost) {
    shortened_waits = true;
    options_.manner = tls::Manner::kSilent;
    const Answer answer = Ask();
    shortened_waits = false;
    EXPECT_EQ(answer.code, VFS_ERR_HOST_UNREACHABLE) << answer;
    EXPECT_TRUE(answer.Logged(", code=28, err=")) << answer;
}

TEST_F(Conversation, AServerThatGoesAwayInsteadOfAnsweringIsAFailure) {
    options_.manner = tls::Manner::kCloseAfterHandshake;
    EXPECT_EQ(Ask().code, VFS_ERR_FAILED);
}

TEST_F(Conversation, UrlsThatAreNoneAreAFailure) {
    for (const std::string url : {"", "https://", "https://[", "nonsense", "gopherx://h/"}) {
        const Answer answer = Verify(url, file_);
        EXPECT_TRUE(answer.finished && !answer.ok) << url << answer;
        EXPECT_NE(answer.code, VFS_ERR_NONE) << url << answer;
    }
}

TEST_F(Conversation, AUrlWithoutEndIsAFailure) {
    const Answer answer = Verify("https://localhost/" + std::string(9000000, ' '), file_);
    EXPECT_EQ(answer.code, VFS_ERR_FAILED);
}

}  // namespace
}  // namespace ZYROVFS
