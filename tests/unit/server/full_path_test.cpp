#include <gtest/gtest.h>
#include <sys/syscall.h>
#include <unistd.h>
#include <zosplatform/process.h>

#include <cerrno>
#include <csignal>

#include "support/fake_location.h"
#include "support/profiles.h"
#include "support/seams.h"
#include "zyrovfs/utils.h"

namespace {

bool fail_pipe = false;

}  // namespace

extern "C" {

/** No chain is started here. */
int ZYRODZOSIsPrivilegedMode(void) {
    return 0;
}

int pipe2(int ends[2], int flags) {
    if (fail_pipe) {
        errno = EMFILE;
        return -1;
    }
    return static_cast<int>(syscall(SYS_pipe2, ends, flags));
}

}  // extern "C"

namespace ZYROVFS::Utils {
namespace {

using profiles::kUser;
using profiles::VFS_CONFIG_CONNECT;
using profiles::VFS_CONFIG_SERVER;
using Calls = std::vector<std::string>;

constexpr const char* kId = "ftp://amy@nas.example:2121";

Json::Value Connection() {
    Json::Value connection;
    connection["protocol"] = "ftp";
    connection["hostname"] = "nas.example";
    connection["port"] = 2121;
    connection["alias"] = "Home";
    connection["account"] = "amy";
    connection["password"] = "cipher";
    connection["codepage"] = "UTF-8";
    return connection;
}

class FullPath : public profiles::ProfileTest {
  protected:
    void SetUp() override {
        ProfileTest::SetUp();
        fake_location::Reset();
        fail_pipe = false;
        // Lines of the children belong to what is looked at.
        seams::WatchChildren();
    }
    static void Put(Server::VFS_CONFIG_MODE mode, const Json::Value& profile) {
        Json::Value servers;
        servers[kId] = profile;
        profiles::Put(mode, servers);
    }
    static void Recorded(const Json::Value& path) {
        Json::Value connection = Connection();
        connection["path"] = path;
        Put(VFS_CONFIG_CONNECT, connection);
    }
    static long Count(const std::string& call) {
        const Calls calls = fake_location::Calls();
        return std::count(calls.begin(), calls.end(), call);
    }
    bool LookUp(const char* path, const char* codepage = "") {
        return GetFullPath(kUser, kId, path, codepage, remote, full);
    }

