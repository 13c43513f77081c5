// cp, cat and the clients of clouds as a person or a script uses them: a simulated Box account and
// a real FTP server.
#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <sys/stat.h>
#include <unistd.h>

#include <csignal>
#include <filesystem>
#include <fstream>
#include <memory>
#include <thread>

#include "support/cloudsim/cloudsim.h"
#include "support/locations.h"
#include "support/machine.h"
#include "support/xattrtree/xattrtree.h"

namespace {

using cloudsim::Fault;
using machine::Must;
using machine::Outcome;
using testing::AllOf;
using testing::HasSubstr;
using testing::IsEmpty;
using testing::Not;

namespace fs = std::filesystem;

const std::string kTool = BuildDir() + "/tools/zyrovfs/zyrovfs";
const std::string kBox = "box://amy@example.com";
const std::string kHome = "/home/amy/";
constexpr size_t kMiB = 1 << 20;

Outcome Zyrovfs(const std::string& arguments) {
    return machine::Run(kTool + " " + arguments);
}

Outcome ForAmy(const std::string& arguments) {
    return Zyrovfs(arguments + " --user amy");
}

std::string Pattern(size_t size) {
    std::string bytes(size, '\0');
    unsigned state = 7;
    for (char& byte : bytes) {
        state = state * 1103515245 + 12345;
        byte = static_cast<char>(state >> 16);
    }
    return bytes;
}

/** The account at the service, what the box would have mounted of it, and its saved profile. */
class Cloud : public testing::Environment {
  public:
    void SetUp() override {
        machine::AddUser("amy", 4001);
        machine::Remote("start first-secret");
        std::ofstream("/tmp/password") << "first-secret\n";
        cloudsim::BoxOptions options;
        options.api_name = options.upload_name = options.download_name = "127.0.0.1";
        service = std::make_unique<cloudsim::BoxService>(options);
        account = &service->AddAccount("amy@example.com", "Amy");
        tree = std::make_unique<XattrTree>("/tmp/tree");
        Must("mkdir -p /usr/zyro/etc/zyrovfs /var/tmp/zyrovfs/4001");
        std::ofstream("/usr/zyro/etc/zyrovfs/cloud.conf")
            << R"({"hosts":{"BoxApiHost":")" << service->ApiHost() << R"(","BoxUploadHost":")"
            << service->UploadHost() << "\"}}";
        std::ofstream("/tmp/secret") << "secret\n";
        Must(kTool + " cloud client add box client --password-file /tmp/secret");
        GiveTokens();
        Must(kTool + " profile add --user amy " + kDescription);
        // Stands for the mount: the box's own backend serves the tree that drivers look at.
        Must(R"(sed 's|"path":""|"path":"/tmp/tree"|' /usr/zyro/etc/zyrovfs/4001/servers.conf )"
             ">/var/tmp/zyrovfs/4001/connect.conf");
    }
    void TearDown() override {
        tree.reset();
        service.reset();
    }

    void GiveTokens() {
        const cloudsim::Tokens tokens = account->IssueTokens();
        std::ofstream("/tmp/access") << tokens.access_token << '\n';
        std::ofstream("/tmp/refresh") << tokens.refresh_token << '\n';
    }

    const std::string kDescription =
        "--protocol box --client-id client --access-token-file /tmp/access "
        "--refresh-token-file /tmp/refresh --expires-in 3600";
    std::unique_ptr<cloudsim::BoxService> service;
    cloudsim::Account* account = nullptr;
    std::unique_ptr<XattrTree> tree;
};
Cloud& TheCloud() {
    static auto* const cloud = new Cloud;
    return *cloud;
}
const auto* const kCloud = testing::AddGlobalTestEnvironment(&TheCloud());

class Transfer : public testing::Test {
  protected:
    void SetUp() override { service().Journal().Clear(); }
    void TearDown() override {
        EXPECT_THAT(service().UnusedFaults(), IsEmpty());
        service().ClearFaults();
    }
    static cloudsim::BoxService& service() { return *TheCloud().service; }
    static cloudsim::Account& account() { return *TheCloud().account; }

