#include "core/json.h"

#include <fcntl.h>
#include <gmock/gmock.h>
#include <sys/mount.h>
#include <sys/stat.h>
#include <sys/wait.h>
#include <unistd.h>

#include <cerrno>
#include <cmath>
#include <csignal>
#include <cstring>
#include <ctime>
#include <filesystem>
#include <fstream>
#include <random>
#include <sstream>
#include <string>

#include "support/other_process.h"

namespace ZYROVFS::json {
namespace {

namespace fs = std::filesystem;

const std::string kTop = "/var/tmp/json_test";
const std::string kFile = kTop + "/connect.conf";

std::string ReadAll(const std::string& path) {
    std::ifstream stream(path, std::ios::binary);
    std::ostringstream text;
    text << stream.rdbuf();
    return text.str();
}

void Write(const std::string& text) {
    std::ofstream(kFile, std::ios::binary) << text;
}

Json::Value Document(int number = 1) {
    Json::Value value;
    value["sftp://amy@h"]["alias"] = "nas";
    value["sftp://amy@h"]["number"] = number;
    return value;
}

size_t NamesInTop() {
    return static_cast<size_t>(
        std::distance(fs::directory_iterator(kTop), fs::directory_iterator()));
}

class JsonFile : public testing::Test {
  protected:
    void SetUp() override {
        fs::remove_all(kTop);
        fs::create_directories(kTop);
    }
    void TearDown() override { umount2(kTop.c_str(), MNT_DETACH); }
};

TEST_F(JsonFile, GoesToDiskAndBack) {
    ASSERT_TRUE(toFile(Document(), kFile));
    EXPECT_EQ(ReadAll(kFile), toString(Document()) + "\n");
    Json::Value value;
    EXPECT_TRUE(fromFile(value, kFile));
    EXPECT_EQ(value, Document());
    EXPECT_EQ(NamesInTop(), 1U);
}

TEST_F(JsonFile, OneMebibyteGoesToDiskAndBack) {
    Json::Value in;
    std::mt19937 random(1);
    std::string bytes(1 << 20, '\0');
    for (char& byte : bytes) {
        byte = static_cast<char>(random());
    }
    in["bytes"] = bytes;
    ASSERT_TRUE(toFile(in, kFile));
    Json::Value out;
    ASSERT_TRUE(fromFile(out, kFile));
    EXPECT_EQ(out, in);
}

TEST_F(JsonFile, AbsentFileTellsENOENT) {
    Json::Value value = Document();
    EXPECT_FALSE(fromFile(value, kFile));
    EXPECT_EQ(errno, ENOENT);
    EXPECT_TRUE(value.isNull());
}

TEST_F(JsonFile, EmptyTruncatedAndForeignFilesAreBadJson) {
    const std::string whole = toString(Document());
    for (const std::string& text :
         {std::string(), std::string("\n"), whole.substr(0, whole.size() - 1),
          whole.substr(0, whole.size() / 2), whole + whole, std::string(64, '\0'),
          std::string("\x7f"
                      "ELF\x02\x01\x01"),
          std::string(10000, '[')}) {
        Write(text);
        Json::Value value = Document();
        EXPECT_FALSE(fromFile(value, kFile)) << text;
        EXPECT_EQ(errno, EINVAL);
        EXPECT_TRUE(value.isNull());
    }
}

TEST_F(JsonFile, EveryTruncationOfADocumentIsBadJson) {
    const std::string whole = toString(Document());
    for (size_t length = 0; length < whole.size(); ++length) {
        Write(whole.substr(0, length));
        Json::Value value;
        EXPECT_FALSE(fromFile(value, kFile)) << length;
    }
}

TEST_F(JsonFile, FolderFifoAndLinkAreNotRead) {
    Json::Value value;
    fs::create_directory(kFile);
    EXPECT_FALSE(fromFile(value, kFile));
    EXPECT_EQ(errno, EISDIR);
    fs::remove(kFile);

    ASSERT_EQ(mkfifo(kFile.c_str(), 0666), 0);
    alarm(20);
    EXPECT_FALSE(fromFile(value, kFile)) << "and not waited for";
    alarm(0);
    EXPECT_EQ(errno, EINVAL);
    fs::remove(kFile);

    ASSERT_TRUE(toFile(Document(), kTop + "/target"));
    fs::create_symlink(kTop + "/target", kFile);
    EXPECT_FALSE(fromFile(value, kFile));
    EXPECT_EQ(errno, ELOOP);
    EXPECT_FALSE(fromFile(value, "/dev/zero"));
    EXPECT_EQ(errno, EINVAL);
}

TEST_F(JsonFile, GiganticFileIsRefusedBeforeItFillsTheMemory) {
    Write("[]");
    ASSERT_EQ(truncate(kFile.c_str(), off_t{1} << 40), 0);
    Json::Value value;
    EXPECT_FALSE(fromFile(value, kFile));
    EXPECT_EQ(errno, EFBIG);
}

TEST_F(JsonFile, ModeIsTheOneAskedForWhateverTheUmask) {
    const mode_t saved = umask(077);
    ASSERT_TRUE(toFile(Document(), kFile));
    struct stat info {};
    ASSERT_EQ(stat(kFile.c_str(), &info), 0);
    EXPECT_EQ(info.st_mode & 07777, 0600U);
    ASSERT_TRUE(toFile(Document(), kFile, 0744));
    umask(saved);
    ASSERT_EQ(stat(kFile.c_str(), &info), 0);
    EXPECT_EQ(info.st_mode & 07777, 0744U);
}

TEST_F(JsonFile, OwnerIsGivenBeforeTheFileTakesItsPlace) {
    ASSERT_TRUE(toFile(Document(), kFile, 0600, {1001, 100}));
    struct stat info {};
    ASSERT_EQ(stat(kFile.c_str(), &info), 0);
    EXPECT_EQ(info.st_uid, 1001U);
    EXPECT_EQ(info.st_gid, 100U);
    EXPECT_EQ(info.st_mode & 07777, 0600U);
}

TEST_F(JsonFile, CallerWhoMayNotGiveFilesAwayKeepsThem) {
    ASSERT_EQ(chmod(kTop.c_str(), 01777), 0);
    const int status = support::ExitOf([] {
        if (setresgid(100, 100, 100) != 0 || setresuid(1001, 1001, 1001) != 0) {
            return 10;
        }
        return toFile(Document(), kFile, 0600, {1002, 100}) ? 0 : 11;
    });
    EXPECT_EQ(status, 0);
    struct stat info {};
    ASSERT_EQ(stat(kFile.c_str(), &info), 0);
    EXPECT_EQ(info.st_uid, 1001U);
}

TEST_F(JsonFile, FullDiskLeavesTheOldDocument) {
    ASSERT_EQ(mount("none", kTop.c_str(), "tmpfs", 0, "size=64k"), 0);
    ASSERT_TRUE(toFile(Document(), kFile));
    Json::Value large;
    large["x"] = std::string(1 << 20, 'x');
    EXPECT_FALSE(toFile(large, kFile));
    EXPECT_EQ(errno, ENOSPC);
    Json::Value value;
    EXPECT_TRUE(fromFile(value, kFile));
    EXPECT_EQ(value, Document());
    EXPECT_EQ(NamesInTop(), 1U) << "nothing is left beside it";
    EXPECT_TRUE(toFile(Document(2), kFile)) << "and the space is free again";
}

TEST_F(JsonFile, DiskWithoutRoomForANameLeavesTheOldDocument) {
    ASSERT_EQ(mount("none", kTop.c_str(), "tmpfs", 0, "nr_inodes=2"), 0);
    ASSERT_TRUE(toFile(Document(), kFile));
    EXPECT_FALSE(toFile(Document(2), kFile));
    EXPECT_EQ(errno, ENOSPC);
    Json::Value value;
    EXPECT_TRUE(fromFile(value, kFile));
    EXPECT_EQ(value, Document());
}

TEST_F(JsonFile, ReadOnlyMountLeavesTheOldDocument) {
    ASSERT_EQ(mount("none", kTop.c_str(), "tmpfs", 0, nullptr), 0);
    ASSERT_TRUE(toFile(Document(), kFile));
    ASSERT_EQ(mount(nullptr, kTop.c_str(), nullptr, MS_REMOUNT | MS_RDONLY, nullptr), 0);
    EXPECT_FALSE(toFile(Document(2), kFile));
    EXPECT_EQ(errno, EROFS);
    Json::Value value;
    EXPECT_TRUE(fromFile(value, kFile));
    EXPECT_EQ(value, Document());
}

TEST_F(JsonFile, FolderInTheFilesPlaceIsKept) {
    fs::create_directories(kFile + "/inside");
    EXPECT_FALSE(toFile(Document(), kFile));
    EXPECT_TRUE(fs::is_directory(kFile + "/inside"));
    EXPECT_EQ(NamesInTop(), 1U);
}

TEST_F(JsonFile, LinkOrFifoInTheFilesPlaceIsReplacedNotFollowed) {
    std::ofstream(kTop + "/precious") << "keep me";
    fs::create_symlink(kTop + "/precious", kFile);
    EXPECT_TRUE(toFile(Document(), kFile));
    EXPECT_EQ(ReadAll(kTop + "/precious"), "keep me");
    EXPECT_TRUE(fs::is_regular_file(fs::symlink_status(kFile)));

    fs::remove(kFile);
    ASSERT_EQ(mkfifo(kFile.c_str(), 0666), 0);
    alarm(20);
    EXPECT_TRUE(toFile(Document(), kFile));
    alarm(0);
    EXPECT_TRUE(fs::is_regular_file(fs::symlink_status(kFile)));
}

TEST_F(JsonFile, ValueThatCouldNotBeReadBackIsNotWritten) {
    ASSERT_TRUE(toFile(Document(), kFile));
    Json::Value deep;
    for (int level = 0; level < 1500; ++level) {
        Json::Value outer(Json::arrayValue);
        outer.append(std::move(deep));
        deep = std::move(outer);
    }
    EXPECT_FALSE(toFile(deep, kFile));
    EXPECT_EQ(errno, EINVAL);
    EXPECT_FALSE(toFile(Json::Value(std::string(65 << 20, 'x')), kFile));
    EXPECT_EQ(errno, EFBIG);
    Json::Value value;
    EXPECT_TRUE(fromFile(value, kFile));
    EXPECT_EQ(value, Document());
    EXPECT_EQ(NamesInTop(), 1U);
}

TEST_F(JsonFile, WhatIsWrittenAtTheLimitOfNestingIsRead) {
    for (int levels = 995; levels < 1005; ++levels) {
        Json::Value deep = "bottom";
        for (int i = 1; i < levels; ++i) {
            Json::Value outer;
            outer["in"].swap(deep);
            deep.swap(outer);
        }
        Json::Value back;
        EXPECT_EQ(toFile(deep, kFile), levels <= 1000) << levels;
        EXPECT_TRUE(levels > 1000 || fromFile(back, kFile)) << levels;
        EXPECT_EQ(fromString(back, toString(deep)), levels <= 1000) << levels;
    }
}

TEST_F(JsonFile, InfiniteNumberNeverSpoilsADocument) {
    ASSERT_TRUE(toFile(Document(), kFile));
    for (const double number : {HUGE_VAL, -HUGE_VAL, std::nan("")}) {
        Json::Value in = Document(2);
        in["number"] = number;
        const bool written = toFile(in, kFile);
        Json::Value out;
        EXPECT_TRUE(fromFile(out, kFile)) << number;
        EXPECT_EQ(out["sftp://amy@h"]["number"].asInt(), written ? 2 : 1) << number;
    }
}

TEST_F(JsonFile, PathsThatNameNoFileAreRefused) {
    EXPECT_FALSE(toFile(Document(), ""));
    EXPECT_FALSE(toFile(Document(), kTop + "/none/connect.conf"));
    EXPECT_EQ(errno, ENOENT);
    EXPECT_FALSE(toFile(Document(), kTop + "/" + std::string(300, 'n')));
    EXPECT_FALSE(toFile(Document(), std::string(1 << 20, 'n')));
    EXPECT_FALSE(toFile(Document(), kFile + std::string("\0x", 2)));
    EXPECT_EQ(NamesInTop(), 0U);
}

TEST_F(JsonFile, ReaderOfAnOpenFileKeepsTheOldDocument) {
    ASSERT_TRUE(toFile(Document(1), kFile));
    std::ifstream reader(kFile);
    ASSERT_TRUE(toFile(Document(2), kFile));
    std::string line;
    ASSERT_TRUE(std::getline(reader, line));
    EXPECT_EQ(line, toString(Document(1)));
}

/** Large enough that a kill often falls into the writing. */
Json::Value LargeDocument(int number) {
    Json::Value value = Document(number);
    value["padding"] = std::string(30000, static_cast<char>('a' + number % 26));
    return value;
}

/** A process that replaces the document without end, until it is killed. */
class Writer {
  public:
    Writer() : pid_(fork()) {
        for (int number = 1; pid_ == 0; ++number) {
            if (!toFile(LargeDocument(number), kFile)) {
                _exit(1);
            }
        }
    }
    Writer(const Writer&) = delete;
    Writer& operator=(const Writer&) = delete;
    ~Writer() { Kill(); }

