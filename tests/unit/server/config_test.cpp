// The store: what it reads and writes, and the code of each failure.
#include <gmock/gmock.h>
#include <sys/stat.h>
#include <unistd.h>

#include "support/profiles.h"
#include "support/seams.h"

namespace ZYROVFS::Server {
namespace {

using profiles::Directory;
using profiles::File;
using profiles::kUser;
using profiles::Put;
using profiles::PutText;
using profiles::Stored;
using profiles::Text;
using Config = profiles::ProfileTest;

const VFS_CONFIG_MODE kModes[] = {VFS_CONFIG_SERVER, VFS_CONFIG_CONNECT};
constexpr VFS_CONFIG_MODE kNoMode = static_cast<VFS_CONFIG_MODE>(7);

Json::Value Profile(const char* protocol) {
    Json::Value profile;
    profile["protocol"] = protocol;
    profile["alias"] = "one";
    return profile;
}

Json::Value Many(const char* protocol, int count) {
    Json::Value servers(Json::objectValue);
    for (int i = 0; i < count; ++i) {
        servers[std::string(protocol) + "://host" + std::to_string(i)] = Profile(protocol);
    }
    return servers;
}

struct stat Stat(const std::string& path) {
    struct stat info {};
    EXPECT_EQ(lstat(path.c_str(), &info), 0) << path;
    return info;
}

/** The five operations that read a document, each with an id that is not stored. */
struct Operation {
    const char* name;
    bool (*run)(VFS_CONFIG_MODE mode);
};

const Operation kOperations[] = {
    {"CfgAppend", [](VFS_CONFIG_MODE m) { return CfgAppend(kUser, m, "ftp://a", Profile("ftp")); }},
    {"CfgGetByKey",
     [](VFS_CONFIG_MODE m) {
         Json::Value out;
         return CfgGetByKey(kUser, m, "protocol", "ftp", out);
     }},
    {"CfgGetByID",
     [](VFS_CONFIG_MODE m) {
         Json::Value out;
         return CfgGetByID(kUser, m, "ftp://a", out);
     }},
    {"CfgDeleteByID", [](VFS_CONFIG_MODE m) { return CfgDeleteByID(kUser, m, "ftp://a"); }},
    {"CfgSetByID",
     [](VFS_CONFIG_MODE m) {
         std::string id = "ftp://a";
         return CfgSetByID(kUser, m, id, id, Profile("ftp"));
     }},
    {"CfgSetByID to another id",
     [](VFS_CONFIG_MODE m) {
         std::string id = "ftp://b";
         return CfgSetByID(kUser, m, "ftp://a", id, Profile("ftp"));
     }},
};

TEST_F(Config, FirstUseMakesTheDirectoryAndReadsNoServers) {
    const mode_t mask = umask(077);
    for (const VFS_CONFIG_MODE mode : kModes) {
        Json::Value doc;
        EXPECT_TRUE(CfgAccess(kUser, mode, VFS_CONFIG_READ, doc));
        EXPECT_EQ(doc["servers"], Json::Value(Json::objectValue));
        EXPECT_EQ(doc.size(), 1U);
        const struct stat info = Stat(Directory(mode));
        EXPECT_EQ(info.st_mode & 07777, 01777U) << "every local user can enter it";
        EXPECT_EQ(info.st_uid, 0U);
        EXPECT_NE(access(File(mode).c_str(), F_OK), 0) << "reading makes no file";
    }
    umask(mask);
    EXPECT_EQ(GetError(), VFS_ERR_NONE);
}

TEST_F(Config, PathsAreThoseOfTheMode) {
    std::string path;
    EXPECT_TRUE(CfgGetPath(kUser, VFS_CONFIG_SERVER, path));
    EXPECT_EQ(path, "/usr/zyro/etc/zyrovfs/1234/servers.conf");
    EXPECT_TRUE(CfgGetPath(kUser, VFS_CONFIG_CONNECT, path));
    EXPECT_EQ(path, "/var/tmp/zyrovfs/1234/connect.conf");
    EXPECT_TRUE(CfgGetPath(4294967295U, VFS_CONFIG_CONNECT, path));
    EXPECT_EQ(path, "/var/tmp/zyrovfs/4294967295/connect.conf");
}

TEST_F(Config, UnknownModeFails) {
    EXPECT_FALSE(CfgCheckPath(kUser, kNoMode));
    EXPECT_EQ(GetError(), VFS_ERR_FAILED);
    EXPECT_TRUE(seams::Logged("Error VFS server config directory, uid: 1234")) << seams::LogDump();
    ResetError();
    std::string path = "before";
    EXPECT_FALSE(CfgGetPath(kUser, kNoMode, path));
    EXPECT_EQ(GetError(), VFS_ERR_FAILED);
    Json::Value doc;
    EXPECT_FALSE(CfgAccess(kUser, kNoMode, VFS_CONFIG_WRITE, doc));
    EXPECT_TRUE(CfgIsFull(kUser, kNoMode, "ftp"));
}

TEST_F(Config, UnknownActionDoesNothing) {
    Json::Value doc = "kept";
    EXPECT_TRUE(CfgAccess(kUser, VFS_CONFIG_SERVER, static_cast<VFS_CONFIG_ACTION>(5), doc));
    EXPECT_EQ(doc, "kept");
    EXPECT_NE(access(File(VFS_CONFIG_SERVER).c_str(), F_OK), 0);
}

TEST_F(Config, FileTruncatedToNothingReadsAsEmpty) {
    for (const VFS_CONFIG_MODE mode : kModes) {
        PutText(File(mode), "");
        Json::Value doc;
        EXPECT_TRUE(CfgAccess(kUser, mode, VFS_CONFIG_READ, doc));
        EXPECT_EQ(doc["servers"], Json::Value(Json::objectValue));
        EXPECT_TRUE(CfgAppend(kUser, mode, "ftp://a", Profile("ftp")));
    }
}

TEST_F(Config, BadJsonFailsEveryOperationWithConfigRead) {
    const std::string bad[] = {"{\"servers\":{", "no json", "{}{}", std::string("\0\0\0", 3),
                               std::string(200000, '[')};
    for (const VFS_CONFIG_MODE mode : kModes) {
        for (const std::string& text : bad) {
            for (const Operation& operation : kOperations) {
                PutText(File(mode), text);
                seams::Reset();
                ResetError();
                EXPECT_FALSE(operation.run(mode)) << operation.name;
                EXPECT_EQ(GetError(), VFS_ERR_CONFIG_READ) << operation.name;
                EXPECT_TRUE(seams::Logged("Json::Value::fromFile failed: " + File(mode)))
                    << seams::LogDump();
                EXPECT_EQ(Text(File(mode)), text) << operation.name << " must leave the file";
            }
            EXPECT_TRUE(CfgIsFull(kUser, mode, "ftp")) << "what cannot be read counts as full";
        }
    }
}

TEST_F(Config, FailedReadAloneSetsNoCode) {
    PutText(File(VFS_CONFIG_SERVER), "no json");
    Json::Value doc;
    EXPECT_FALSE(CfgAccess(kUser, VFS_CONFIG_SERVER, VFS_CONFIG_READ, doc));
    EXPECT_EQ(GetError(), VFS_ERR_NONE);
}

TEST_F(Config, HundredthProfileOfAProtocolFits) {
    Put(VFS_CONFIG_SERVER, Many("ftp", 99));
    EXPECT_FALSE(CfgIsFull(kUser, VFS_CONFIG_SERVER, "ftp"));
    EXPECT_TRUE(CfgAppend(kUser, VFS_CONFIG_SERVER, "ftp://last", Profile("ftp")));
    EXPECT_TRUE(CfgIsFull(kUser, VFS_CONFIG_SERVER, "ftp"));
    EXPECT_EQ(GetError(), VFS_ERR_NONE) << "fullness is no error of the store";
}

TEST_F(Config, LimitIsPerProtocolAndPerMode) {
    Put(VFS_CONFIG_SERVER, Many("ftp", 100));
    EXPECT_TRUE(CfgIsFull(kUser, VFS_CONFIG_SERVER, "ftp"));
    EXPECT_FALSE(CfgIsFull(kUser, VFS_CONFIG_SERVER, "dav"));
    EXPECT_FALSE(CfgIsFull(kUser, VFS_CONFIG_CONNECT, "ftp"));
    EXPECT_FALSE(CfgIsFull(kUser + 1, VFS_CONFIG_SERVER, "ftp"));
}

TEST_F(Config, FullnessCountsExactlyThisProtocolText) {
    Json::Value servers = Many("ftp", 98);
    servers["no protocol"]["alias"] = "x";
    servers["other case"] = Profile("FTP");
    servers["longer"] = Profile("ftps");
    servers["number"]["protocol"] = 21;
    servers["null"]["protocol"] = Json::Value();
    servers["text"] = "ftp";
    servers["array"][0] = "ftp";
    servers["cut at NUL"]["protocol"] = std::string("ftp\0x", 5);
    Put(VFS_CONFIG_SERVER, servers);
    EXPECT_FALSE(CfgIsFull(kUser, VFS_CONFIG_SERVER, "ftp")) << "99 count";
    servers["one more"] = Profile("ftp");
    Put(VFS_CONFIG_SERVER, servers);
    EXPECT_TRUE(CfgIsFull(kUser, VFS_CONFIG_SERVER, "ftp"));
}

TEST_F(Config, AppendOfATakenIdWritesNothing) {
    for (const VFS_CONFIG_MODE mode : kModes) {
        ASSERT_TRUE(CfgAppend(kUser, mode, "ftp://a", Profile("ftp")));
        const ino_t file = Stat(File(mode)).st_ino;
        EXPECT_FALSE(CfgAppend(kUser, mode, "ftp://a", Profile("dav")));
        EXPECT_EQ(GetError(),
                  mode == VFS_CONFIG_CONNECT ? VFS_ERR_CONNECT_EXISTS : VFS_ERR_SERVER_EXISTS);
        EXPECT_EQ(Stat(File(mode)).st_ino, file);
        EXPECT_EQ(Stored(mode)["ftp://a"], Profile("ftp"));
    }
}

TEST_F(Config, GetByKeyGivesTheMatchesById) {
    Json::Value servers = Many("ftp", 2);
    servers["dav://x"] = Profile("dav");
    Put(VFS_CONFIG_CONNECT, servers);
    Json::Value out = "before";
    EXPECT_TRUE(CfgGetByKey(kUser, VFS_CONFIG_CONNECT, "protocol", "ftp", out));
    EXPECT_EQ(out, Many("ftp", 2));
    EXPECT_TRUE(CfgGetByKey(kUser, VFS_CONFIG_CONNECT, "protocol", "nfs", out));
    EXPECT_EQ(out, Json::Value(Json::objectValue));
    EXPECT_TRUE(CfgGetByKey(kUser, VFS_CONFIG_CONNECT, "alias", "one", out));
    EXPECT_EQ(out.size(), 3U);
}

TEST_F(Config, GetOfAnAbsentIdIsNotFound) {
    Json::Value profile = "kept";
    EXPECT_FALSE(CfgGetByID(kUser, VFS_CONFIG_SERVER, "ftp://a", profile));
    EXPECT_EQ(GetError(), VFS_ERR_CONFIG_NOT_FOUND);
    EXPECT_EQ(profile, "kept");
    ASSERT_TRUE(CfgAppend(kUser, VFS_CONFIG_SERVER, "ftp://a", Profile("ftp")));
    EXPECT_TRUE(CfgGetByID(kUser, VFS_CONFIG_SERVER, "ftp://a", profile));
    EXPECT_EQ(profile, Profile("ftp"));
}

TEST_F(Config, DeleteOfAMissingIdSucceedsAndStillWritesTheFile) {
    Put(VFS_CONFIG_SERVER, Many("ftp", 2));
    const ino_t file = Stat(File(VFS_CONFIG_SERVER)).st_ino;
    EXPECT_TRUE(CfgDeleteByID(kUser, VFS_CONFIG_SERVER, "ftp://other"));
    EXPECT_NE(Stat(File(VFS_CONFIG_SERVER)).st_ino, file);
    EXPECT_EQ(Stored(VFS_CONFIG_SERVER), Many("ftp", 2));
    EXPECT_TRUE(CfgDeleteByID(kUser, VFS_CONFIG_SERVER, "ftp://host0"));
    EXPECT_EQ(Stored(VFS_CONFIG_SERVER).getMemberNames(), std::vector<std::string>{"ftp://host1"});
}

TEST_F(Config, SetKeepsTheIdOrMovesTheProfile) {
    Put(VFS_CONFIG_SERVER, Many("ftp", 2));
    std::string id = "ftp://host0";
    EXPECT_TRUE(CfgSetByID(kUser, VFS_CONFIG_SERVER, id, id, Profile("dav")));
    EXPECT_EQ(Stored(VFS_CONFIG_SERVER)["ftp://host0"], Profile("dav"));
    std::string moved = "dav://host0";
    EXPECT_TRUE(CfgSetByID(kUser, VFS_CONFIG_SERVER, id, moved, Profile("dav")));
    EXPECT_THAT(Stored(VFS_CONFIG_SERVER).getMemberNames(),
                testing::UnorderedElementsAre("dav://host0", "ftp://host1"));
}

TEST_F(Config, SetToATakenIdHasLostTheOldProfile) {
    for (const VFS_CONFIG_MODE mode : kModes) {
        Put(mode, Many("ftp", 2));
        std::string taken = "ftp://host1";
        EXPECT_FALSE(CfgSetByID(kUser, mode, "ftp://host0", taken, Profile("dav")));
        const __tag_vfs_err_ exists =
            mode == VFS_CONFIG_CONNECT ? VFS_ERR_CONNECT_EXISTS : VFS_ERR_SERVER_EXISTS;
        EXPECT_EQ(GetError(), exists);
        EXPECT_TRUE(seams::Logged("CfgAppend failed, uid=1234, mode=" + std::to_string(mode) +
                                  ", serverID=ftp://host1, code=" + std::to_string(exists)))
            << seams::LogDump();
        EXPECT_EQ(Stored(mode).getMemberNames(), std::vector<std::string>{"ftp://host1"});
        EXPECT_EQ(Stored(mode)["ftp://host1"], Profile("ftp"));
    }
}

TEST_F(Config, SetOfAnIdThatIsNotThereAddsIt) {
    std::string id = "ftp://a";
    EXPECT_TRUE(CfgSetByID(kUser, VFS_CONFIG_SERVER, id, id, Profile("ftp")));
    EXPECT_TRUE(Stored(VFS_CONFIG_SERVER).isMember("ftp://a"));
}

TEST_F(Config, NullArgumentsAreBadParameters) {
    Json::Value out;
    const auto refused = [](bool result) {
        EXPECT_FALSE(result);
        EXPECT_EQ(GetError(), VFS_ERR_BAD_PARAM);
        ResetError();
    };
    refused(CfgAppend(kUser, VFS_CONFIG_SERVER, nullptr, Profile("ftp")));
    refused(CfgGetByID(kUser, VFS_CONFIG_SERVER, nullptr, out));
    refused(CfgDeleteByID(kUser, VFS_CONFIG_SERVER, nullptr));
    refused(CfgGetByKey(kUser, VFS_CONFIG_SERVER, nullptr, "ftp", out));
    refused(CfgGetByKey(kUser, VFS_CONFIG_SERVER, "protocol", nullptr, out));
    EXPECT_TRUE(CfgIsFull(kUser, VFS_CONFIG_SERVER, nullptr));
}

TEST_F(Config, ServersOfAWrongTypeGiveNoMatchesAndAreNeverOverwritten) {
    for (const char* doc : {R"({"servers":[]})", R"({"servers":["x"]})", R"({"servers":"x"})",
                            R"({"servers":5})", R"({"servers":true})", "[1]", "\"text\"", "17"}) {
        for (const VFS_CONFIG_MODE mode : kModes) {
            PutText(File(mode), doc);
            Json::Value out;
            EXPECT_TRUE(CfgGetByKey(kUser, mode, "protocol", "ftp", out)) << doc;
            EXPECT_TRUE(out.isObject() && out.empty()) << doc;
            EXPECT_FALSE(CfgIsFull(kUser, mode, "ftp")) << doc;
            EXPECT_FALSE(CfgGetByID(kUser, mode, "ftp://a", out)) << doc;
            EXPECT_EQ(GetError(), VFS_ERR_CONFIG_NOT_FOUND) << doc;
            for (const Operation& operation : kOperations) {
                const std::string name = operation.name;
                if (name == "CfgGetByKey" || name == "CfgGetByID") {
                    continue;
                }
                ResetError();
                EXPECT_FALSE(operation.run(mode)) << name << " on " << doc;
                EXPECT_EQ(GetError(), VFS_ERR_CONFIG_READ) << name << " on " << doc;
                EXPECT_EQ(Text(File(mode)), doc) << name;
            }
        }
    }
}

TEST_F(Config, ServersThatAreNullOrMissingCountAsEmpty) {
    for (const char* doc : {R"({"servers":null})", "{}", "null"}) {
        PutText(File(VFS_CONFIG_SERVER), doc);
        Json::Value out;
        EXPECT_FALSE(CfgGetByID(kUser, VFS_CONFIG_SERVER, "ftp://a", out));
        EXPECT_EQ(GetError(), VFS_ERR_CONFIG_NOT_FOUND) << doc;
        EXPECT_TRUE(CfgDeleteByID(kUser, VFS_CONFIG_SERVER, "ftp://a")) << doc;
        EXPECT_TRUE(CfgAppend(kUser, VFS_CONFIG_SERVER, "ftp://a", Profile("ftp"))) << doc;
        EXPECT_EQ(Stored(VFS_CONFIG_SERVER)["ftp://a"], Profile("ftp")) << doc;
    }
}

TEST_F(Config, TextsOfAnyBytesComeBackAsTheyWere) {
    Json::Value profile = Profile("ftp");
    profile["large"] = std::string(1 << 20, 'x');
    profile["nul"] = std::string("a\0b", 3);
    profile["latin"] = "caf\xe9 \xff\xfe";
    profile["control"] = "line\nfeed\ttab\x01";
    const std::string id = "ftp://\xff\"quoted\"\\back";
    ASSERT_TRUE(CfgAppend(kUser, VFS_CONFIG_SERVER, id.c_str(), profile));
    Json::Value back;
    ASSERT_TRUE(CfgGetByID(kUser, VFS_CONFIG_SERVER, id.c_str(), back));
    EXPECT_EQ(back, profile);
    EXPECT_TRUE(CfgDeleteByID(kUser, VFS_CONFIG_SERVER, id.c_str()));
    EXPECT_FALSE(CfgGetByID(kUser, VFS_CONFIG_SERVER, id.c_str(), back));
}

TEST_F(Config, IdsWithNulOrOfAMegabyteAreKeys) {
    std::string id("ftp://a\0b", 9);
    ASSERT_TRUE(CfgSetByID(kUser, VFS_CONFIG_SERVER, id, id, Profile("ftp")));
    EXPECT_TRUE(Stored(VFS_CONFIG_SERVER).isMember(id));
    std::string large(1 << 20, 'k');
    ASSERT_TRUE(CfgSetByID(kUser, VFS_CONFIG_SERVER, large, large, Profile("ftp")));
    EXPECT_TRUE(Stored(VFS_CONFIG_SERVER).isMember(large));
}

}  // namespace
}  // namespace ZYROVFS::Server
