// The host layer: installing, checking and removing it on a plain Debian machine, and the launcher
// that it puts in the place of gvfsd-fuse. The private host comes with the layer installed; each
// test begins by taking it away.
#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <filesystem>
#include <sstream>

#include "support/locations.h"
#include "support/machine.h"

namespace {

using machine::Must;
using machine::Outcome;
using testing::AllOf;
using testing::HasSubstr;
using testing::Not;

const std::string kTool = BuildDir() + "/tools/zyrovfs/zyrovfs";
const std::string kBuild = " --build " + BuildDir();
const std::string kMounts = "/usr/share/gvfs/mounts/";

/** machine::Run, whose name tests have for their own. */
Outcome Shell(const std::string& command) {
    return machine::Run(command);
}

Outcome Host(const std::string& arguments) {
    return Shell(kTool + " host " + arguments);
}
Outcome Install() {
    return Host("install" + kBuild);
}
Outcome Check() {
    return Host("check" + kBuild);
}

void Write(const std::string& path, const std::string& text) {
    std::ofstream(path, std::ios::binary) << text;
}

/** Names, kinds, modes, owners and contents of all that the layer may touch. */
std::string Snapshot() {
    return Must(
        "cd / && find usr/zyro usr/share/gvfs usr/lib/gvfs usr/sbin/dbus-daemon etc/fuse.conf* "
        "-printf '%p %y %l %m %U %G\\n' 2>/dev/null | sort; "
        "find usr/share/gvfs usr/lib/gvfs etc/fuse.conf var/lib/dpkg/diversions -type f | sort | "
        "xargs md5sum");
}

class HostLayer : public testing::Test {
  protected:
    void SetUp() override {
        ASSERT_EQ(Host("remove").status, 0);
        plain_ = Snapshot();
    }
    void ExpectPlain() const { EXPECT_EQ(Snapshot(), plain_); }

