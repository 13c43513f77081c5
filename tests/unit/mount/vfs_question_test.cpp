#include "mount/vfs_question.h"

#include <gtest/gtest.h>
#include <sys/stat.h>
#include <unistd.h>

#include <csignal>
#include <cstring>
#include <filesystem>
#include <string>

#include "core/paths.h"
#include "mount/vfs_private.h"
#include "support/seams.h"
#include "zyrovfs/error.h"

namespace {

/** What the platform tells of proxies, set by each test. */
struct Proxy {
    int address_result = 1;
    std::string address;
    int auth_result = 1;
    std::string auth;
    std::string asked_url;
    int auth_size = 0;
} proxy;

int Copy(int result, const std::string& text, char* to, int size) {
    snprintf(to, static_cast<size_t>(size), "%s", text.c_str());
    return result;
}

}  // namespace

extern "C" int ZYROProxyGetAddrByUrl(const char* url, char* address, int size) {
    proxy.asked_url = url;
    return Copy(proxy.address_result, proxy.address, address, size);
}

extern "C" int ZYROProxyGetAuth(char* auth, int size) {
    proxy.auth_size = size;
    return Copy(proxy.auth_result, proxy.auth, auth, size);
}

namespace ZYROVFS {
namespace {

constexpr int kUser = G_ASK_PASSWORD_NEED_USERNAME;
constexpr int kPassword = G_ASK_PASSWORD_NEED_PASSWORD;
constexpr int kAnonymous = G_ASK_PASSWORD_ANONYMOUS_SUPPORTED;

class Question : public testing::Test {
  protected:
    Question() : operation_(g_mount_operation_new()) {
        proxy = Proxy();
        ResetError();
        IdentityText().clear();
        mount_.session = &session_;
        g_signal_connect(operation_, "reply", G_CALLBACK(TakeReply), this);
    }
    ~Question() override { g_object_unref(operation_); }

    static void TakeReply(GMountOperation*, GMountOperationResult result, gpointer self) {
        static_cast<Question*>(self)->result_ = result;
        ++static_cast<Question*>(self)->replies_;
    }

    /** True when the question was handled; fails the test unless there was exactly one reply. */
    bool Password(const char* message, int flags = 0, const char* default_user = nullptr) {
        return Answered([&] {
            AskPassword(operation_, message, default_user, nullptr,
                        static_cast<GAskPasswordFlags>(flags), &mount_);
        });
    }
    bool Choice(const char* message) {
        const char* choices[] = {"Yes", "No", nullptr};
        return Answered([&] { AskQuestion(operation_, message, choices, &mount_); });
    }
    template <typename Ask>
    bool Answered(Ask ask) {
        replies_ = 0;
        ask();
        EXPECT_EQ(replies_, 1);
        EXPECT_TRUE(result_ == G_MOUNT_OPERATION_HANDLED || result_ == G_MOUNT_OPERATION_ABORTED);
        return result_ == G_MOUNT_OPERATION_HANDLED;
    }
    std::string User() const { return Text(g_mount_operation_get_username(operation_)); }
    std::string Pass() const { return Text(g_mount_operation_get_password(operation_)); }
    std::string Domain() const { return Text(g_mount_operation_get_domain(operation_)); }
    static std::string Text(const char* text) { return text == nullptr ? "(unset)" : text; }

