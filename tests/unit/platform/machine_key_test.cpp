#include <grp.h>
#include <sys/stat.h>
#include <zosplatform/credential.h>
#include <zosplatform/error.h>

#include <algorithm>

#include "support/scratch.h"

namespace {

namespace fs = std::filesystem;

constexpr const char* kKeyDir = "/usr/zyro/etc/private";
constexpr const char* kKeyFile = "/usr/zyro/etc/private/zyrovfs.key";
constexpr size_t kKeySize = 32;
constexpr uid_t kUser = 4711;
constexpr gid_t kUsersGroup = 100;
constexpr mode_t kPermissions = 07777;

std::string Encrypt() {
    char out[128] = "";
    return YLIBCCryptSzEncrypt("secret", out, sizeof out) == 1 ? out : "";
}

std::string Decrypt(const std::string& cipher) {
    char out[128] = "";
    return YLIBCCryptSzDecrypt(cipher.c_str(), out, sizeof out) == 1 ? out : "";
}

struct stat Look(const char* path) {
    struct stat info {};
    EXPECT_EQ(lstat(path, &info), 0) << path;
    return info;
}

void ExpectOwnerAndMode(const char* path, gid_t group, mode_t mode) {
    const struct stat info = Look(path);
    EXPECT_EQ(info.st_uid, 0U) << path;
    EXPECT_EQ(info.st_gid, group) << path;
    EXPECT_EQ(info.st_mode & kPermissions, mode) << path;
}

class MachineKey : public testing::Test {
  protected:
    void SetUp() override {
        fs::remove_all("/usr/zyro");
        YLIBCErrSetEx(0, "", 0);
    }
    void TearDown() override { fs::remove_all("/usr/zyro"); }