    /** Puts a file into the account where the tree shows it. */
    static void PutRemote(const std::string& path, const std::string& bytes) {
        const std::string id = account().AddPath(path, bytes);
        TheCloud().tree->Add(path, static_cast<long long>(bytes.size()));
        TheCloud().tree->Set(path, "id::file", "files/" + id);
    }
    static std::string Remote(const std::string& path) {
        const std::string id = account().Find(path);
        return id.empty() ? "nothing" : account().Bytes(id);
    }
    static void PutLocal(const std::string& name, const std::string& bytes) {
        std::ofstream(kHome + name, std::ios::binary) << bytes;
        Must("chown amy:100 " + kHome + name);
    }
    static std::string Local(const std::string& name) { return machine::Read(kHome + name); }
};

TEST_F(Transfer, UploadsAFileAndDownloadsItAgain) {
    const std::string bytes = Pattern(3 * kMiB + 1);
    PutLocal("up.bin", bytes);
    const Outcome up = ForAmy("cp " + kHome + "up.bin " + kBox + "/");
    EXPECT_EQ(up.status, 0) << up.output;
    EXPECT_THAT(up.output, HasSubstr("Copied /home/amy/up.bin to " + kBox + "/up.bin: 3.0 MiB in"));
    EXPECT_EQ(Remote("/up.bin"), bytes);
    PutRemote("/down.bin", bytes);
    const Outcome down = ForAmy("cp " + kBox + "/down.bin " + kHome);
    EXPECT_EQ(down.status, 0) << down.output;
    EXPECT_EQ(Local("down.bin"), bytes);
    EXPECT_FALSE(fs::exists(kHome + "down.bin.part"));
    struct stat info {};
    ASSERT_EQ(stat((kHome + "down.bin").c_str(), &info), 0);
    EXPECT_EQ(info.st_uid, 4001U) << "made with the user's rights";
}

TEST_F(Transfer, CopiesBetweenServersWithoutAFile) {
    const std::string bytes = Pattern(2 * kMiB);
    std::ofstream("/srv/remote/music.bin", std::ios::binary) << bytes;
    Must(kTool +
         " connection add --user amy --protocol ftp --hostname 127.0.0.1 --port 2121 "
         "--account remo --password-file /tmp/password");
    const std::string ftp = "ftp://remo@127.0.0.1:2121";
    const Outcome in = ForAmy("cp " + ftp + "/music.bin " + kBox + "/");
    EXPECT_EQ(in.status, 0) << in.output;
    EXPECT_EQ(Remote("/music.bin"), bytes);
    PutRemote("/film.bin", bytes);
    const Outcome out = ForAmy("cp " + kBox + "/film.bin " + ftp + "/film.bin --json");
    EXPECT_EQ(out.status, 0) << out.output;
    EXPECT_THAT(out.output, AllOf(HasSubstr("\"bytes\" : 2097152"), HasSubstr("\"seconds\"")));
    EXPECT_EQ(machine::Read("/srv/remote/film.bin"), bytes);
}

TEST_F(Transfer, CatGivesTheVeryBytes) {
    const std::string bytes = Pattern(9 * kMiB + 5);
    PutRemote("/cat.bin", bytes);
    PutRemote("/empty", "");
    Must(kTool + " cat " + kBox + "/cat.bin --user amy | cat >/tmp/cat.bin");
    EXPECT_EQ(machine::Read("/tmp/cat.bin"), bytes);
    EXPECT_EQ(Must(kTool + " cat " + kBox + "/empty --user amy"), "");
}