    std::string plain_;
};

TEST_F(HostLayer, RemovalBringsBackWhatThePackagesHad) {
    const Outcome verified = Shell("dpkg --verify gvfs-daemons gvfs-backends gvfs-fuse fuse3");
    EXPECT_THAT(verified.output, Not(HasSubstr("/usr/share/gvfs/mounts")));
    EXPECT_THAT(verified.output, Not(HasSubstr("/usr/lib/gvfs")));
    EXPECT_THAT(verified.output, Not(HasSubstr("/etc/fuse.conf")));
    EXPECT_EQ(Must("readlink /usr/lib/gvfs/gvfsd-fuse"), "../../libexec/gvfsd-fuse\n");
    EXPECT_THAT(Must("dpkg-divert --list"), Not(HasSubstr("zyrovfs")));
}

TEST_F(HostLayer, InstallMakesTheMachineReadyAndRemoveLeavesItAsItWas) {
    EXPECT_EQ(Check().status, 1);
    ASSERT_EQ(Install().status, 0);
    const Outcome check = Check();
    EXPECT_EQ(check.status, 0) << check.output;
    EXPECT_EQ(check.output, "This host is ready.\n");
    EXPECT_EQ(Host("remove").status, 0);
    ExpectPlain();
}

TEST_F(HostLayer, TheFoldersHaveTheOwnersAndModesThatTheLibraryNeeds) {
    ASSERT_EQ(Install().status, 0);
    EXPECT_EQ(Must("stat -c '%u %g %a' /usr/zyro/etc/zyrovfs /usr/zyro/etc/private"),
              "0 0 755\n0 100 750\n");
    EXPECT_EQ(Must("readlink -f /sbin/dbus-daemon"), "/usr/bin/dbus-daemon\n");
}

TEST_F(HostLayer, InstallingTwiceChangesNothingMore) {
    ASSERT_EQ(Install().status, 0);
    const std::string once = Snapshot();
    EXPECT_EQ(Install().status, 0);
    EXPECT_EQ(Snapshot(), once);
    EXPECT_EQ(Host("remove").status, 0);
    EXPECT_EQ(Host("remove").status, 0);
    ExpectPlain();
}

/** Breaks an installation off where only some files were moved aside, one of them not replaced. */
void InstallByHalf() {
    for (const char* name : {"ftp.mount", "trash.mount"}) {
        const std::string path = kMounts + name;
        Must("dpkg-divert --local --quiet --rename --divert " + path + ".zyrovfs-stock --add " +
             path);
    }
    Write(kMounts + "ftp.mount.zyrovfs-new", "[Mo");
    Must("mkdir -m 700 -p /usr/zyro/etc");
}

TEST_F(HostLayer, AHalfDoneInstallationCanBeRepeated) {
    InstallByHalf();
    EXPECT_EQ(Check().status, 1);
    EXPECT_EQ(Install().status, 0);
    EXPECT_EQ(Check().output, "This host is ready.\n");
    EXPECT_EQ(Host("remove").status, 0);
    ExpectPlain();
}

TEST_F(HostLayer, AHalfDoneInstallationCanBeRemoved) {
    InstallByHalf();
    EXPECT_EQ(Host("remove").status, 0);
    ExpectPlain();
}

TEST_F(HostLayer, AKilledInstallationCanBeRepeatedAtAnyPoint) {
    for (const char* delay : {"0.01", "0.05", "0.1", "0.2", "0.3"}) {
        Shell("timeout --signal=KILL " + std::string(delay) + " " + kTool + " host install" +
              kBuild);
        // A dpkg-divert that it had started may still be at work.
        Must("while pgrep -x dpkg-divert >/dev/null; do sleep 0.01; done");
        ASSERT_EQ(Install().status, 0) << delay;
        ASSERT_EQ(Check().status, 0) << delay;
        ASSERT_EQ(Host("remove").status, 0);
        ExpectPlain();
    }
}

TEST_F(HostLayer, FuseConfWithoutALastNewlineComesBackByteForByte) {
    for (const std::string before : {"", "mount_max = 7", "\n\n", "#user_allow_other\r\n"}) {
        Write("/etc/fuse.conf", before);
        ASSERT_EQ(Install().status, 0);
        EXPECT_EQ(Check().status, 0);
        ASSERT_EQ(Host("remove").status, 0);
        EXPECT_EQ(machine::Read("/etc/fuse.conf"), before);
    }
}

TEST_F(HostLayer, FuseConfKeepsWhatTheOwnerOfTheMachineWrites) {
    Write("/etc/fuse.conf", "  user_allow_other\n");
    ASSERT_EQ(Install().status, 0);
    EXPECT_EQ(machine::Read("/etc/fuse.conf"), "  user_allow_other\n");
    Write("/etc/fuse.conf", "");
    ASSERT_EQ(Install().status, 0);
    Must("echo 'mount_max = 3' >>/etc/fuse.conf");
    ASSERT_EQ(Host("remove").status, 0);
    EXPECT_EQ(machine::Read("/etc/fuse.conf"), "mount_max = 3\n");
}

TEST_F(HostLayer, FoldersThatHoldSomethingStayOnRemoval) {
    ASSERT_EQ(Install().status, 0);
    Write("/usr/zyro/etc/private/key", "secret");
    ASSERT_EQ(Host("remove").status, 0);
    EXPECT_EQ(machine::Read("/usr/zyro/etc/private/key"), "secret");
    EXPECT_FALSE(std::filesystem::exists("/usr/zyro/etc/zyrovfs"));
    std::filesystem::remove_all("/usr/zyro");
}

TEST_F(HostLayer, ALinkInAFoldersPlaceIsRefusedAndNotFollowed) {
    Must(
        "mkdir -p /usr/zyro/etc /tmp/elsewhere && chmod 700 /tmp/elsewhere && "
        "ln -s /tmp/elsewhere /usr/zyro/etc/private");
    const Outcome outcome = Install();
    EXPECT_EQ(outcome.status, 1);
    EXPECT_THAT(outcome.output, HasSubstr("/usr/zyro/etc/private is not a folder."));
    EXPECT_EQ(Must("stat -c '%g %a' /tmp/elsewhere"), "0 700\n");
    Must("rm /usr/zyro/etc/private");
}

TEST_F(HostLayer, AnOwnDbusDaemonOfTheMachineIsLeftAlone) {
    Must("cp /usr/bin/dbus-daemon /sbin/dbus-daemon");
    ASSERT_EQ(Install().status, 0);
    EXPECT_FALSE(std::filesystem::is_symlink("/sbin/dbus-daemon"));
    ASSERT_EQ(Host("remove").status, 0);
    EXPECT_TRUE(std::filesystem::exists("/sbin/dbus-daemon"));
    Must("rm /sbin/dbus-daemon");
}

TEST_F(HostLayer, ADiversionOfSomeoneElseIsReportedAndKept) {
    Must("dpkg-divert --local --quiet --rename --divert /usr/share/ftp.theirs --add " + kMounts +
         "ftp.mount");
    const Outcome outcome = Install();
    EXPECT_EQ(outcome.status, 1);
    EXPECT_THAT(outcome.output, AllOf(HasSubstr("Diverting " + kMounts + "ftp.mount failed"),
                                      HasSubstr("clashes")));
    ASSERT_EQ(Host("remove").status, 0);
    EXPECT_THAT(Must("dpkg-divert --list"), HasSubstr("/usr/share/ftp.theirs"));
    Must("dpkg-divert --local --quiet --rename --remove " + kMounts + "ftp.mount");
    ExpectPlain();
}

TEST_F(HostLayer, CheckSaysWhatIsMissingAndWhichPackageBringsIt) {
    ASSERT_EQ(Install().status, 0);
    struct {
        const char* path;
        const char* says;
    } const rows[] = {
        {"/usr/bin/ssh-keygen", "package openssh-client."},
        {"/usr/libexec/gvfsd-nfs", "package gvfs-backends."},
        {"/usr/libexec/gvfsd-fuse", "package gvfs-fuse."},
        {"/usr/bin/fusermount3", "package fuse3."},
        {"/usr/zyro/etc/zyrovfs", "/usr/zyro/etc/zyrovfs is missing"},
        {"/usr/share/gvfs/mounts/davs.mount", "/usr/share/gvfs/mounts/davs.mount"},
        {"/sbin/dbus-daemon", "/sbin/dbus-daemon"},
    };
    for (const auto& row : rows) {
        const std::string path = row.path;
        Must("mv " + path + " " + path + ".away");
        const Outcome outcome = Check();
        EXPECT_EQ(outcome.status, 1) << path;
        EXPECT_THAT(outcome.output, HasSubstr(row.says));
        Must("mv " + path + ".away " + path);
    }
    EXPECT_EQ(Check().status, 0);
}

TEST_F(HostLayer, CheckAnswersInJson) {
    EXPECT_THAT(Host("check --json" + kBuild).output,
                AllOf(HasSubstr("\"ok\" : false"), HasSubstr("user_allow_other")));
    ASSERT_EQ(Install().status, 0);
    EXPECT_THAT(Host("check --json" + kBuild).output, HasSubstr("\"ok\" : true"));
}

TEST_F(HostLayer, AChangedCatalogueFileIsNoticedAndSetRight) {
    ASSERT_EQ(Install().status, 0);
    Must("echo Name=Other >>" + kMounts + "sftp.mount");
    EXPECT_EQ(Check().status, 1);
    EXPECT_EQ(Install().status, 0);
    EXPECT_EQ(Check().status, 0);
}

TEST_F(HostLayer, OnlyRootMayChangeTheMachine) {
    machine::AddUser("plain", 4010);
    const Outcome outcome = machine::RunAs("plain", kTool + " host install" + kBuild);
    EXPECT_EQ(outcome.status, 1);
    EXPECT_THAT(outcome.output, HasSubstr("Only root can change the host."));
    EXPECT_EQ(machine::RunAs("plain", kTool + " host remove").status, 1);
    ExpectPlain();
}

TEST_F(HostLayer, AWrongBuildTreeIsRefusedBeforeAnythingIsChanged) {
    const Outcome outcome = Host("install --build /nowhere");
    EXPECT_EQ(outcome.status, 1);
    EXPECT_THAT(outcome.output, HasSubstr("/nowhere/platform/host"));
    ExpectPlain();
}

std::string Key(const std::string& path, const std::string& key) {
    std::istringstream lines(machine::Read(path));
    for (std::string line; std::getline(lines, line);) {
        if (line.compare(0, key.size() + 1, key + "=") == 0) {
            return line.substr(key.size() + 1);
        }
    }
    return "";
}

TEST_F(HostLayer, TheCatalogueHasTheNetworkProtocolsAndNoNamelessEntry) {
    ASSERT_EQ(Install().status, 0);
    std::string listed;
    for (const std::string name : {"box", "dav", "davs", "dropbox", "ftp", "google", "nfs",
                                   "onedrive", "sftp", "sharing", "smb"}) {
        const std::string path = kMounts + name + ".mount";
        listed += path + "\n";
        EXPECT_EQ(Key(path, "Protocol"), name);
        for (const char* key : {"Name", "Actions", "EnableCurl", "DefaultPort"}) {
            EXPECT_NE(Key(path, key), "") << path << " " << key;
        }
    }
    EXPECT_EQ(Must("ls " + kMounts + "*.mount"), listed);
}

TEST_F(HostLayer, OurCatalogueFilesKeepEveryKeyThatGvfsHad) {
    ASSERT_EQ(Install().status, 0);
    for (const std::string name : {"ftp", "sftp", "smb", "nfs", "dav"}) {
        std::istringstream stock(machine::Read(kMounts + name + ".mount.zyrovfs-stock"));
        const std::string ours = machine::Read(kMounts + name + ".mount");
        for (std::string line; std::getline(stock, line);) {
            // The one stock file of two types has become two files.
            line = line == "Type=dav;davs" ? "Type=dav" : line;
            EXPECT_THAT("\n" + ours, HasSubstr("\n" + line + "\n")) << name;
        }
    }
    EXPECT_EQ(Key(kMounts + "davs.mount", "Type"), "davs");
    EXPECT_EQ(Key(kMounts + "davs.mount", "Exec"), Key(kMounts + "dav.mount", "Exec"));
}

// --- the launcher -----------------------------------------------------------------------------

/** Puts a program in the place of the real gvfsd-fuse which tells how it was started. */
class Launcher : public HostLayer {
  protected:
    void SetUp() override {
        HostLayer::SetUp();
        ASSERT_EQ(Install().status, 0);
        Must("mv /usr/libexec/gvfsd-fuse /usr/libexec/real-away");
        Write("/usr/libexec/gvfsd-fuse",
              "#!/bin/sh\nread name </proc/$$/comm\necho \"$$ $name\"\n"
              "[ $# = 0 ] || printf '<%s>' \"$@\"\n");
        Must("chmod 755 /usr/libexec/gvfsd-fuse");
    }
    void TearDown() override { Must("mv /usr/libexec/real-away /usr/libexec/gvfsd-fuse"); }
};

/** What the launcher adds: only the owner and root get into the tree. */
const std::string kOwners = "<-odefault_permissions>";

std::string Line(const std::string& text, int number) {
    std::istringstream lines(text);
    std::string line;
    for (int i = 0; i <= number; ++i) {
        line.clear();
        std::getline(lines, line);
    }
    return line;
}

TEST_F(Launcher, TheRealProgramKeepsThePidAndTheNameOfTheProcess) {
    const std::string said = Must("sh -c 'echo $$; exec /usr/lib/gvfs/gvfsd-fuse /mnt/point -f'");
    EXPECT_EQ(Line(said, 1), Line(said, 0) + " gvfsd-fuse");
    EXPECT_EQ(Line(said, 2), kOwners + "</mnt/point><-f>");
}

TEST_F(Launcher, OptionsThatFuse3ForgotAreDroppedAndTheRestIsKept) {
    const struct {
        const char* given;
        const char* kept;
    } rows[] = {
        {"", ""},
        {"/m -f -o big_writes -o direct_io -o allow_other", "</m><-f><-o><allow_other>"},
        {"/m -obig_writes -odirect_io -oallow_other", "</m><-oallow_other>"},
        {"-o big_writes,allow_other,direct_io /m", "<-o><allow_other></m>"},
        {"-o ro,big_writes,nodev,direct_io,nosuid", "<-o><ro,nodev,nosuid>"},
        {"-odirect_io,ro", "<-oro>"},
        {"-o big_writes,direct_io -s", "<-s>"},
        {"-o direct_iox,xbig_writes,big_writes=1", "<-o><direct_iox,xbig_writes,big_writes=1>"},
        {"-o 'fsname=a\\,direct_io,ro'", "<-o><fsname=a\\,direct_io,ro>"},
        {"-o ro,,rw", "<-o><ro,,rw>"},
        {"-o ''", "<-o><>"},
        {"/m -o", "</m><-o>"},
        {"big_writes direct_io", "<big_writes><direct_io>"},
        {"-o direct_io -- -o direct_io", "<--><-o><direct_io>"},
    };
    for (const auto& row : rows) {
        const std::string said = Must(std::string("/usr/lib/gvfs/gvfsd-fuse ") + row.given);
        EXPECT_EQ(Line(said, 1), kOwners + row.kept) << row.given;
    }
}

TEST_F(Launcher, AMissingRealProgramIsSaidAndFails) {
    Must("mv /usr/libexec/gvfsd-fuse /usr/libexec/gone");
    const Outcome outcome = Shell("/usr/lib/gvfs/gvfsd-fuse /m");
    EXPECT_EQ(outcome.status, 127);
    EXPECT_THAT(outcome.output, HasSubstr("/usr/libexec/gvfsd-fuse: No such file"));
}

}  // namespace
