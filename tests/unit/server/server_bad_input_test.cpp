// Profiles of the real server types with every key wrong in every way: from the web, and in a file.
// Each ends in a failure code and a log line or is kept as it was given; nothing gets lost.
#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "support/catalogue.h"
#include "support/profiles.h"
#include "support/seams.h"
#include "zyrovfs/utils.h"

namespace ZYROVFS::Server {
namespace {

using profiles::kUser;
using profiles::Put;
using profiles::Stored;

struct Wrong {
    const char* name;
    Json::Value value;
};

const Wrong kWrongTexts[] = {
    {"null", Json::Value()},
    {"number", 5},
    {"negative number", -1},
    {"fraction", 1.5},
    {"huge number", 1e300},
    {"bool", true},
    {"array", Json::Value(Json::arrayValue)},
    {"object", Json::Value(Json::objectValue)},
    {"a megabyte", std::string(1 << 20, 'x')},
    {"NUL inside", std::string("a\0b", 3)},
    {"no UTF-8", "\xff\xfe"},
};

const Wrong kWrongNumbers[] = {
    {"text", "21"},
    {"empty text", ""},
    {"negative number", -1},
    {"fraction", 1.5},
    {"huge number", 1e300},
    {"beyond 32 bit", Json::Value(Json::UInt64(4294967296ULL))},
    {"bool", true},
    {"array", Json::Value(Json::arrayValue)},
    {"object", Json::Value(Json::objectValue)},
};

Json::Value GoodProfile() {
    Json::Value conf;
    conf["protocol"] = "ftp";
    conf["hostname"] = "nas.example";
    conf["port"] = 2121;
    conf["alias"] = "mine";
    conf["account"] = "amy";
    conf["password"] = "secret";
    conf["codepage"] = "UTF-8";
    conf["uri_path"] = "music";
    conf["path"] = "";
    conf["max_connection"] = 3;
    return conf;
}

Json::Value GoodSharing() {
    Json::Value conf;
    conf["protocol"] = "sharing";
    conf["alias"] = "mine";
    conf["email"] = "amy@nas.example";
    conf["path"] = "";
    return conf;
}

const char* const kId = "ftp://amy@nas.example:2121";

class BadInput : public profiles::ProfileTest {
  protected:
    void SetUp() override {
        ProfileTest::SetUp();
        catalogue::Clear();
        catalogue::Add("ftp", "FTP", "list");
        catalogue::Add("sharing", "Share", "list");
    }

    void ExpectRefused(const Json::Value& conf, const std::string& what) {
        seams::Reset();
        ResetError();
        std::string id;
        Json::Value out;
        EXPECT_FALSE(Add(kUser, VFS_CONFIG_SERVER, id, conf, false, out)) << what;
        EXPECT_EQ(GetError(), VFS_ERR_BAD_PARAM) << what;
        EXPECT_FALSE(seams::LogLines().empty()) << what;
        EXPECT_TRUE(Stored(VFS_CONFIG_SERVER).isNull()) << what << ": nothing was written";
    }

    /** The same profile in the file: not shown, not read, not changed, and still there. */
    void ExpectSkipped(const Json::Value& record, const std::string& what) {
        Json::Value servers;
        servers[kId] = record;
        servers["good"] = GoodProfile();
        Put(VFS_CONFIG_SERVER, servers);
        const std::string before = profiles::Text(profiles::File(VFS_CONFIG_SERVER));
        Json::Value out;
        seams::Reset();
        ASSERT_TRUE(List(kUser, VFS_CONFIG_SERVER, nullptr, "alias", true, 0, 0, out)) << what;
        EXPECT_EQ(out["total"].asUInt(), 1U) << what;
        EXPECT_TRUE(seams::LoggedPart("Skip malformed server config, serverID=" + std::string(kId)))
            << what;
        EXPECT_FALSE(Get(kUser, VFS_CONFIG_SERVER, kId, true, false, out)) << what;
        EXPECT_EQ(GetError(), VFS_ERR_UNKNOWN) << what;
        std::string id = kId;
        Json::Value changes;
        changes["max_connection"] = 4;
        EXPECT_FALSE(Set(kUser, VFS_CONFIG_SERVER, id, changes, false)) << what;
        EXPECT_EQ(GetError(), VFS_ERR_BAD_PARAM) << what;
        EXPECT_EQ(profiles::Text(profiles::File(VFS_CONFIG_SERVER)), before) << what;
        std::filesystem::remove(profiles::File(VFS_CONFIG_SERVER));
    }