TEST_F(Transfer, ResumeAsksForTheRestAlone) {
    const std::string bytes = Pattern(2 * kMiB);
    PutRemote("/long.bin", bytes);
    PutLocal("long.bin.part", bytes.substr(0, kMiB));
    const Outcome outcome = ForAmy("cp " + kBox + "/long.bin " + kHome + " --resume");
    EXPECT_EQ(outcome.status, 0) << outcome.output;
    EXPECT_EQ(Local("long.bin"), bytes);
    EXPECT_THAT(outcome.output, HasSubstr("1.0 MiB in"));
    PutLocal("long.bin.part", bytes + "more");
    const Outcome refused = ForAmy("cp " + kBox + "/long.bin " + kHome + " --resume");
    EXPECT_EQ(refused.status, 1);
    EXPECT_THAT(refused.output, HasSubstr("is longer than the remote file; remove it."));
}

TEST_F(Transfer, ALimitedRateTakesItsTime) {
    PutRemote("/slow.bin", Pattern(300000));
    const auto begin = std::chrono::steady_clock::now();
    const Outcome outcome = ForAmy("cp " + kBox + "/slow.bin " + kHome + " --limit-rate 200K");
    const std::chrono::duration<double> took = std::chrono::steady_clock::now() - begin;
    EXPECT_EQ(outcome.status, 0) << outcome.output;
    EXPECT_GT(took.count(), 1.0);
}

/** Ends the running tool with `signal` when its part file has begun to grow. */
Outcome Interrupted(const std::string& arguments, const std::string& part, const char* signal) {
    std::thread hand([&] {
        for (int tries = 0; tries < 200; ++tries) {
            std::error_code none;
            if (part.empty() ? tries > 10 : fs::file_size(part, none) > 0 && !none) {
                break;
            }
            usleep(50000);
        }
        machine::Run(std::string("pkill -") + signal + " -x zyrovfs");
    });
    const Outcome outcome = ForAmy(arguments);
    hand.join();
    return outcome;
}

TEST_F(Transfer, CtrlCEndsADownloadAsCancelledAndKeepsThePart) {
    PutRemote("/big.bin", Pattern(4 * kMiB));
    const std::string part = kHome + "big.bin.part";
    const Outcome outcome =
        Interrupted("cp " + kBox + "/big.bin " + kHome + " --limit-rate 500K", part, "INT");
    EXPECT_EQ(outcome.status, 9);
    EXPECT_THAT(outcome.output,
                AllOf(HasSubstr("VFS_ERR_CANCELLED"), HasSubstr("--resume goes on with it")));
    EXPECT_TRUE(fs::exists(part));
    EXPECT_FALSE(fs::exists(kHome + "big.bin"));
    const Outcome again = ForAmy("cp " + kBox + "/big.bin " + kHome + " --resume");
    EXPECT_EQ(again.status, 0) << again.output;
    EXPECT_EQ(Local("big.bin"), Pattern(4 * kMiB));
}

TEST_F(Transfer, CtrlCDuringAnUploadLeavesNothingAtTheService) {
    PutLocal("half.bin", Pattern(4 * kMiB));
    const Outcome outcome =
        Interrupted("cp " + kHome + "half.bin " + kBox + "/ --limit-rate 500K", "", "INT");
    EXPECT_EQ(outcome.status, 9);
    EXPECT_THAT(outcome.output, HasSubstr("VFS_ERR_CANCELLED"));
    EXPECT_EQ(Remote("/half.bin"), "nothing");
}

TEST_F(Transfer, CtrlCEndsATransferWhoseServiceIsSilent) {
    PutRemote("/stalls.bin", Pattern(4 * kMiB));
    PutLocal("stalls.bin", Pattern(4 * kMiB));
    service().AddFault(Fault::On("GET", "/d/").Pause(100000, 120));
    service().AddFault(Fault::On("POST", "/api/2.0/files/content").PauseUpload(100000, 120));
    const std::string part = kHome + "down.bin.part";
    const Outcome down =
        Interrupted("cp " + kBox + "/stalls.bin " + kHome + "down.bin", part, "INT");
    EXPECT_EQ(down.status, 9) << down.output;
    EXPECT_THAT(down.output, HasSubstr("VFS_ERR_CANCELLED"));
    const Outcome up = Interrupted("cp " + kHome + "stalls.bin " + kBox + "/up.bin", "", "INT");
    EXPECT_EQ(up.status, 9) << up.output;
    EXPECT_THAT(up.output, HasSubstr("VFS_ERR_CANCELLED"));
    EXPECT_EQ(Remote("/up.bin"), "nothing");
    EXPECT_THAT(service().UnusedFaults(), IsEmpty());
}

