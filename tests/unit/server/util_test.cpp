#include <gtest/gtest.h>
#include <zosplatform/error.h>

#include "support/profiles.h"
#include "support/seams.h"

namespace ZYROVFS::Server {
namespace {

using profiles::kUser;

class UserAndUri : public profiles::ProfileTest {
  protected:
    static void Connected(const std::string& id, const Json::Value& connection) {
        Json::Value servers;
        servers[id] = connection;
        profiles::Put(VFS_CONFIG_CONNECT, servers);
    }
    static Json::Value WithPath(const char* path, const char* codepage) {
        Json::Value connection;
        connection["uri_path"] = path;
        connection["codepage"] = codepage;
        return connection;
    }
    bool Resolve(const char* uri) { return GetUserAndURI(uri, user, out); }

    std::string user = "as it was";
    std::string out = "as it was";
};

TEST_F(UserAndUri, UserIsTakenOutOfTheUri) {
    Connected("ftp://amy@nas.example:2121", Json::Value(Json::objectValue));
    ASSERT_TRUE(Resolve("ftp://amy@nas.example:2121/pub/film.mkv")) << seams::LogDump();
    EXPECT_EQ(user, "amy");
    EXPECT_EQ(out, "ftp://nas.example:2121/pub/film.mkv");
}

TEST_F(UserAndUri, IdAloneGivesTheServer) {
    Connected("ftp://amy@nas.example:2121", Json::Value(Json::objectValue));
    ASSERT_TRUE(Resolve("ftp://amy@nas.example:2121"));
    EXPECT_EQ(out, "ftp://nas.example:2121");
}

TEST_F(UserAndUri, UriWithoutAUserLeavesTheUserAlone) {
    Connected("ftp://nas.example", Json::Value(Json::objectValue));
    ASSERT_TRUE(Resolve("ftp://nas.example/pub"));
    EXPECT_EQ(user, "as it was");
    EXPECT_EQ(out, "ftp://nas.example/pub");
}

TEST_F(UserAndUri, IdThatIsNotConnectedGivesFalse) {
    Connected("ftp://other", Json::Value(Json::objectValue));
    EXPECT_FALSE(Resolve("ftp://amy@nas.example:2121/pub"));
    EXPECT_TRUE(seams::Logged("Failed to get ftp://amy@nas.example:2121 config, uid 1234"))
        << seams::LogDump();
    EXPECT_EQ(GetError(), VFS_ERR_CONFIG_NOT_FOUND);
    EXPECT_EQ(out, "as it was");
    EXPECT_EQ(user, "amy") << "known before the connection is looked for";
}

TEST_F(UserAndUri, RemotePathOfCodepageUtf8IsAppendedAsStored) {
    Connected("ftp://amy@nas.example", WithPath("caf\xc3\xa9", "UTF-8"));
    ASSERT_TRUE(Resolve("ftp://amy@nas.example/menu"));
    EXPECT_EQ(out, "ftp://nas.example/caf\xc3\xa9/menu");
}

TEST_F(UserAndUri, RemotePathOfAnEmptyCodepageIsAppendedAsStored) {
    Connected("ftp://amy@nas.example", WithPath("caf\xc3\xa9", ""));
    ASSERT_TRUE(Resolve("ftp://amy@nas.example"));
    EXPECT_EQ(out, "ftp://nas.example/caf\xc3\xa9");
}

TEST_F(UserAndUri, RemotePathIsConvertedToItsCodepage) {
    Connected("ftp://amy@nas.example", WithPath("caf\xc3\xa9", "ISO-8859-1"));
    ASSERT_TRUE(Resolve("ftp://amy@nas.example/menu"));
    EXPECT_EQ(out, "ftp://nas.example/caf\xe9/menu");
}

TEST_F(UserAndUri, RemotePathThatCannotBeConvertedIsAppendedAsStored) {
    Connected("ftp://amy@nas.example", WithPath("caf\xc3\xa9", "NO-SUCH-SET"));
    ASSERT_TRUE(Resolve("ftp://amy@nas.example"));
    EXPECT_EQ(out, "ftp://nas.example/caf\xc3\xa9");
}

TEST_F(UserAndUri, UriMustBeginWithTheTextOfTheId) {
    Connected("ftp://amy@corp@nas.example", Json::Value(Json::objectValue));
    ASSERT_TRUE(Resolve("ftp://amy%40corp@nas.example/pub"));
    EXPECT_EQ(user, "amy@corp");
    EXPECT_EQ(out, "ftp://nas.examplele/pub") << "the cut counts the decoded id";
}

TEST_F(UserAndUri, AccountsWithReservedCharactersAreFound) {
    for (const std::string account : {"a@b", "a/b", "a?b", "a#b", "a@b/c?d#e"}) {
        const std::string id = "davs://" + account + "@nas.example:5006";
        Connected(id, WithPath("remote", "UTF-8"));
        for (const std::string behind : {"", "/pub/x", "/x@y:1/z"}) {
            ResetError();
            ASSERT_TRUE(Resolve((id + behind).c_str())) << account << seams::LogDump();
            EXPECT_EQ(user, account);
            EXPECT_EQ(out, "davs://nas.example:5006/remote" + behind);
            EXPECT_EQ(GetError(), VFS_ERR_NONE);
        }
    }
}

TEST_F(UserAndUri, SlashBehindTheServerIsNotDoubled) {
    Connected("http://nas.example", WithPath("pub", "UTF-8"));
    ASSERT_TRUE(Resolve("http://nas.example"));
    EXPECT_EQ(out, "http://nas.example/pub");
}

TEST_F(UserAndUri, NullAndWhatIsNoUriFail) {
    EXPECT_FALSE(Resolve(nullptr));
    EXPECT_TRUE(seams::Logged("Wrong parameters"));
    EXPECT_FALSE(Resolve("no uri"));
    EXPECT_TRUE(seams::Logged("Wrong uri, no uri")) << seams::LogDump();
    EXPECT_FALSE(Resolve(""));
    EXPECT_EQ(GetError(), VFS_ERR_NONE);
}

TEST_F(UserAndUri, DamagedConnectionIsNoCrash) {
    Json::Value wrong;
    wrong["uri_path"] = Json::Value(Json::arrayValue);
    for (const Json::Value& connection : {wrong, Json::Value("text"), Json::Value(7)}) {
        Connected("ftp://nas.example", connection);
        EXPECT_NO_THROW(EXPECT_FALSE(Resolve("ftp://nas.example")));
        EXPECT_TRUE(seams::LoggedPart("Wrong JSON value"));
    }
}

TEST(Credentials, ComeBackAsTheyWere) {
    for (const std::string& plain :
         {std::string(), std::string("secret"), std::string("\xff\x01"), std::string(2000, 'p')}) {
        char cipher[4096];
        char back[4097];
        ASSERT_NE(SzEncrypt(plain.c_str(), cipher, sizeof cipher), 0);
        EXPECT_NE(plain, cipher);
        for (const char* c = cipher; *c != '\0'; ++c) {
            ASSERT_TRUE(isprint(*c));
        }
        ASSERT_NE(SzDecrypt(cipher, back, sizeof back), 0);
        EXPECT_EQ(plain, back);
    }
}

TEST(Credentials, TooLongCipherFailsWithThePlatformsCode) {
    char cipher[4096];
    EXPECT_EQ(SzEncrypt(std::string(5000, 'p').c_str(), cipher, sizeof cipher), 0);
    EXPECT_EQ(YLIBCErrGet(), static_cast<unsigned>(ZOS_ERR_BUFFER_TOO_SMALL));
}

TEST(Credentials, TextThatWasNotEncipheredFails) {
    char plain[4097];
    EXPECT_EQ(SzDecrypt("secret", plain, sizeof plain), 0);
    EXPECT_EQ(SzDecrypt("", plain, sizeof plain), 0);
}

}  // namespace
}  // namespace ZYROVFS::Server
