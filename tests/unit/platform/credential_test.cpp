#include <gmock/gmock.h>
#include <sys/stat.h>
#include <zosplatform/credential.h>
#include <zosplatform/error.h>

#include <algorithm>
#include <set>
#include <vector>

#include "support/scratch.h"

namespace {

namespace fs = std::filesystem;

const std::string kKeyDir = "/usr/zyro/etc/private";
const std::string kKey = kKeyDir + "/zyrovfs.key";
constexpr unsigned kSize = 4097;

bool IsCleared(const std::vector<char>& buffer) {
    return std::all_of(buffer.begin(), buffer.end(), [](char c) { return c == '\0'; });
}

/** The text, or the platform error of a failure; then the whole buffer must have been cleared. */
std::string Convert(int (*convert)(const char*, char*, unsigned), const std::string& text,
                    unsigned size) {
    std::vector<char> buffer(size, 'x');
    YLIBCErrSetEx(0, "", 0);
    if (convert(text.c_str(), buffer.data(), size) != 0) {
        return buffer.data();
    }
    char code[32];
    std::snprintf(code, sizeof code, "error 0x%X%s", YLIBCErrGet(),
                  IsCleared(buffer) ? "" : ", not cleared");
    return code;
}

std::string Encrypt(const std::string& plain, unsigned size = kSize) {
    return Convert(YLIBCCryptSzEncrypt, plain, size);
}
std::string Decrypt(const std::string& cipher, unsigned size = kSize) {
    return Convert(YLIBCCryptSzDecrypt, cipher, size);
}

const std::string kBadText = "error 0x3E00";
const std::string kTooSmall = "error 0x2A00";
const std::string kNoKey = "error 0x900";

struct stat Stat(const std::string& path) {
    struct stat info {};
    EXPECT_EQ(lstat(path.c_str(), &info), 0) << path;
    return info;
}

/** A machine on which nothing was enciphered yet. */
class Credential : public testing::Test {
  protected:
    void SetUp() override { fs::remove_all("/usr/zyro"); }