TEST_F(Transfer, ADisconnectEndsTheTransfersOfAConnection) {
    PutRemote("/busy.bin", Pattern(4 * kMiB));
    std::thread hand([] {
        for (int tries = 0; tries < 100 && !fs::exists(kHome + "busy.bin.part"); ++tries) {
            usleep(50000);
        }
        EXPECT_THAT(Must("cat /var/tmp/zos/task/amy/*"), HasSubstr("box://amy@example.com"));
        ForAmy("connection disconnect " + kBox);
    });
    const Outcome outcome = ForAmy("cp " + kBox + "/busy.bin " + kHome + " --limit-rate 500K");
    hand.join();
    EXPECT_EQ(outcome.status, 9);
    EXPECT_THAT(outcome.output, HasSubstr("VFS_ERR_CANCELLED"));
    EXPECT_EQ(machine::Run("ls /var/tmp/zos/task/amy").output, "") << "no task stays";
}

TEST_F(Transfer, FailuresOfTheServiceTellByTheirStatus) {
    PutRemote("/gone.bin", "gone");
    account().Remove(account().Find("/gone.bin"));
    const Outcome gone = ForAmy("cp " + kBox + "/gone.bin " + kHome);
    EXPECT_EQ(gone.status, 4);
    EXPECT_THAT(gone.output, HasSubstr("VFS_ERR_NOT_FOUND"));

    PutLocal("full.bin", Pattern(1000));
    service().AddFault(Fault::On("OPTIONS", "/2.0/files/content")
                           .Answer(403, R"({"code":"storage_limit_exceeded"})"));
    EXPECT_EQ(ForAmy("cp " + kHome + "full.bin " + kBox + "/").status, 11);
    service().AddFault(Fault::On("OPTIONS", "/2.0/files/content")
                           .Answer(403, R"({"code":"file_size_limit_exceeded"})"));
    EXPECT_EQ(ForAmy("cp " + kHome + "full.bin " + kBox + "/").status, 15);
    service().AddFault(
        Fault::On("OPTIONS", "/2.0/files/content").Answer(400, R"({"code":"item_name_invalid"})"));
    EXPECT_EQ(ForAmy("cp " + kHome + "full.bin " + kBox + "/").status, 17);
}

TEST_F(Transfer, LocalFilesAreTheUsersBusiness) {
    EXPECT_THAT(ForAmy("cp " + kHome + "missing " + kBox + "/").output,
                HasSubstr("Opening /home/amy/missing failed: No such file or directory"));
    EXPECT_THAT(ForAmy("cp /home " + kBox + "/").output, HasSubstr("/home is no file."));
    std::ofstream("/tmp/roots-own") << "secret";
    Must("chmod 600 /tmp/roots-own");
    Must("chmod 640 /tmp/roots-own");  // for the group of root, who runs the command
    const Outcome refused = ForAmy("cp /tmp/roots-own " + kBox + "/");
    EXPECT_EQ(refused.status, 1);
    EXPECT_THAT(refused.output, HasSubstr("Permission denied"));
    PutRemote("/note.txt", "note");
    EXPECT_THAT(ForAmy("cp " + kBox + "/note.txt /usr/").output, HasSubstr("Permission denied"));
}