    /** True when it was still writing. */
    bool Kill() {
        int status = 0;
        const bool killed = pid_ > 0 && kill(pid_, SIGKILL) == 0 &&
                            waitpid(pid_, &status, 0) == pid_ && WIFSIGNALED(status);
        pid_ = -1;
        return killed;
    }

  private:
    pid_t pid_;
};

/** Removes what stands beside the document, and tells whether there was anything. */
bool SweepTop() {
    bool found = false;
    for (const auto& entry : fs::directory_iterator(kTop)) {
        if (entry.path() != kFile) {
            found = true;
            fs::remove(entry.path());
        }
    }
    return found;
}

TEST_F(JsonFile, WriterKilledAtAnyMomentNeverLosesOrHalvesTheDocument) {
    constexpr int kKills = 250;
    constexpr int kMustHit = 20;  // kills between the writes would prove nothing
    std::mt19937 random(20101);
    ASSERT_TRUE(toFile(LargeDocument(0), kFile));
    int amid_a_write = 0;
    for (int i = 0; i < kKills || (amid_a_write < kMustHit && i < 20 * kKills); ++i) {
        Writer writer;
        const timespec pause{0, static_cast<long>(random() % 8000000)};
        nanosleep(&pause, nullptr);
        ASSERT_TRUE(writer.Kill()) << "no write may fail";

        Json::Value value;
        ASSERT_TRUE(fromFile(value, kFile)) << "kill " << i << ", " << strerror(errno);
        ASSERT_EQ(value, LargeDocument(value["sftp://amy@h"]["number"].asInt())) << "kill " << i;
        amid_a_write += SweepTop() ? 1 : 0;
    }
    RecordProperty("kills_amid_a_write", amid_a_write);
    EXPECT_GE(amid_a_write, kMustHit);
}

TEST_F(JsonFile, ReadersNeverSeeAHalfDocumentWhileItIsWritten) {
    ASSERT_TRUE(toFile(LargeDocument(0), kFile));
    const Writer writer;
    int changes = 0;
    int last = 0;
    constexpr int kChanges = 10;
    for (int i = 0; i < 500 || (changes < kChanges && i < 100000); ++i) {
        Json::Value value;
        ASSERT_TRUE(fromFile(value, kFile)) << strerror(errno);
        const int number = value["sftp://amy@h"]["number"].asInt();
        ASSERT_EQ(value, LargeDocument(number));
        changes += number != last ? 1 : 0;
        last = number;
    }
    EXPECT_GE(changes, kChanges);
}

}  // namespace
}  // namespace ZYROVFS::json