    /** Neither direction works, and what stands in the key's place stays as it was. */
    static void ExpectRefused(const std::string& cipher) {
        const struct stat before = Look(kKeyFile);
        const std::string content = scratch::Text(kKeyFile);
        YLIBCErrSetEx(0, "", 0);
        EXPECT_EQ(Decrypt(cipher), "");
        EXPECT_EQ(YLIBCErrGet(), ZOS_ERR_OPEN_FAILED);
        EXPECT_EQ(Encrypt(), "");
        EXPECT_EQ(YLIBCErrGet(), ZOS_ERR_OPEN_FAILED);
        EXPECT_EQ(Look(kKeyFile).st_ino, before.st_ino);
        EXPECT_EQ(scratch::Text(kKeyFile), content);
    }
    static std::string Key() { return scratch::Text(kKeyFile); }
};

TEST_F(MachineKey, IsMadeAtTheFirstUseWithItsFolders) {
    const mode_t before = umask(077);
    EXPECT_NE(Encrypt(), "");
    umask(before);
    EXPECT_EQ(Key().size(), kKeySize);
    ExpectOwnerAndMode(kKeyFile, kUsersGroup, 0640);
    ExpectOwnerAndMode(kKeyDir, kUsersGroup, 0750);
    ExpectOwnerAndMode("/usr/zyro/etc", 0, 0755);
    ExpectOwnerAndMode("/usr/zyro", 0, 0755);
}

TEST_F(MachineKey, IsMadeOnce) {
    const std::string cipher = Encrypt();
    const std::string key = Key();
    EXPECT_NE(Encrypt(), "");
    EXPECT_EQ(Key(), key);
    EXPECT_EQ(Decrypt(cipher), "secret");
}

TEST_F(MachineKey, LeavesNoOtherFileBehind) {
    Encrypt();
    EXPECT_EQ(std::distance(fs::directory_iterator(kKeyDir), fs::directory_iterator()), 1);
}

TEST_F(MachineKey, IsAnotherOnEachMachine) {
    Encrypt();
    const std::string key = Key();
    SetUp();
    Encrypt();
    EXPECT_NE(Key(), key);
}

TEST_F(MachineKey, FoldersThatStandAreKeptAsTheyAre) {
    fs::create_directories(kKeyDir);
    ASSERT_EQ(chmod("/usr/zyro/etc", 0711), 0);
    ASSERT_EQ(chmod(kKeyDir, 0700), 0);
    EXPECT_NE(Encrypt(), "");
    ExpectOwnerAndMode("/usr/zyro/etc", 0, 0711);
    ExpectOwnerAndMode(kKeyDir, 0, 0700);
}

TEST_F(MachineKey, FoldersAboveThatOthersMayWriteToAreClosed) {
    fs::create_directories(kKeyDir);
    for (const char* folder : {"/usr/zyro", "/usr/zyro/etc"}) {
        ASSERT_EQ(chmod(folder, 0777), 0);
    }
    EXPECT_NE(Encrypt(), "");
    ExpectOwnerAndMode("/usr/zyro", 0, 0755);
    ExpectOwnerAndMode("/usr/zyro/etc", 0, 0755);
}

TEST_F(MachineKey, FolderAboveThatIsAnotherUsersBecomesRoots) {
    fs::create_directories(kKeyDir);
    ASSERT_EQ(chown("/usr/zyro/etc", 1234, 100), 0);
    EXPECT_NE(Encrypt(), "");
    ExpectOwnerAndMode("/usr/zyro/etc", 0, 0755);
}

TEST_F(MachineKey, LinkAboveItIsNotFollowed) {
    fs::create_directories("/usr/zyro");
    fs::create_directories("/etc/elsewhere/private");
    fs::create_directory_symlink("/etc/elsewhere", "/usr/zyro/etc");
    EXPECT_EQ(Encrypt(), "");
    EXPECT_TRUE(fs::is_empty("/etc/elsewhere/private"));
}

/** Two processes let loose at once; each notes its cipher text. */
TEST_F(MachineKey, TwoFirstUsersAgree) {
    constexpr int kRounds = 50;
    for (int round = 0; round < kRounds; ++round) {
        SetUp();
        int gate[2];
        int texts[2];
        ASSERT_EQ(pipe(gate), 0);
        ASSERT_EQ(pipe(texts), 0);
        const auto first_use = [&] {
            close(gate[1]);
            char none = 0;
            if (read(gate[0], &none, 1) != 0) {
                return 1;
            }
            const std::string text = Encrypt() + "\n";
            return write(texts[1], text.data(), text.size()) == ssize_t(text.size()) ? 0 : 2;
        };
        const pid_t users[] = {scratch::Start(first_use), scratch::Start(first_use)};
        close(gate[0]);
        close(gate[1]);
        for (const pid_t user : users) {
            EXPECT_EQ(scratch::End(user), 0);
        }
        close(texts[1]);
        char buffer[512] = "";
        ASSERT_GT(read(texts[0], buffer, sizeof buffer - 1), 0);
        close(texts[0]);
        std::stringstream lines(buffer);
        for (std::string line; std::getline(lines, line);) {
            EXPECT_EQ(Decrypt(line), "secret") << "round " << round;
        }
        EXPECT_EQ(std::count(buffer, buffer + sizeof buffer, '\n'), 2);
    }
}

TEST_F(MachineKey, UserNeverMakesOne) {
    fs::create_directories("/usr/zyro/etc");
    EXPECT_EQ(scratch::InChild([] {
                  return scratch::BecomeUser(kUser) && Encrypt().empty() &&
                                 YLIBCErrGet() == ZOS_ERR_OPEN_FAILED
                             ? 0
                             : 1;
              }),
              0);
    EXPECT_FALSE(fs::exists(kKeyDir));
}

TEST_F(MachineKey, UserDoesNotMakeOneInAFolderOfHisOwn) {
    fs::create_directories(kKeyDir);
    ASSERT_EQ(chown(kKeyDir, kUser, kUsersGroup), 0);
    EXPECT_EQ(
        scratch::InChild([] { return scratch::BecomeUser(kUser) && Encrypt().empty() ? 0 : 1; }),
        0);
    EXPECT_TRUE(fs::is_empty(kKeyDir));
    EXPECT_EQ(Encrypt(), "") << "nor does root trust such a folder";
    EXPECT_TRUE(fs::is_empty(kKeyDir));
}

TEST_F(MachineKey, UserOfTheCommonGroupReadsIt) {
    const std::string cipher = Encrypt();
    EXPECT_EQ(scratch::InChild([&] {
                  return scratch::BecomeUser(kUser, kUsersGroup) && Decrypt(cipher) == "secret" &&
                                 !Encrypt().empty()
                             ? 0
                             : 1;
              }),
              0);
}

TEST_F(MachineKey, UserOfAnotherGroupDoesNot) {
    const std::string cipher = Encrypt();
    EXPECT_EQ(scratch::InChild([&] {
                  return setgroups(0, nullptr) == 0 && scratch::BecomeUser(kUser, 4711) &&
                                 Decrypt(cipher).empty() && YLIBCErrGet() == ZOS_ERR_OPEN_FAILED
                             ? 0
                             : 1;
              }),
              0);
}

TEST_F(MachineKey, UserWithRootSavedMakesItAndStaysTheUser) {
    EXPECT_EQ(scratch::InChild([] {
                  if (setresuid(kUser, kUser, 0) != 0 || Encrypt().empty()) {
                      return 1;
                  }
                  uid_t real = 0, effective = 0, saved = 1;
                  getresuid(&real, &effective, &saved);
                  return real == kUser && effective == kUser && saved == 0 ? 0 : 2;
              }),
              0);
    ExpectOwnerAndMode(kKeyFile, kUsersGroup, 0640);
    ExpectOwnerAndMode(kKeyDir, kUsersGroup, 0750);
}

TEST_F(MachineKey, LinkInItsPlaceIsRefused) {
    const std::string cipher = Encrypt();
    fs::rename(kKeyFile, "/usr/zyro/elsewhere");
    fs::create_symlink("/usr/zyro/elsewhere", kKeyFile);
    ExpectRefused(cipher);
}

TEST_F(MachineKey, LinkToNowhereIsNotFilled) {
    Encrypt();
    fs::remove(kKeyFile);
    fs::create_symlink("/usr/zyro/nowhere", kKeyFile);
    EXPECT_EQ(Encrypt(), "");
    EXPECT_FALSE(fs::exists("/usr/zyro/nowhere"));
    EXPECT_TRUE(fs::is_symlink(kKeyFile));
}

TEST_F(MachineKey, LinkInPlaceOfItsFolderIsRefused) {
    const std::string cipher = Encrypt();
    fs::rename(kKeyDir, "/usr/zyro/elsewhere");
    fs::create_symlink("/usr/zyro/elsewhere", kKeyDir);
    EXPECT_EQ(Decrypt(cipher), "");
    EXPECT_EQ(Encrypt(), "");
}

TEST_F(MachineKey, AnotherSizeIsRefused) {
    const std::string cipher = Encrypt();
    const std::string key = Key();
    for (const std::string& content : {std::string(), key.substr(1), key + "x", key + key}) {
        scratch::PutText(kKeyFile, content);
        ExpectRefused(cipher);
    }
    scratch::PutText(kKeyFile, key);
    EXPECT_EQ(Decrypt(cipher), "secret");
}

TEST_F(MachineKey, OneThatOthersMayWriteOrReadIsRefused) {
    const std::string cipher = Encrypt();
    for (const mode_t mode : {0642, 0644, 0641, 0660, 0666}) {
        ASSERT_EQ(chmod(kKeyFile, mode), 0);
        ExpectRefused(cipher);
    }
    ASSERT_EQ(chmod(kKeyFile, 0600), 0);
    EXPECT_EQ(Decrypt(cipher), "secret") << "tighter than needed is fine for root";
}

TEST_F(MachineKey, OneOfAUserIsRefused) {
    const std::string cipher = Encrypt();
    ASSERT_EQ(chown(kKeyFile, kUser, kUsersGroup), 0);
    ExpectRefused(cipher);
}

TEST_F(MachineKey, FolderThatOthersMayWriteIsRefused) {
    const std::string cipher = Encrypt();
    for (const mode_t mode : {0770, 0752, 0777}) {
        ASSERT_EQ(chmod(kKeyDir, mode), 0);
        ExpectRefused(cipher);
    }
}

TEST_F(MachineKey, WhatIsNoFileIsRefused) {
    const std::string cipher = Encrypt();
    fs::remove(kKeyFile);
    fs::create_directory(kKeyFile);
    EXPECT_EQ(Decrypt(cipher), "");
    EXPECT_EQ(Encrypt(), "");
    fs::remove(kKeyFile);
    ASSERT_EQ(mkfifo(kKeyFile, 0640), 0);
    EXPECT_EQ(Decrypt(cipher), "") << "and not waited for";
    EXPECT_EQ(Encrypt(), "");
}

TEST_F(MachineKey, FileInPlaceOfAFolderIsRefused) {
    scratch::PutText("/usr/zyro", "text");
    EXPECT_EQ(Encrypt(), "");
    EXPECT_EQ(YLIBCErrGet(), ZOS_ERR_OPEN_FAILED);
    EXPECT_EQ(scratch::Text("/usr/zyro"), "text");
}

}  // namespace