    void ExpectUseless(const Json::Value& conf, const std::string& what) {
        ExpectRefused(conf, what);
        ExpectSkipped(conf, what);
    }
};

TEST_F(BadInput, GoodProfilesAreTaken) {
    for (const Json::Value& conf : {GoodProfile(), GoodSharing()}) {
        std::string id;
        Json::Value out;
        EXPECT_TRUE(Add(kUser, VFS_CONFIG_SERVER, id, conf, false, out)) << seams::LogDump();
        EXPECT_EQ(json::toString(Stored(VFS_CONFIG_SERVER)[id]), json::toString(out));
    }
    EXPECT_EQ(Stored(VFS_CONFIG_SERVER).size(), 2U);
}

TEST_F(BadInput, EachRequiredKeyMissing) {
    for (const char* key :
         {"protocol", "hostname", "port", "alias", "account", "password", "codepage"}) {
        Json::Value conf = GoodProfile();
        conf.removeMember(key);
        ExpectUseless(conf, std::string("without ") + key);
    }
    for (const char* key : {"protocol", "alias", "email"}) {
        Json::Value conf = GoodSharing();
        conf.removeMember(key);
        ExpectUseless(conf, std::string("sharing without ") + key);
    }
}

TEST_F(BadInput, EachRequiredTextWrong) {
    for (const char* key : {"hostname", "alias", "account", "password", "codepage"}) {
        for (const Wrong& wrong : kWrongTexts) {
            Json::Value conf = GoodProfile();
            conf[key] = wrong.value;
            ExpectUseless(conf, std::string(key) + " as " + wrong.name);
        }
    }
    for (const Wrong& wrong : kWrongTexts) {
        Json::Value conf = GoodProfile();
        conf["protocol"] = wrong.value;
        ExpectUseless(conf, std::string("protocol as ") + wrong.name);
        conf = GoodSharing();
        conf["email"] = wrong.value;
        ExpectUseless(conf, std::string("email as ") + wrong.name);
    }
}

TEST_F(BadInput, EachNumberWrong) {
    for (const Wrong& wrong : kWrongNumbers) {
        for (const char* key : {"port", "max_connection"}) {
            Json::Value conf = GoodProfile();
            conf[key] = wrong.value;
            ExpectUseless(conf, std::string(key) + " as " + wrong.name);
        }
    }
    for (const int port : {0, 65536, 2147483647}) {
        Json::Value conf = GoodProfile();
        conf["port"] = port;
        ExpectUseless(conf, "port " + std::to_string(port));
    }
}

TEST_F(BadInput, OptionalTextsOfAnotherTypeAreRefused) {
    for (const char* key : {"uri_path", "path"}) {
        for (const Wrong& wrong : kWrongTexts) {
            if (wrong.value.isNull() || std::string(wrong.name) == "no UTF-8") {
                continue;  // missing, and a remote name in another character set
            }
            Json::Value conf = GoodProfile();
            conf[key] = wrong.value;
            ExpectUseless(conf, std::string(key) + " as " + wrong.name);
        }
    }
}

TEST_F(BadInput, AliasOfASharedLinkIsATextOfAnyLength) {
    for (const Wrong& wrong : kWrongTexts) {
        if (std::string(wrong.name) == "a megabyte") {
            continue;
        }
        Json::Value conf = GoodSharing();
        conf["alias"] = wrong.value;
        ExpectUseless(conf, std::string("alias as ") + wrong.name);
    }
    Json::Value conf = GoodSharing();
    conf["alias"] = std::string(1 << 20, 'x');
    std::string id;
    Json::Value out;
    ASSERT_TRUE(Add(kUser, VFS_CONFIG_SERVER, id, conf, false, out));
    EXPECT_EQ(Stored(VFS_CONFIG_SERVER)[id]["alias"], conf["alias"]);
}

TEST_F(BadInput, KeysThatNobodyKnowsAreDropped) {
    Json::Value conf = GoodProfile();
    for (const Wrong& wrong : kWrongTexts) {
        conf[std::string("x ") + wrong.name] = wrong.value;
    }
    std::string id;
    Json::Value out;
    ASSERT_TRUE(Add(kUser, VFS_CONFIG_SERVER, id, conf, false, out));
    for (const std::string& key : out.getMemberNames()) {
        EXPECT_NE(key.compare(0, 2, "x "), 0) << key;
    }
}

TEST_F(BadInput, ChangesOfAWrongTypeLeaveTheProfile) {
    std::string id;
    Json::Value out;
    ASSERT_TRUE(Add(kUser, VFS_CONFIG_SERVER, id, GoodProfile(), false, out));
    const std::string before = profiles::Text(profiles::File(VFS_CONFIG_SERVER));
    for (const char* key : {"protocol", "hostname", "alias", "account", "password", "codepage"}) {
        for (const Wrong& wrong : kWrongTexts) {
            if (wrong.value.isNull()) {
                continue;  // no change at all
            }
            Json::Value changes;
            changes[key] = wrong.value;
            EXPECT_FALSE(Set(kUser, VFS_CONFIG_SERVER, id, changes, false))
                << key << " as " << wrong.name;
            EXPECT_EQ(GetError(), VFS_ERR_BAD_PARAM) << key << " as " << wrong.name;
            EXPECT_EQ(profiles::Text(profiles::File(VFS_CONFIG_SERVER)), before);
        }
    }
    for (const char* key : {"port", "max_connection"}) {
        for (const Wrong& wrong : kWrongNumbers) {
            Json::Value changes;
            changes[key] = wrong.value;
            EXPECT_FALSE(Set(kUser, VFS_CONFIG_SERVER, id, changes, false))
                << key << " as " << wrong.name;
            EXPECT_EQ(GetError(), VFS_ERR_BAD_PARAM) << key << " as " << wrong.name;
            EXPECT_EQ(profiles::Text(profiles::File(VFS_CONFIG_SERVER)), before);
        }
    }
}

TEST_F(BadInput, PlainTextComesBackOnlyWhenAsked) {
    std::string id;
    Json::Value out;
    ASSERT_TRUE(Add(kUser, VFS_CONFIG_SERVER, id, GoodProfile(), false, out));
    EXPECT_EQ(profiles::Text(profiles::File(VFS_CONFIG_SERVER)).find("secret"), std::string::npos);
    EXPECT_NE(out["password"], "secret");
    ASSERT_TRUE(Get(kUser, VFS_CONFIG_SERVER, id.c_str(), true, false, out));
    EXPECT_EQ(out["password"], "secret");
    ASSERT_TRUE(Get(kUser, VFS_CONFIG_SERVER, id.c_str(), false, false, out));
    for (const char* key : {"password", "access_token", "refresh_token"}) {
        EXPECT_FALSE(out.isMember(key)) << key;
    }
    EXPECT_EQ(out["protocol_name"], "FTP");
}

TEST_F(BadInput, ChangeOfHostMovesARealProfile) {
    std::string id;
    Json::Value out;
    ASSERT_TRUE(Add(kUser, VFS_CONFIG_SERVER, id, GoodProfile(), false, out));
    EXPECT_EQ(id, kId);
    Json::Value changes;
    changes["hostname"] = "other.example";
    changes["alias"] = Json::Value();
    ASSERT_TRUE(Set(kUser, VFS_CONFIG_SERVER, id, changes, false));
    EXPECT_EQ(id, "ftp://amy@other.example:2121");
    EXPECT_EQ(Stored(VFS_CONFIG_SERVER).getMemberNames(), std::vector<std::string>{id});
    ASSERT_TRUE(Get(kUser, VFS_CONFIG_SERVER, id.c_str(), true, false, out));
    EXPECT_EQ(out["password"], "secret") << "still the one that was saved";
    EXPECT_EQ(out["alias"], "mine");
}

TEST_F(BadInput, TruncatedFilesAreReadOrRefusedWhole) {
    Json::Value doc;
    doc["servers"][kId] = GoodProfile();
    const std::string whole = json::toString(doc);
    for (size_t size = 0; size <= whole.size(); ++size) {
        profiles::PutText(profiles::File(VFS_CONFIG_SERVER), whole.substr(0, size));
        ResetError();
        Json::Value out;
        const bool readable = size == 0 || size == whole.size();
        EXPECT_EQ(List(kUser, VFS_CONFIG_SERVER, nullptr, nullptr, true, 0, 0, out), readable);
        if (!readable) {
            EXPECT_EQ(GetError(), VFS_ERR_CONFIG_READ) << size;
        }
    }
}

/** Ids that no profile has, and most of which are no URI either. */
std::vector<std::string> StrangeIds() {
    return {"",
            ":",
            "://",
            "ftp:",
            "ftp://",
            "/",
            "%",
            "ftp://%",
            "ftp://a%00b@%00",
            "ftp://[::1",
            "\xff",
            "ftp://\xff",
            "ftp://h:99999",
            "ftp://" + std::string(1 << 20, 'h'),
            std::string(1 << 20, '/')};
}

TEST_F(BadInput, StrangeIdsAreNoProfiles) {
    Json::Value servers;
    servers["good"] = GoodProfile();
    Put(VFS_CONFIG_SERVER, servers);
    Put(VFS_CONFIG_CONNECT, servers);
    for (const std::string& strange : StrangeIds()) {
        SCOPED_TRACE(strange.substr(0, 40));
        const char* text = strange.c_str();
        Json::Value out;
        for (const VFS_CONFIG_MODE mode : {VFS_CONFIG_SERVER, VFS_CONFIG_CONNECT}) {
            EXPECT_FALSE(Get(kUser, mode, text, true, true, out));
            EXPECT_EQ(GetError(), VFS_ERR_CONFIG_NOT_FOUND);
            EXPECT_TRUE(Delete(kUser, mode, text));
            std::string id = strange;
            EXPECT_FALSE(Set(kUser, mode, id, GoodProfile(), true));
            EXPECT_EQ(GetError(), VFS_ERR_CONFIG_NOT_FOUND);
            EXPECT_EQ(id, strange);
            EXPECT_FALSE(Add(kUser, mode, id, Json::Value(), true, out));
            EXPECT_EQ(GetError(), strange.empty() ? VFS_ERR_BAD_PARAM : VFS_ERR_FAILED);
        }
        EXPECT_FALSE(Connect(kUser, text, true));
        EXPECT_EQ(GetError(), VFS_ERR_CONFIG_NOT_FOUND);
        EXPECT_FALSE(Disconnect(kUser, text));
        EXPECT_EQ(GetError(), VFS_ERR_CONFIG_NOT_FOUND);
    }
    EXPECT_EQ(Stored(VFS_CONFIG_SERVER), servers);
    EXPECT_EQ(Stored(VFS_CONFIG_CONNECT), servers);
}

TEST_F(BadInput, StrangeUrisLeadNowhere) {
    for (const std::string& strange : StrangeIds()) {
        SCOPED_TRACE(strange.substr(0, 40));
        std::string a;
        std::string b;
        std::string c;
        EXPECT_FALSE(GetUserAndURI(strange.c_str(), a, b));
        EXPECT_FALSE(Utils::GetPasswordByConfig(strange.c_str(), a));
        EXPECT_FALSE(Utils::GetFullPathByConfig(strange.c_str(), a));
        EXPECT_FALSE(Utils::GetFullPathByConfig(strange.c_str(), a, b, c));
    }
}

TEST_F(BadInput, NullIdsFailWithoutACrash) {
    Json::Value out;
    std::string a;
    std::string b;
    std::string c;
    EXPECT_FALSE(Get(kUser, VFS_CONFIG_SERVER, nullptr, true, true, out));
    EXPECT_EQ(GetError(), VFS_ERR_BAD_PARAM);
    EXPECT_FALSE(Delete(kUser, VFS_CONFIG_SERVER, nullptr));
    EXPECT_EQ(GetError(), VFS_ERR_BAD_PARAM);
    EXPECT_FALSE(Connect(kUser, nullptr, false));
    EXPECT_EQ(GetError(), VFS_ERR_CONFIG_NOT_FOUND);
    EXPECT_FALSE(Disconnect(kUser, nullptr));
    EXPECT_EQ(GetError(), VFS_ERR_CONFIG_NOT_FOUND);
    EXPECT_FALSE(GetUserAndURI(nullptr, a, b));
    EXPECT_FALSE(GetSFTPHost(nullptr, a));
    EXPECT_FALSE(Utils::GetPasswordByConfig(nullptr, a));
    EXPECT_FALSE(Utils::GetFullPathByConfig(nullptr, a));
    EXPECT_FALSE(Utils::GetFullPathByConfig(nullptr, a, b, c));
    EXPECT_FALSE(Utils::GetFullPath(nullptr, a));
    EXPECT_FALSE(Utils::GetFullPath(kUser, nullptr, nullptr, nullptr, a, b));
    char buffer[16];
    EXPECT_EQ(SzEncrypt(nullptr, buffer, sizeof buffer), 0);
    EXPECT_EQ(SzEncrypt("text", nullptr, 16), 0);
    EXPECT_EQ(SzEncrypt("text", buffer, 0), 0);
    EXPECT_EQ(SzDecrypt(nullptr, buffer, sizeof buffer), 0);
    EXPECT_EQ(SzDecrypt("text", nullptr, 16), 0);
    EXPECT_EQ(SzDecrypt("text", buffer, 0), 0);
}

TEST_F(BadInput, ModesThatDoNotExistFailEveryOperation) {
    const auto mode = static_cast<VFS_CONFIG_MODE>(7);
    std::string id;
    Json::Value out;
    EXPECT_FALSE(Add(kUser, mode, id, GoodProfile(), false, out));
    EXPECT_EQ(GetError(), VFS_ERR_CONFIG_FULL) << "what cannot be counted counts as full";
    EXPECT_FALSE(Get(kUser, mode, kId, true, false, out));
    EXPECT_EQ(GetError(), VFS_ERR_CONFIG_READ);
    EXPECT_FALSE(Delete(kUser, mode, kId));
    EXPECT_EQ(GetError(), VFS_ERR_CONFIG_READ);
    id = kId;
    EXPECT_FALSE(Set(kUser, mode, id, GoodProfile(), false));
    EXPECT_EQ(GetError(), VFS_ERR_CONFIG_NOT_FOUND);
    EXPECT_FALSE(List(kUser, mode, nullptr, nullptr, true, 0, 0, out));
    EXPECT_EQ(GetError(), VFS_ERR_CONFIG_READ);
}

TEST_F(BadInput, ServersAsAnArrayAreRefusedAndStay) {
    for (const char* text : {R"({"servers":[]})", R"({"servers":["x"]})", R"({"servers":"x"})",
                             R"({"servers":1})", "[]", "7", "\"x\""}) {
        SCOPED_TRACE(text);
        for (const VFS_CONFIG_MODE mode : {VFS_CONFIG_SERVER, VFS_CONFIG_CONNECT}) {
            profiles::PutText(profiles::File(mode), text);
        }
        std::string id;
        Json::Value out;
        EXPECT_FALSE(Add(kUser, VFS_CONFIG_SERVER, id, GoodProfile(), false, out));
        EXPECT_EQ(GetError(), VFS_ERR_CONFIG_READ);
        EXPECT_FALSE(Get(kUser, VFS_CONFIG_SERVER, kId, true, false, out));
        EXPECT_EQ(GetError(), VFS_ERR_CONFIG_NOT_FOUND);
        EXPECT_TRUE(Delete(kUser, VFS_CONFIG_SERVER, kId));
        EXPECT_FALSE(Connect(kUser, kId, false));
        EXPECT_EQ(GetError(), VFS_ERR_CONFIG_NOT_FOUND);
        EXPECT_TRUE(List(kUser, VFS_CONFIG_SERVER, nullptr, nullptr, true, 0, 0, out));
        EXPECT_EQ(out["total"].asUInt(), 0U);
        EXPECT_EQ(profiles::Text(profiles::File(VFS_CONFIG_SERVER)), text);
    }
}

}  // namespace
}  // namespace ZYROVFS::Server
