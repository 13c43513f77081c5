#include <fcntl.h>
#include <sys/resource.h>
#include <sys/stat.h>
#include <zosplatform/error.h>
#include <zosplatform/file.h>

#include <algorithm>
#include <csignal>
#include <memory>
#include <vector>

#include "support/scratch.h"

namespace {

using File = scratch::ScratchTest;
using scratch::InChild;

struct FreeList {
    void operator()(PYLIBCSZLIST list) const { YLIBCSzListFree(list); }
};

class EnumDir : public scratch::ScratchTest {
  protected:
    int Enum(const std::string& dir, unsigned flags, const char* suffix) {
        PYLIBCSZLIST list = list_.release();
        const int count = YLIBCFileEnumDir(dir.c_str(), flags, suffix, &list);
        list_.reset(list);
        return count;
    }
    std::vector<std::string> Found() const {
        std::vector<std::string> names;
        for (int i = 0; i < YLIBCSzListCount(list_.get()); ++i) {
            names.emplace_back(YLIBCSzListGet(list_.get(), i));
        }
        return names;
    }

    std::unique_ptr<_tag_YLIBCSZLIST_, FreeList> list_{YLIBCSzListAlloc(1024)};
};

using Names = std::vector<std::string>;

TEST_F(File, FolderIsOneAlsoBehindALink) {
    ASSERT_EQ(symlink(directory_.c_str(), Path("link").c_str()), 0);
    EXPECT_EQ(YLIBCFileCheckDir(directory_.c_str()), 1);
    EXPECT_EQ(YLIBCFileCheckDir(Path("link").c_str()), 1);
    EXPECT_EQ(YLIBCFileCheckDir(Put("file", "").c_str()), 0);
    EXPECT_EQ(YLIBCFileCheckDir(Path("nothing").c_str()), 0);
    EXPECT_EQ(YLIBCFileCheckDir(nullptr), 0);
}

TEST_F(File, ExistsUnlessItIsALinkToNothing) {
    ASSERT_EQ(symlink(Path("nothing").c_str(), Path("link").c_str()), 0);
    EXPECT_EQ(YLIBCFileExist(Put("file", "").c_str()), 1);
    EXPECT_EQ(YLIBCFileExist(directory_.c_str()), 1);
    EXPECT_EQ(YLIBCFileExist(Path("link").c_str()), 0);
    EXPECT_EQ(YLIBCFileExist(nullptr), 0);
}

TEST_F(EnumDir, NamesComeSortedByByte) {
    for (const char* name : {"b", "a", "B", "\xc3\xa9", ".hidden"}) {
        Put(name, "");
    }
    EXPECT_EQ(Enum(directory_, 0, nullptr), 5);
    EXPECT_EQ(Found(), (Names{".hidden", "B", "a", "b", "\xc3\xa9"}));
}

TEST_F(EnumDir, SuffixSelects) {
    for (const char* name : {"ftp.mount", "mount", "ftp.mount.bak", ".mount", "dav.mount"}) {
        Put(name, "");
    }
    EXPECT_EQ(Enum(directory_, YLIBC_ENUM_SUFFIX, ".mount"), 3);
    EXPECT_EQ(Found(), (Names{".mount", "dav.mount", "ftp.mount"}));
}

TEST_F(EnumDir, TenThousandNames) {
    for (int i = 0; i < 10000; ++i) {
        Put("name" + std::to_string(i), "");
    }
    EXPECT_EQ(Enum(directory_, 0, nullptr), 10000);
    const Names names = Found();
    ASSERT_EQ(names.size(), 10000U);
    EXPECT_TRUE(std::is_sorted(names.begin(), names.end()));
    EXPECT_EQ(std::adjacent_find(names.begin(), names.end()), names.end());
}

TEST_F(EnumDir, AppendsBehindWhatTheListHas) {
    Put("b", "");
    Enum(directory_, 0, nullptr);
    Put("a", "");
    EXPECT_EQ(Enum(directory_, 0, nullptr), 2);
    EXPECT_EQ(Found(), (Names{"b", "a", "b"}));
}

TEST_F(EnumDir, EmptyFolderHasNoNames) {
    EXPECT_EQ(Enum(directory_, 0, nullptr), 0);
}

TEST_F(EnumDir, MissingFolderFails) {
    EXPECT_EQ(Enum(Path("nothing"), 0, nullptr), -1);
    EXPECT_EQ(YLIBCErrGet(), ZOS_ERR_NOT_FOUND);
    EXPECT_STREQ(YLIBCErrorGetFile(), "file.cpp");
    EXPECT_GT(YLIBCErrorGetLine(), 0);
}

TEST_F(EnumDir, FileIsNoFolder) {
    EXPECT_EQ(Enum(Put("file", ""), 0, nullptr), -1);
    EXPECT_EQ(YLIBCErrGet(), ZOS_ERR_OPEN_FAILED);
}

TEST_F(EnumDir, UnknownFlagsAndNullArgumentsAreRefused) {
    EXPECT_EQ(Enum(directory_, 0x40, ".mount"), -1);
    EXPECT_EQ(YLIBCErrGet(), ZOS_ERR_BAD_PARAMETER);
    EXPECT_EQ(Enum(directory_, YLIBC_ENUM_SUFFIX, nullptr), -1);
    EXPECT_EQ(YLIBCFileEnumDir(directory_.c_str(), 0, nullptr, nullptr), -1);
    PYLIBCSZLIST none = nullptr;
    EXPECT_EQ(YLIBCFileEnumDir(directory_.c_str(), 0, nullptr, &none), -1);
    EXPECT_EQ(YLIBCFileEnumDir(nullptr, 0, nullptr, &none), -1);
}

TEST_F(File, TouchMakesAFileAndSetsItsTime) {
    const std::string path = Path("stamp");
    EXPECT_EQ(YLIBCFileTouch(path.c_str()), 0);
    const timespec old[2] = {{1000, 0}, {1000, 0}};
    ASSERT_EQ(utimensat(AT_FDCWD, path.c_str(), old, 0), 0);
    EXPECT_EQ(YLIBCFileTouch(path.c_str()), 0);
    struct stat info {};
    ASSERT_EQ(stat(path.c_str(), &info), 0);
    EXPECT_GT(info.st_mtim.tv_sec, 1000);
    EXPECT_EQ(info.st_size, 0);
}

TEST_F(File, TouchLeavesTheContents) {
    const std::string path = Put("stamp", "text");
    EXPECT_EQ(YLIBCFileTouch(path.c_str()), 0);
    EXPECT_EQ(scratch::Text(path), "text");
}

TEST_F(File, TouchFailsWithoutAFolder) {
    EXPECT_EQ(YLIBCFileTouch(Path("no/stamp").c_str()), -1);
    EXPECT_EQ(YLIBCErrGet(), ZOS_ERR_NOT_FOUND);
    EXPECT_EQ(YLIBCFileTouch(nullptr), -1);
    EXPECT_EQ(YLIBCErrGet(), ZOS_ERR_BAD_PARAMETER);
}

TEST_F(File, PidOfALivingProcessIsRead) {
    const std::string own = std::to_string(getpid());
    EXPECT_EQ(YLIBCReadPidFile(Put("a", own).c_str()), getpid());
    EXPECT_EQ(YLIBCReadPidFile(Put("b", "  " + own + "\nmore\n").c_str()), getpid());
    EXPECT_EQ(YLIBCReadPidFile(Put("c", own + "\r\n").c_str()), getpid());
}

TEST_F(File, PidThatIsNoneCountsAsNoProcess) {
    const pid_t gone = scratch::Start([] { return 0; });
    scratch::End(gone);
    const std::string texts[] = {"",
                                 "\n",
                                 "abc",
                                 "12x",
                                 "-1",
                                 "0",
                                 std::to_string(gone),
                                 "99999999999999999999",
                                 std::string("\0\0\0", 3),
                                 std::string(1 << 20, '7')};
    for (const std::string& text : texts) {
        EXPECT_EQ(YLIBCReadPidFile(Put("pid", text).c_str()), 0) << text.substr(0, 30);
    }
    EXPECT_EQ(YLIBCReadPidFile(Path("nothing").c_str()), 0);
    EXPECT_EQ(YLIBCReadPidFile(directory_.c_str()), 0);
    EXPECT_EQ(YLIBCReadPidFile(nullptr), 0);
}

TEST_F(File, PidFileThatIsAPipeIsNotWaitedFor) {
    ASSERT_EQ(mkfifo(Path("pipe").c_str(), 0600), 0);
    EXPECT_EQ(YLIBCReadPidFile(Path("pipe").c_str()), 0);
}

TEST_F(File, WriteGivesAllBytesToASlowReader) {
    int ends[2];
    ASSERT_EQ(pipe(ends), 0);
    const std::string data(1 << 20, 'x');
    const pid_t reader = scratch::Start([&] {
        close(ends[1]);
        char buffer[1000];
        size_t total = 0;
        for (ssize_t n; (n = read(ends[0], buffer, sizeof buffer)) > 0;) {
            total += static_cast<size_t>(n);
        }
        return total == data.size() ? 0 : 1;
    });
    EXPECT_EQ(ZYROWriteFileFd(ends[1], data.data(), data.size()), ssize_t(data.size()));
    close(ends[0]);
    close(ends[1]);
    EXPECT_EQ(scratch::End(reader), 0);
}

TEST_F(File, WriteTellsHowFarItCame) {
    const std::string path = Path("limited");
    EXPECT_EQ(InChild([&] {
                  const rlimit limit{1000, 1000};
                  setrlimit(RLIMIT_FSIZE, &limit);
                  signal(SIGXFSZ, SIG_IGN);
                  const int fd = open(path.c_str(), O_WRONLY | O_CREAT, 0600);
                  const std::string data(1500, 'x');
                  if (ZYROWriteFileFd(fd, data.data(), data.size()) != 1000 || errno != EFBIG) {
                      return 1;
                  }
                  return ZYROWriteFileFd(fd, "x", 1) == -1 && errno == EFBIG ? 0 : 2;
              }),
              0);
}

TEST_F(File, WriteToAClosedDescriptorFails) {
    EXPECT_EQ(ZYROWriteFileFd(-1, "x", 1), -1);
    EXPECT_EQ(errno, EBADF);
    EXPECT_EQ(ZYROWriteFileFd(-1, "", 0), 0);
}

}  // namespace