    static std::string MakeKey() {
        Encrypt("first");
        return scratch::Text(kKey);
    }
};

TEST_F(Credential, ComesBackAsItWas) {
    for (const std::string& plain :
         {std::string(), std::string("x"), std::string("p:@/ %40\"'\\\n\t\x01\xff\xc3\xa9"),
          std::string("$1$abc"), std::string(3000, 'p')}) {
        EXPECT_EQ(Decrypt(Encrypt(plain)), plain);
    }
}

TEST_F(Credential, EveryLengthComesBack) {
    for (size_t length = 0; length < 70; ++length) {
        const std::string plain(length, 'a');
        EXPECT_EQ(Decrypt(Encrypt(plain)), plain);
    }
}

TEST_F(Credential, TextIsPrintableAndNamesItsVersion) {
    EXPECT_THAT(Encrypt("secret\xff"), testing::MatchesRegex("\\$1\\$[A-Za-z0-9+/]+=*"));
}

TEST_F(Credential, NoTwoTextsAreEqual) {
    std::set<std::string> texts;
    for (int i = 0; i < 200; ++i) {
        texts.insert(Encrypt("same"));
    }
    EXPECT_EQ(texts.size(), 200U);
}

TEST_F(Credential, PlainTextDoesNotShow) {
    EXPECT_THAT(Encrypt("passwordpasswordpassword"),
                testing::Not(testing::HasSubstr("cGFzc3dvcmRwYXNzd29yZ")));
}

TEST_F(Credential, OfAMebibyte) {
    const std::string plain(1 << 20, 'p');
    const std::string cipher = Encrypt(plain, 2 << 20);
    EXPECT_GT(cipher.size(), plain.size());
    EXPECT_EQ(Decrypt(cipher, (1 << 20) + 1), plain);
    EXPECT_EQ(Encrypt(plain), kTooSmall);
    EXPECT_EQ(Decrypt(cipher), kTooSmall);
}

TEST_F(Credential, BufferHasToHoldTheEndOfTheTextToo) {
    const std::string cipher = Encrypt("12345678");
    const auto size = static_cast<unsigned>(cipher.size());
    EXPECT_EQ(Encrypt("12345678", size), kTooSmall);
    EXPECT_EQ(Decrypt(Encrypt("12345678", size + 1)), "12345678");
    EXPECT_EQ(Decrypt(cipher, 8), kTooSmall);
    EXPECT_EQ(Decrypt(cipher, 9), "12345678");
    EXPECT_EQ(Decrypt(cipher, 1), kTooSmall);
}

TEST_F(Credential, WrongArgumentsAreRefused) {
    char buffer[16] = "old";
    EXPECT_EQ(YLIBCCryptSzEncrypt(nullptr, buffer, sizeof buffer), 0);
    EXPECT_EQ(YLIBCErrGet(), ZOS_ERR_BAD_PARAMETER);
    EXPECT_STREQ(buffer, "");
    EXPECT_EQ(YLIBCCryptSzDecrypt(nullptr, buffer, sizeof buffer), 0);
    EXPECT_EQ(YLIBCCryptSzEncrypt("x", nullptr, 16), 0);
    EXPECT_EQ(YLIBCCryptSzDecrypt("x", buffer, 0), 0);
}

TEST_F(Credential, TextMayBeConvertedInItsOwnBuffer) {
    std::vector<char> buffer(kSize, '\0');
    std::snprintf(buffer.data(), kSize, "secret");
    ASSERT_NE(YLIBCCryptSzEncrypt(buffer.data(), buffer.data(), kSize), 0);
    EXPECT_THAT(buffer.data(), testing::StartsWith("$1$"));
    ASSERT_NE(YLIBCCryptSzDecrypt(buffer.data(), buffer.data(), kSize), 0);
    EXPECT_STREQ(buffer.data(), "secret");
}

TEST_F(Credential, EveryChangedByteIsRefused) {
    for (const std::string& plain :
         {std::string("secret"), std::string("secret1"), std::string("secret12"), std::string()}) {
        const std::string cipher = Encrypt(plain);
        for (size_t at = 0; at < cipher.size(); ++at) {
            for (int change = 1; change < 256; ++change) {
                std::string changed = cipher;
                changed[at] = static_cast<char>(changed[at] ^ change);
                if (changed[at] != '\0') {
                    ASSERT_EQ(Decrypt(changed), kBadText) << at << " " << changed;
                }
            }
        }
    }
}

TEST_F(Credential, EveryTruncationIsRefused) {
    const std::string cipher = Encrypt("secret");
    for (size_t length = 0; length < cipher.size(); ++length) {
        EXPECT_EQ(Decrypt(cipher.substr(0, length)), kBadText) << length;
    }
}

TEST_F(Credential, AdditionsAreRefused) {
    const std::string cipher = Encrypt("secret");
    for (const char* more : {"=", "====", "A", "AAAA", " ", "\n", "\r\n", "\t"}) {
        EXPECT_EQ(Decrypt(cipher + more), kBadText) << more;
        EXPECT_EQ(Decrypt(more + cipher), kBadText) << more;
        EXPECT_EQ(Decrypt("$1$" + (more + cipher.substr(3))), kBadText) << more;
    }
}

TEST_F(Credential, ForeignTextsAreRefused) {
    MakeKey();
    for (const std::string& text :
         {std::string(), std::string("secret"), std::string("$1$"), std::string("$1$===="),
          std::string("$1$AAAA"), std::string("$2$" + Encrypt("secret").substr(3)),
          std::string("$1$") + std::string(100, '='), std::string("$1$") + std::string(400, 'A'),
          std::string("$1$\xff\xfe\xfd\xfc"), std::string(1 << 20, 'A')}) {
        EXPECT_EQ(Decrypt(text), kBadText) << text.substr(0, 40);
    }
}

TEST_F(Credential, TextOfAnotherMachineIsRefused) {
    const std::string cipher = Encrypt("secret");
    fs::remove_all("/usr/zyro");
    MakeKey();
    EXPECT_EQ(Decrypt(cipher), kBadText);
}

TEST_F(Credential, FirstUseMakesTheKey) {
    const mode_t before = umask(077);
    EXPECT_EQ(MakeKey().size(), 32U);
    umask(before);
    const struct stat key = Stat(kKey);
    EXPECT_TRUE(S_ISREG(key.st_mode));
    EXPECT_EQ(key.st_mode & 07777, 0640U);
    EXPECT_EQ(key.st_uid, 0U);
    EXPECT_EQ(key.st_gid, 100U);
    EXPECT_EQ(key.st_nlink, 1U);
    const struct stat dir = Stat(kKeyDir);
    EXPECT_EQ(dir.st_mode & 07777, 0750U);
    EXPECT_EQ(dir.st_gid, 100U);
    EXPECT_EQ(Stat("/usr/zyro/etc").st_mode & 07777, 0755U);
    EXPECT_EQ(std::distance(fs::directory_iterator(kKeyDir), {}), 1) << "nothing is left beside it";
}

TEST_F(Credential, KeyStays) {
    const std::string key = MakeKey();
    Encrypt("second");
    EXPECT_EQ(scratch::Text(kKey), key);
}

TEST_F(Credential, KeysOfTwoMachinesDiffer) {
    const std::string key = MakeKey();
    fs::remove(kKey);
    EXPECT_NE(MakeKey(), key);
}

TEST_F(Credential, FirstUsersThatRaceShareOneKey) {
    for (int round = 0; round < 30; ++round) {
        fs::remove_all("/usr/zyro");
        int start[2];
        int out[2];
        ASSERT_EQ(pipe(start), 0);
        ASSERT_EQ(pipe(out), 0);
        std::vector<pid_t> users;
        for (int i = 0; i < 4; ++i) {
            users.push_back(scratch::Start([&] {
                char go = 0;
                close(start[1]);
                if (read(start[0], &go, 1) != 0) {
                    return 1;
                }
                const std::string cipher = Encrypt("secret") + "\n";
                return write(out[1], cipher.data(), cipher.size()) == ssize_t(cipher.size()) ? 0
                                                                                             : 1;
            }));
        }
        close(start[1]);  // all at once
        for (const pid_t user : users) {
            EXPECT_EQ(scratch::End(user), 0);
        }
        close(out[1]);
        char buffer[4096] = "";
        const ssize_t size = read(out[0], buffer, sizeof buffer);
        close(out[0]);
        close(start[0]);
        std::stringstream texts(std::string(buffer, static_cast<size_t>(size)));
        int count = 0;
        for (std::string cipher; std::getline(texts, cipher); ++count) {
            EXPECT_EQ(Decrypt(cipher), "secret");
        }
        EXPECT_EQ(count, 4);
        EXPECT_EQ(std::distance(fs::directory_iterator(kKeyDir), {}), 1);
    }
}

TEST_F(Credential, UsersReadTheKeyByTheirGroup) {
    const std::string cipher = Encrypt("secret");
    EXPECT_EQ(scratch::InChild([&] {
                  return scratch::BecomeUser(1234) && Decrypt(cipher) == "secret" &&
                                 Decrypt(Encrypt("own")) == "own"
                             ? 0
                             : 1;
              }),
              0);
    EXPECT_EQ(scratch::InChild([&] {
                  return scratch::BecomeUser(1234, 1234) && Decrypt(cipher) == kNoKey &&
                                 Encrypt("own") == kNoKey
                             ? 0
                             : 1;
              }),
              0)
        << "a process outside of the group has no key";
}

TEST_F(Credential, UsersNeverMakeTheKey) {
    EXPECT_EQ(scratch::InChild(
                  [] { return scratch::BecomeUser(1234) && Encrypt("own") == kNoKey ? 0 : 1; }),
              0);
    EXPECT_FALSE(fs::exists("/usr/zyro"));
    fs::create_directories(kKeyDir);
    fs::permissions(kKeyDir, fs::perms::all);
    EXPECT_EQ(scratch::InChild(
                  [] { return scratch::BecomeUser(1234) && Encrypt("own") == kNoKey ? 0 : 1; }),
              0);
    EXPECT_TRUE(fs::is_empty(kKeyDir));
}

TEST_F(Credential, RootInTheUsersIdentityMakesTheKey) {
    EXPECT_EQ(scratch::InChild([] {
                  if (setresgid(0, 1234, 0) != 0 || setresuid(0, 1234, 0) != 0) {
                      return 1;
                  }
                  const bool right = Decrypt(Encrypt("first")) == "first";
                  return right && geteuid() == 1234 && getegid() == 1234 ? 0 : 2;
              }),
              0);
    EXPECT_EQ(Stat(kKey).st_uid, 0U);
    EXPECT_EQ(Stat(kKey).st_gid, 100U);
}

TEST_F(Credential, DecryptionMakesNoKey) {
    const std::string cipher = Encrypt("secret");
    fs::remove(kKey);
    EXPECT_EQ(Decrypt(cipher), kNoKey);
    EXPECT_FALSE(fs::exists(kKey));
}

TEST_F(Credential, KeyBehindALinkIsRefused) {
    MakeKey();
    fs::rename(kKey, "/usr/zyro/elsewhere");
    fs::create_symlink("/usr/zyro/elsewhere", kKey);
    EXPECT_EQ(Encrypt("x"), kNoKey);
    EXPECT_TRUE(fs::is_symlink(kKey)) << "what stands there is left alone";
    fs::remove("/usr/zyro/elsewhere");
    EXPECT_EQ(Encrypt("x"), kNoKey);
    EXPECT_FALSE(fs::exists("/usr/zyro/elsewhere"));
}

TEST_F(Credential, KeyOfAnotherSizeIsRefusedAndLeftAlone) {
    MakeKey();
    for (const size_t size : {0, 1, 31, 33, 4096}) {
        const std::string wrong(size, 'k');
        scratch::PutText(kKey, wrong);
        EXPECT_EQ(Encrypt("x"), kNoKey) << size;
        EXPECT_EQ(scratch::Text(kKey), wrong);
    }
}

TEST_F(Credential, KeyThatOthersCouldHaveReadOrWrittenIsRefused) {
    MakeKey();
    for (const mode_t mode : {0644, 0660, 0642, 0641, 0666}) {
        ASSERT_EQ(chmod(kKey.c_str(), mode), 0);
        EXPECT_EQ(Encrypt("x"), kNoKey) << std::oct << mode;
    }
    ASSERT_EQ(chmod(kKey.c_str(), 0640), 0);
    ASSERT_EQ(chown(kKey.c_str(), 1234, 100), 0);
    EXPECT_EQ(Encrypt("x"), kNoKey);
}

TEST_F(Credential, KeyThatIsNoFileIsRefused) {
    fs::create_directories(kKey);
    EXPECT_EQ(Encrypt("x"), kNoKey);
    fs::remove(kKey);
    ASSERT_EQ(mkfifo(kKey.c_str(), 0640), 0);
    EXPECT_EQ(Encrypt("x"), kNoKey);
}

TEST_F(Credential, FolderThatOthersMayChangeHoldsNoKey) {
    MakeKey();
    ASSERT_EQ(chmod(kKeyDir.c_str(), 0770), 0);
    EXPECT_EQ(Encrypt("x"), kNoKey);
    ASSERT_EQ(chmod(kKeyDir.c_str(), 0750), 0);
    ASSERT_EQ(chown(kKeyDir.c_str(), 1234, 100), 0);
    EXPECT_EQ(Encrypt("x"), kNoKey);
    fs::rename(kKeyDir, "/usr/zyro/elsewhere");
    fs::create_directory_symlink("/usr/zyro/elsewhere", kKeyDir);
    EXPECT_EQ(Encrypt("x"), kNoKey);
}

}  // namespace