    std::string remote = "as it was";
    std::string full = "as it was";
};

// --- password -----------------------------------------------------------------------------------

TEST_F(FullPath, PasswordComesAsItStandsInTheFile) {
    Put(VFS_CONFIG_CONNECT, Connection());
    std::string password;
    EXPECT_TRUE(GetPasswordByConfig("ftp://amy@nas.example:2121/pub/film", password));
    EXPECT_EQ(password, "cipher");
}

TEST_F(FullPath, ConnectionWithoutAPasswordGivesAnEmptyOne) {
    Put(VFS_CONFIG_CONNECT, Json::Value(Json::objectValue));
    std::string password = "x";
    EXPECT_TRUE(GetPasswordByConfig(kId, password));
    EXPECT_EQ(password, "");
}

TEST_F(FullPath, PasswordOfNoConnectionFails) {
    std::string password = "x";
    EXPECT_FALSE(GetPasswordByConfig("ftp://amy@nas.example:2121/pub", password));
    EXPECT_TRUE(seams::Logged(
        "Wrong parameters, ftp://amy@nas.example:2121/pub, ftp://amy@nas.example:2121, 1234"))
        << seams::LogDump();
    EXPECT_EQ(password, "x");
}

TEST_F(FullPath, PasswordOfWhatIsNoUriFails) {
    std::string password;
    EXPECT_FALSE(GetPasswordByConfig("no uri", password));
    EXPECT_TRUE(seams::Logged("Failed to get base uri, no uri"));
    EXPECT_FALSE(GetPasswordByConfig(nullptr, password));
    EXPECT_TRUE(seams::Logged("Failed to get base uri, (null)"));
}

TEST_F(FullPath, DamagedRecordsAreNoCrash) {
    Json::Value wrong;
    wrong["password"] = Json::Value(Json::objectValue);
    wrong["path"] = Json::Value(Json::arrayValue);
    std::string text;
    for (const Json::Value& record : {wrong, Json::Value("text"), Json::Value(7)}) {
        Put(VFS_CONFIG_CONNECT, record);
        EXPECT_NO_THROW(EXPECT_FALSE(GetPasswordByConfig(kId, text)));
        EXPECT_NO_THROW(EXPECT_FALSE(GetFullPathByConfig(kId, text)));
    }
}

// --- by the record ------------------------------------------------------------------------------

TEST_F(FullPath, RecordedPathIsFollowedByTheRestOfTheUri) {
    Recorded("/fuse/x");
    std::string base;
    std::string rest;
    ASSERT_TRUE(GetFullPathByConfig("ftp://amy@nas.example:2121/pub/film", base, rest, full));
    EXPECT_EQ(base, kId);
    EXPECT_EQ(rest, "/pub/film");
    EXPECT_EQ(full, "/fuse/x/pub/film");
    ASSERT_TRUE(GetFullPathByConfig(kId, full));
    EXPECT_EQ(full, "/fuse/x");
    EXPECT_TRUE(fake_location::Calls().empty());
}

TEST_F(FullPath, RecordWithAnEmptyPathIsARecordedPath) {
    Recorded("");
    ASSERT_TRUE(GetFullPathByConfig("ftp://amy@nas.example:2121/pub", full));
    EXPECT_EQ(full, "/pub");
    EXPECT_TRUE(fake_location::Calls().empty());
}

TEST_F(FullPath, MissingConnectionIsMadeOnDemand) {
    fake_location::rules.path = [](const std::string&) { return "/fuse/x"; };
    Put(VFS_CONFIG_SERVER, Connection());
    ASSERT_TRUE(GetFullPathByConfig("ftp://amy@nas.example:2121/pub", full)) << seams::LogDump();
    EXPECT_EQ(full, "/fuse/x/pub");
    EXPECT_EQ(Count(std::string("mount ") + kId), 1);
    EXPECT_EQ(profiles::Stored(VFS_CONFIG_CONNECT)[kId]["path"], "/fuse/x");
}

TEST_F(FullPath, ConnectionOnDemandThatFailsIsLogged) {
    EXPECT_FALSE(GetFullPathByConfig("ftp://amy@nas.example:2121/pub", full));
    EXPECT_TRUE(
        seams::Logged("Failed to add connection from server ID: ftp://amy@nas.example:2121"))
        << seams::LogDump();
    EXPECT_EQ(full, "as it was");
}

TEST_F(FullPath, RefusedMountOnDemandFailsWithItsCode) {
    fake_location::rules.mount = [](const std::string&) { return G_IO_ERROR_PERMISSION_DENIED; };
    Put(VFS_CONFIG_SERVER, Connection());
    EXPECT_FALSE(GetFullPathByConfig(kId, full));
    EXPECT_EQ(GetError(), VFS_ERR_WRONG_USERNAME);
    EXPECT_TRUE(profiles::Stored(VFS_CONFIG_CONNECT).isNull());
}

TEST_F(FullPath, RecordWithoutAPathStaysWithoutOneAfterConnecting) {
    fake_location::rules.path = [](const std::string&) { return "/fuse/x"; };
    Put(VFS_CONFIG_SERVER, Connection());
    Put(VFS_CONFIG_CONNECT, Connection());
    EXPECT_FALSE(GetFullPathByConfig("ftp://amy@nas.example:2121/pub", full));
    EXPECT_TRUE(seams::Logged(
        "Wrong parameters, ftp://amy@nas.example:2121/pub, ftp://amy@nas.example:2121, 1234"))
        << seams::LogDump();
}

// A location that mounts but never has a local path would otherwise be connected on demand by the
// lookup of the connection made on demand, and so on.
TEST_F(FullPath, ConnectingOnDemandDoesNotConnectOnDemandAgain) {
    Put(VFS_CONFIG_SERVER, Connection());
    EXPECT_FALSE(GetFullPathByConfig(kId, full));
    EXPECT_EQ(Count(std::string("mount ") + kId), 2) << "one mount and the one that is tried again";
    EXPECT_EQ(Count(std::string("path ") + kId), 2);
}

// --- by GIO -------------------------------------------------------------------------------------

TEST_F(FullPath, PathThatGioKnowsIsTheAnswer) {
    fake_location::rules.path = [](const std::string& uri) { return "/fuse/" + uri.substr(6); };
    Recorded("/other");
    ASSERT_TRUE(GetFullPath("ftp://amy@nas.example:2121/pub", full));
    EXPECT_EQ(full, "/fuse/amy@nas.example:2121/pub");
}

TEST_F(FullPath, WithoutGioTheRecordAnswers) {
    Recorded("/other");
    ASSERT_TRUE(GetFullPath("ftp://amy@nas.example:2121/pub", full));
    EXPECT_EQ(full, "/other/pub");
}

TEST_F(FullPath, NullFails) {
    EXPECT_FALSE(GetFullPath(nullptr, full));
    EXPECT_TRUE(seams::Logged("Wrong parameters"));
    seams::Reset();
    EXPECT_FALSE(GetFullPath(kUser, nullptr, "pub", "", remote, full));
    EXPECT_TRUE(seams::Logged("Wrong parameters"));
    EXPECT_EQ(full, "as it was");
}

// --- in a child ---------------------------------------------------------------------------------

TEST_F(FullPath, ChildAnswersWithPathAndRemotePath) {
    fake_location::rules.path = [](const std::string& uri) {
        return uri == std::string(kId) + "/pub" ? "/fuse/x/pub" : "";
    };
    ASSERT_TRUE(LookUp("pub"));
    EXPECT_EQ(full, "/fuse/x/pub");
    EXPECT_EQ(remote, "pub");
}

TEST_F(FullPath, WithoutARemotePathTheCallersIsLeftAlone) {
    fake_location::rules.path = [](const std::string&) { return "/fuse/x"; };
    ASSERT_TRUE(LookUp(""));
    EXPECT_EQ(full, "/fuse/x");
    EXPECT_EQ(remote, "as it was");
    ASSERT_TRUE(GetFullPath(kUser, kId, nullptr, nullptr, remote, full));
    EXPECT_EQ(full, "/fuse/x");
}

TEST_F(FullPath, RemotePathIsAskedForInItsCodepage) {
    fake_location::rules.path = [](const std::string&) { return "/fuse/x"; };
    ASSERT_TRUE(LookUp("caf\xc3\xa9", "ISO-8859-1"));
    EXPECT_EQ(remote, "caf\xe9");
    EXPECT_EQ(fake_location::Calls(), Calls{std::string("path ") + kId + "/caf\xe9"});
    ASSERT_TRUE(LookUp("caf\xc3\xa9", "UTF-8"));
    EXPECT_EQ(remote, "caf\xc3\xa9");
    ASSERT_TRUE(LookUp("caf\xc3\xa9", "NO-SUCH-SET"));
    EXPECT_EQ(remote, "caf\xc3\xa9") << "a path that cannot be converted is asked for as it is";
}

TEST_F(FullPath, ChildIsTheUser) {
    fake_location::rules.path = [](const std::string&) {
        uid_t r, e, s;
        gid_t g, h, i;
        getresuid(&r, &e, &s);
        getresgid(&g, &h, &i);
        const bool user = r == kUser && e == kUser && s == kUser && g == 100 && h == 100 &&
                          i == 100 && getgroups(0, nullptr) == 0;
        return user ? "/the/user" : "/somebody/else";
    };
    ASSERT_TRUE(LookUp(""));
    EXPECT_EQ(full, "/the/user");
    EXPECT_EQ(geteuid(), 0U);
}

TEST_F(FullPath, FailedLookupAnswersNothingWithSuccess) {
    EXPECT_TRUE(LookUp("pub"));
    EXPECT_EQ(full, "");
    EXPECT_EQ(remote, "as it was");
    EXPECT_TRUE(seams::Logged("Failed to get full path, ftp://amy@nas.example:2121/pub"))
        << seams::LogDump();
}

TEST_F(FullPath, ConnectionThatNoGvfsdKnowsIsMadeInsideTheChild) {
    // GIO knows the location once it is mounted; here, once somebody has mounted it.
    fake_location::rules.path = [](const std::string&) {
        return Count(std::string("mount ") + kId) > 0 ? "/fuse/x" : "";
    };
    Put(VFS_CONFIG_SERVER, Connection());
    // The child is the user by then and works in the folders that root has made before.
    ASSERT_TRUE(Server::CfgCheckPath(kUser, VFS_CONFIG_CONNECT));
    EXPECT_TRUE(LookUp(""));
    EXPECT_EQ(full, "/fuse/x") << seams::LogDump();
    EXPECT_EQ(Count(std::string("mount ") + kId), 1);
    EXPECT_EQ(profiles::Stored(VFS_CONFIG_CONNECT)[kId]["path"], "/fuse/x");
}

TEST_F(FullPath, PathWithANewlineIsTornBetweenTheOutputs) {
    fake_location::rules.path = [](const std::string&) { return "/fuse/one\ntwo"; };
    ASSERT_TRUE(LookUp("pub"));
    EXPECT_EQ(full, "/fuse/one");
    EXPECT_EQ(remote, "two\npub");
    ASSERT_TRUE(LookUp(""));
    EXPECT_EQ(full, "/fuse/one");
    EXPECT_EQ(remote, "two");
}

TEST_F(FullPath, OfALongAnswerOnlyTheLastPieceSurvives) {
    const std::string path = "/" + std::string(8200, 'a') + "/tail";
    fake_location::rules.path = [&](const std::string&) { return path; };
    ASSERT_TRUE(LookUp(""));
    EXPECT_EQ(full, "/tail");
    const std::string fits = "/" + std::string(8200, 'a');
    fake_location::rules.path = [&](const std::string&) { return fits; };
    ASSERT_TRUE(LookUp(""));
    EXPECT_EQ(full, fits);
}

TEST_F(FullPath, KilledChildIsAFailure) {
    for (const int signal : {SIGKILL, SIGTERM}) {
        fake_location::rules.deadly = signal;
        EXPECT_FALSE(LookUp("pub"));
        EXPECT_EQ(full, "");
    }
}

TEST_F(FullPath, ChildThatCannotBecomeTheUserIsAFailure) {
    seams::FailIdentity("setregid", EPERM);
    EXPECT_FALSE(LookUp(""));
    EXPECT_TRUE(seams::LoggedPart("Failed to set gid 100, ")) << seams::LogDump();
    seams::Reset();
    seams::WatchChildren();
    seams::FailIdentity("setreuid", EPERM);
    EXPECT_FALSE(LookUp(""));
    EXPECT_TRUE(seams::LoggedPart("Failed to set uid 1234, ")) << seams::LogDump();
    EXPECT_TRUE(fake_location::Calls().empty());
}

TEST_F(FullPath, SavedRootIdentityIsEnough) {
    fake_location::rules.path = [](const std::string&) {
        return getuid() == kUser ? "/the/user" : "/somebody/else";
    };
    ASSERT_EQ(seteuid(kUser + 1), 0);
    const bool found = LookUp("");
    ASSERT_EQ(seteuid(0), 0);
    EXPECT_TRUE(found);
    EXPECT_EQ(full, "/the/user");
}

TEST_F(FullPath, ChildIsCollectedUnderACallerThatIgnoresItsChildren) {
    fake_location::rules.deadly = SIGKILL;
    struct sigaction ignore {};
    ignore.sa_handler = SIG_DFL;
    ignore.sa_flags = SA_NOCLDWAIT;
    struct sigaction before {};
    ASSERT_EQ(sigaction(SIGCHLD, &ignore, &before), 0);
    EXPECT_FALSE(LookUp("")) << "the child's end was lost";
    struct sigaction after {};
    sigaction(SIGCHLD, &before, &after);
    EXPECT_NE(after.sa_flags & SA_NOCLDWAIT, 0);
}

TEST_F(FullPath, OutputOfTheCallerDoesNotGetIntoTheAnswer) {
    fake_location::rules.path = [](const std::string&) { return "/fuse/x"; };
    printf("kept in the caller's buffer ");
    ASSERT_TRUE(LookUp(""));
    EXPECT_EQ(full, "/fuse/x");
    printf("\n");
}

TEST_F(FullPath, WorksWithoutAStandardOutput) {
    fake_location::rules.path = [](const std::string&) { return "/fuse/x"; };
    fflush(stdout);
    const int kept = dup(STDOUT_FILENO);
    close(STDOUT_FILENO);
    const bool found = LookUp("pub");
    dup2(kept, STDOUT_FILENO);
    close(kept);
    EXPECT_TRUE(found);
    EXPECT_EQ(full, "/fuse/x");
}

TEST_F(FullPath, FailsWithoutAPipe) {
    fail_pipe = true;
    EXPECT_FALSE(LookUp(""));
    EXPECT_TRUE(seams::Logged("Failed to create pipe"));
}

TEST_F(FullPath, NoDescriptorIsLeftOpen) {
    fake_location::rules.path = [](const std::string&) { return "/fuse/x"; };
    ASSERT_TRUE(LookUp(""));
    const int before = dup(0);
    close(before);
    for (int i = 0; i < 20; ++i) {
        ASSERT_TRUE(LookUp("pub"));
    }
    const int after = dup(0);
    close(after);
    EXPECT_EQ(before, after);
}

}  // namespace
}  // namespace ZYROVFS::Utils