TEST_F(Transfer, WhatCannotBeMeantIsSaid) {
    EXPECT_EQ(ForAmy("cp /tmp/a /tmp/b").status, 2);
    EXPECT_EQ(ForAmy("cat /tmp/a").status, 2);
    EXPECT_EQ(ForAmy("cp " + kBox + "/folder/ /tmp").status, 2);
    EXPECT_EQ(ForAmy("cp /tmp/a " + kBox + "/a --limit-rate fast").status, 2);
    EXPECT_EQ(ForAmy("cp /tmp/a " + kBox + "/a --limit-rate 0").status, 2);
    const Outcome unknown = ForAmy("cp /tmp/password box://bob@example.com/x");
    EXPECT_EQ(unknown.status, 1);
    EXPECT_THAT(
        unknown.output,
        HasSubstr("The user has neither a connection nor a profile box://bob@example.com."));
}

TEST_F(Transfer, ABarIsForTerminalsAlone) {
    PutRemote("/bar.bin", Pattern(600000));
    const std::string command =
        kTool + " cp " + kBox + "/bar.bin " + kHome + " --user amy --limit-rate 400K";
    EXPECT_THAT(machine::Run(command).output, Not(HasSubstr("left")));
    const std::string shown = Must("script -qec '" + command + "' /dev/null </dev/null");
    EXPECT_THAT(shown, AllOf(HasSubstr("bar.bin"), HasSubstr(" of 585.9 KiB"), HasSubstr("KiB/s"),
                             HasSubstr("left"), HasSubstr("#")));
}

TEST_F(Transfer, AnAccountThatIsNotLetInIsSaidWithWhatToDo) {
    std::ofstream("/tmp/bad-token") << "no token\n";
    const Outcome refused = ForAmy(
        "profile add --protocol box --client-id client --access-token-file /tmp/bad-token "
        "--refresh-token-file /tmp/bad-token --expires-in 3600");
    EXPECT_EQ(refused.status, 1);
    EXPECT_THAT(refused.output, HasSubstr("VFS_ERR_UNAUTHORIZED"));
    std::ofstream("/tmp/two-lines") << "one\ntwo\n";
    EXPECT_THAT(ForAmy("profile add --protocol box --client-id client --access-token-file "
                       "/tmp/two-lines")
                    .output,
                HasSubstr("The token in /tmp/two-lines is not one line of text."));
    account().ExpireAccessTokens();
    account().RevokeRefreshTokens();
    PutLocal("late.bin", "late");
    const Outcome late = ForAmy("cp " + kHome + "late.bin " + kBox + "/");
    EXPECT_EQ(late.status, 16);
    EXPECT_THAT(late.output, HasSubstr("no longer lets this connection in"));
    TheCloud().GiveTokens();
    Must(kTool + " profile set " + kBox + " --user amy --access-token-file /tmp/access " +
         "--refresh-token-file /tmp/refresh");
}

TEST_F(Transfer, SecretsOfClientsAreKeptAndNeverShown) {
    std::ofstream("/tmp/other-secret") << "canary-secret\n";
    Must(kTool + " cloud client add dropbox mine --password-file /tmp/other-secret");
    const std::string list = Must(kTool + " cloud client list");
    EXPECT_THAT(list, AllOf(HasSubstr("dropbox  mine"), HasSubstr("box      client"),
                            Not(HasSubstr("canary"))));
    EXPECT_THAT(machine::Read("/usr/zyro/etc/zyrovfs/cloud.conf"), Not(HasSubstr("canary")));
    EXPECT_EQ(Must(kTool + " cloud client list --json | tr -d ' \\n'"),
              R"({"box":["client"],"dropbox":["mine"]})");
    Must(kTool + " cloud client remove dropbox mine");
    Must(kTool + " cloud client remove dropbox mine");
    EXPECT_THAT(Must(kTool + " cloud client list"), Not(HasSubstr("dropbox")));
    EXPECT_EQ(Zyrovfs("cloud client add nowhere x --password-file /tmp/secret").status, 2);
    EXPECT_EQ(Zyrovfs("cloud client add box x").status, 2);
    EXPECT_THAT(machine::RunAs("amy", kTool + " cloud client list").output,
                HasSubstr("Only root can change the services."));
}

}  // namespace