    VFS session_;
    VFSMountOperaion mount_;
    GMountOperation* operation_;
    int replies_ = 0;
    GMountOperationResult result_ = G_MOUNT_OPERATION_UNHANDLED;
};

// --- keywords of the backends -------------------------------------------------------------------

TEST_F(Question, WithoutUserDataAPasswordQuestionIsABadParameter) {
    EXPECT_FALSE(Answered([&] {
        AskPassword(operation_, "Password", "", "", G_ASK_PASSWORD_NEED_PASSWORD, nullptr);
    }));
    EXPECT_EQ(GetError(), VFS_ERR_BAD_PARAM);
    EXPECT_TRUE(seams::Logged("NO Mount Options")) << seams::LogDump();
}

TEST_F(Question, MountPathTellsThePlaceWithoutItsFirstSlash) {
    EXPECT_TRUE(Password("mount_path", 0, "/remote.php/dav"));
    EXPECT_EQ(session_.GetPath(), "remote.php/dav");
    EXPECT_TRUE(Password("mount_path", 0, "//share"));
    EXPECT_EQ(session_.GetPath(), "/share");
    EXPECT_TRUE(Password("mount_path", 0, "share"));
    EXPECT_EQ(session_.GetPath(), "share");
}

TEST_F(Question, MountPathIsNotConvertedToTheCodePage) {
    session_.SetPath("a", "ISO-8859-1");
    EXPECT_TRUE(Password("mount_path", 0, "/caf\xC3\xA9"));
    EXPECT_EQ(session_.GetPath(), "caf\xC3\xA9");
}

TEST_F(Question, MountPathWithoutADefaultUserChangesNothing) {
    session_.SetPath("share", nullptr);
    EXPECT_TRUE(Password("mount_path", 0, nullptr));
    EXPECT_EQ(session_.GetPath(), "share");
    EXPECT_EQ(mount_.asked, 0U);
}

TEST_F(Question, MountPathWithAnEmptyDefaultUserEndsTheProcess) {
    EXPECT_EXIT(Password("mount_path", 0, ""), testing::KilledBySignal(SIGABRT), "");
}

TEST_F(Question, IsUtf8IsAnsweredWithTheCodePage) {
    session_.SetPath("x", "BIG5");
    EXPECT_TRUE(Password("Is UTF8?"));
    EXPECT_EQ(Domain(), "BIG5");
}

TEST_F(Question, IsUtf8WithoutACodePageIsAnsweredWithAnEmptyText) {
    EXPECT_TRUE(Password("Is UTF8"));
    EXPECT_EQ(Domain(), "");
}

class CaFile : public Question {
  protected:
    CaFile() : folder_(paths::SslDir(0)) {
        unsetenv("ZYROVFS_UID");
        std::filesystem::create_directories(folder_);
    }
    ~CaFile() override { std::filesystem::remove_all(folder_); }
    std::string folder_;
};

TEST_F(CaFile, AHostThatChainsToTheBundleIsGivenTheBundle) {
    ASSERT_EQ(symlink(paths::kCaBundle, (folder_ + "/nas.example:443").c_str()), 0);
    EXPECT_TRUE(Password("ca file path:https://nas.example/dav"));
    EXPECT_EQ(Domain(), paths::kCaBundle);
}

TEST_F(CaFile, AHostWithoutAnSslFileIsAnsweredWithTheEmptyDomain) {
    EXPECT_TRUE(Password("ca file path:https://other.example/dav"));
    EXPECT_EQ(Domain(), "");
}

TEST_F(CaFile, AHostWithASavedCertificateIsAnsweredWithTheEmptyDomain) {
    fclose(fopen((folder_ + "/nas.example:8443").c_str(), "w"));
    EXPECT_TRUE(Password("ca file path:https://nas.example:8443/"));
    EXPECT_EQ(Domain(), "");
}

TEST_F(CaFile, AQuestionThatEndsBeforeItsUriIsAnsweredWithTheEmptyDomain) {
    EXPECT_TRUE(Password("ca file path"));
    EXPECT_EQ(Domain(), "");
    EXPECT_TRUE(Password("ca file path:"));
    EXPECT_EQ(Domain(), "");
    EXPECT_TRUE(Password("ca file path:no uri at all"));
    EXPECT_EQ(Domain(), "");
}

// --- proxy
// ----------------------------------------------------------------------------------------

TEST_F(Question, ProxyUrlIsAnsweredWithTheAddress) {
    proxy.address = "proxy.example:3128";
    EXPECT_TRUE(Password("proxy url:http://amy@nas.example/dav"));
    EXPECT_EQ(Domain(), "proxy.example:3128");
    EXPECT_EQ(proxy.asked_url.find("amy"), std::string::npos) << proxy.asked_url;
}

TEST_F(Question, ProxyUrlCarriesTheCredentialsBeforeTheAddress) {
    proxy.address = "proxy.example:3128";
    proxy.auth = "bob:pw";
    for (const char* scheme : {"http", "dav", "https", "davs", "HTTP", "DavS"}) {
        g_mount_operation_set_domain(operation_, nullptr);
        EXPECT_TRUE(Password(("proxy url:" + std::string(scheme) + "://nas.example/").c_str()));
        EXPECT_EQ(Domain(), "bob:pw@proxy.example:3128") << scheme;
    }
    EXPECT_EQ(proxy.auth_size, 2048);
}

TEST_F(Question, ProxyUrlWithoutAProxyIsHandledWithoutADomain) {
    EXPECT_TRUE(Password("proxy url:http://nas.example/"));
    EXPECT_EQ(Domain(), "(unset)");
    proxy.address = "proxy.example:3128";
    proxy.address_result = 0;
    EXPECT_TRUE(Password("proxy url:http://nas.example/"));
    EXPECT_EQ(Domain(), "(unset)");
}

TEST_F(Question, ProxyUrlOfAnotherProtocolIsLoggedAndGetsNoDomain) {
    proxy.address = "proxy.example:3128";
    EXPECT_TRUE(Password("proxy url:ftp://nas.example/"));
    EXPECT_EQ(Domain(), "(unset)");
    EXPECT_TRUE(seams::LoggedPart("Unknow protocol ftp://nas.example")) << seams::LogDump();
}

TEST_F(Question, ProxyUrlThatCannotBeParsedIsLoggedAndHandled) {
    EXPECT_TRUE(Password("proxy url:nonsense"));
    EXPECT_EQ(Domain(), "(unset)");
    EXPECT_TRUE(seams::Logged("Failed to parse nonsense")) << seams::LogDump();
    EXPECT_TRUE(Password("proxy url"));
    EXPECT_TRUE(seams::Logged("Failed to parse ")) << seams::LogDump();
}

TEST_F(Question, AnOverlongProxyAnswerIsCutNotOverrun) {
    proxy.address = std::string(5000, 'a');
    proxy.auth = std::string(5000, 'b');
    EXPECT_TRUE(Password("proxy url:http://nas.example/"));
    EXPECT_EQ(Domain(), std::string(2047, 'b') + "@" + std::string(2047, 'a'));
}

TEST_F(Question, ProxyAuthTextWithAColonPassesWholeIntoTheUserName) {
    proxy.auth = "a:b";
    EXPECT_TRUE(Password("proxy password", kUser | kPassword));
    EXPECT_EQ(User(), "a:b");
    EXPECT_EQ(Pass(), "(unset)");
    EXPECT_EQ(proxy.auth_size, 4096);
}

TEST_F(Question, ProxyAuthTextOfFullLengthReachesThePassword) {
    const std::string user(2047, 'u');
    proxy.auth = user + ":secret";
    EXPECT_TRUE(Password("proxy password", kUser | kPassword));
    EXPECT_EQ(User(), user);
    EXPECT_EQ(Pass(), "secret");
}

TEST_F(Question, ProxyCredentialsAreGivenOnlyWhereTheyAreAskedFor) {
    proxy.auth = "bob";
    EXPECT_TRUE(Password("proxy password", kPassword));
    EXPECT_EQ(User(), "(unset)");
    EXPECT_EQ(Pass(), "(unset)");
}

TEST_F(Question, EmptyProxyCredentialsAreHandledWithoutAnswer) {
    EXPECT_TRUE(Password("proxy password", kUser | kPassword));
    EXPECT_EQ(User(), "(unset)");
    EXPECT_EQ(mount_.proxy_asked, 1U);
    EXPECT_EQ(mount_.asked, 0U);
}

TEST_F(Question, ProxyCredentialsThatCannotBeHadAreABadParameter) {
    proxy.auth_result = 0;
    EXPECT_FALSE(Password("proxy password", kUser));
    EXPECT_EQ(GetError(), VFS_ERR_BAD_PARAM);
}

TEST_F(Question, AfterTwoProxyQuestionsAnyFurtherOneIsRefused) {
    EXPECT_TRUE(Password("proxy password", kUser));
    EXPECT_TRUE(Password("proxy password", kUser));
    EXPECT_EQ(GetError(), VFS_ERR_NONE);
    EXPECT_FALSE(Password("proxy password", kUser));
    EXPECT_EQ(GetError(), VFS_ERR_PROXY_AUTH);
    ResetError();
    EXPECT_FALSE(Password("Enter password", kPassword));
    EXPECT_EQ(GetError(), VFS_ERR_PROXY_AUTH);
    EXPECT_EQ(mount_.asked, 0U);
}

TEST_F(Question, AFurtherQuestionThatNeedsNothingIsRefusedWithoutACode) {
    mount_.proxy_asked = 2;
    EXPECT_FALSE(Password("Domain?", G_ASK_PASSWORD_NEED_DOMAIN));
    EXPECT_EQ(GetError(), VFS_ERR_NONE);
}

TEST_F(Question, KeywordsAreStillAnsweredAfterTheProxyRefused) {
    mount_.proxy_asked = 2;
    EXPECT_TRUE(Password("Is UTF8"));
}

// --- credentials
// ------------------------------------------------------------------------------------

TEST_F(Question, TheFirstQuestionIsAnsweredFromTheSession) {
    session_.SetUser("amy");
    session_.SetPass("secret");
    EXPECT_TRUE(Password("Enter password for nas", kUser | kPassword));
    EXPECT_EQ(User(), "amy");
    EXPECT_EQ(Pass(), "secret");
    EXPECT_EQ(GetError(), VFS_ERR_NONE);
}

TEST_F(Question, OnlyWhatIsAskedForIsGiven) {
    session_.SetUser("amy");
    session_.SetPass("secret");
    EXPECT_TRUE(Password("Enter password", kPassword));
    EXPECT_EQ(User(), "(unset)");
    EXPECT_EQ(Pass(), "secret");
}

TEST_F(Question, AnEmptyUserOnAServerThatAllowsItIsAnonymousOnceAndNeverAgain) {
    session_.SetPass("secret");
    EXPECT_TRUE(Password("Enter password", kUser | kPassword | kAnonymous));
    EXPECT_TRUE(g_mount_operation_get_anonymous(operation_));
    EXPECT_EQ(Pass(), "(unset)");
    EXPECT_FALSE(Password("Enter password", kUser | kPassword | kAnonymous));
    EXPECT_EQ(GetError(), VFS_ERR_WRONG_USERNAME);
}

TEST_F(Question, AUserIsNotAnonymousEvenWhereThatIsAllowed) {
    session_.SetUser("amy");
    EXPECT_TRUE(Password("Enter password", kUser | kAnonymous));
    EXPECT_FALSE(g_mount_operation_get_anonymous(operation_));
    EXPECT_EQ(User(), "amy");
}

TEST_F(Question, TheSecondQuestionForBothFailsWithTheUserName) {
    session_.SetUser("amy");
    EXPECT_TRUE(Password("Enter password", kUser | kPassword));
    EXPECT_FALSE(Password("Enter password", kUser | kPassword));
    EXPECT_EQ(GetError(), VFS_ERR_WRONG_USERNAME);
}

TEST_F(Question, TheSecondQuestionForThePasswordAloneFailsWithThePassword) {
    EXPECT_TRUE(Password("Enter password", kPassword));
    EXPECT_FALSE(Password("Enter password", kPassword));
    EXPECT_EQ(GetError(), VFS_ERR_WRONG_PASSWORD);
}

TEST_F(Question, ASecondQuestionForNeitherIsRefusedWithoutACode) {
    EXPECT_TRUE(Password("Domain?", G_ASK_PASSWORD_NEED_DOMAIN));
    EXPECT_FALSE(Password("Domain?", G_ASK_PASSWORD_NEED_DOMAIN));
    EXPECT_EQ(GetError(), VFS_ERR_NONE);
}

TEST_F(Question, KeywordsDoNotCountAsQuestions) {
    Password("Is UTF8");
    Password("mount_path", 0, "/x");
    EXPECT_EQ(mount_.asked, 0U);
    EXPECT_TRUE(Password("Enter password", kPassword));
}

TEST_F(Question, AKeywordInTheMiddleOfAMessageIsNoKeyword) {
    EXPECT_TRUE(Password("what is the mount_path", kUser));
    EXPECT_EQ(mount_.asked, 1U);
}

TEST_F(Question, ANullMessageIsAQuestionForCredentials) {
    session_.SetPass("secret");
    EXPECT_TRUE(Password(nullptr, kPassword));
    EXPECT_EQ(Pass(), "secret");
}

// --- choices
// ----------------------------------------------------------------------------------------

TEST_F(Question, AChoiceWithoutAMessageIsUnknown) {
    EXPECT_FALSE(Choice(nullptr));
    EXPECT_EQ(GetError(), VFS_ERR_UNKNOWN);
    EXPECT_TRUE(seams::Logged("No messages")) << seams::LogDump();
}

TEST_F(Question, IdentityWithForceIsConfirmedAndSetsNoError) {
    session_.SetForce(true);
    g_mount_operation_set_choice(operation_, 7);
    EXPECT_TRUE(Choice("identity:nas\tSHA256:abc"));
    EXPECT_EQ(g_mount_operation_get_choice(operation_), 0);
    EXPECT_EQ(GetError(), VFS_ERR_NONE);
    EXPECT_EQ(IdentityText(), "");
}

TEST_F(Question, IdentityWithoutForceIsLeftToTheUser) {
    EXPECT_FALSE(Choice("identity:nas\tSHA256:abc"));
    EXPECT_EQ(GetError(), VFS_ERR_IDENTITY_QUESTION);
    EXPECT_EQ(IdentityText(), "nas\tSHA256:abc");
}

TEST_F(Question, IdentityWithoutAColonIsUnknown) {
    EXPECT_FALSE(Choice("identity of nas"));
    EXPECT_EQ(GetError(), VFS_ERR_UNKNOWN);
    EXPECT_EQ(IdentityText(), "");
    EXPECT_TRUE(seams::Logged("no identity information, identity of nas")) << seams::LogDump();
}

TEST_F(Question, IdentityWithoutUserDataIsNeverConfirmed) {
    EXPECT_FALSE(Answered([&] { AskQuestion(operation_, "identity:nas\tabc", nullptr, nullptr); }));
    EXPECT_EQ(GetError(), VFS_ERR_IDENTITY_QUESTION);
}

TEST_F(Question, AChangedAddressIsAlwaysAccepted) {
    g_mount_operation_set_choice(operation_, 7);
    EXPECT_TRUE(Choice("ip change from 10.0.0.1"));
    EXPECT_EQ(g_mount_operation_get_choice(operation_), 0);
    EXPECT_EQ(GetError(), VFS_ERR_NONE);
}

TEST_F(Question, AnyOtherChoiceIsLoggedAndUnknown) {
    EXPECT_FALSE(Choice("Delete %s everything?"));
    EXPECT_EQ(GetError(), VFS_ERR_UNKNOWN);
    EXPECT_TRUE(seams::Logged("Delete %s everything?")) << seams::LogDump();
}

TEST_F(Question, SignalsOfARealOperationReachTheHandlers) {
    session_.SetUser("amy");
    g_signal_connect(operation_, "ask-password", G_CALLBACK(AskPassword), &mount_);
    g_signal_connect(operation_, "ask-question", G_CALLBACK(AskQuestion), &mount_);
    g_signal_emit_by_name(operation_, "ask-password", "Enter password", "", "",
                          G_ASK_PASSWORD_NEED_USERNAME);
    EXPECT_EQ(result_, G_MOUNT_OPERATION_HANDLED);
    EXPECT_EQ(User(), "amy");
    const char* choices[] = {"Yes", nullptr};
    g_signal_emit_by_name(operation_, "ask-question", "identity:nas\tabc", choices);
    EXPECT_EQ(result_, G_MOUNT_OPERATION_ABORTED);
    EXPECT_EQ(IdentityText(), "nas\tabc");
}

}  // namespace
}  // namespace ZYROVFS
