// All protocols of the catalogue, and which of them a user has servers of.
#include <gmock/gmock.h>

#include "support/catalogue.h"
#include "support/failing_alloc.h"
#include "support/profiles.h"
#include "support/scratch.h"
#include "support/seams.h"
#include "zyrovfs/protocol.h"

namespace ZYROVFS::Protocol {
namespace {

using profiles::kUser;
using testing::ElementsAre;

const std::string kDir = paths::kCatalogueDir;

class ListProtocolTest : public profiles::ProfileTest {
  protected:
    void SetUp() override {
        ProfileTest::SetUp();
        catalogue::Clear();
        failing_alloc::no_hash = false;
        failing_alloc::no_list = false;
    }
    static Json::Value List() {
        Json::Value out;
        EXPECT_TRUE(ListProtocol(out));
        EXPECT_TRUE(out.isArray());
        return out;
    }
    static std::vector<std::string> Texts(const Json::Value& list, const char* key) {
        std::vector<std::string> texts;
        for (const Json::Value& element : list) {
            texts.push_back(element[key].asString());
        }
        return texts;
    }
    /** Fails with this code and leaves an empty array. */
    static void ExpectFailure(__tag_vfs_err_ code) {
        Json::Value out;
        ResetError();
        EXPECT_FALSE(ListProtocol(out));
        EXPECT_EQ(GetError(), code);
        EXPECT_STREQ(GetErrorFile(), "list.cpp");
        EXPECT_TRUE(out.empty());
    }
};

TEST_F(ListProtocolTest, NoCatalogueIsAnEmptyList) {
    std::filesystem::remove_all(kDir);
    EXPECT_EQ(List(), Json::Value(Json::arrayValue));
    EXPECT_TRUE(seams::LogLines().empty()) << seams::LogDump();
}

TEST_F(ListProtocolTest, EmptyCatalogueIsAnEmptyList) {
    EXPECT_EQ(List(), Json::Value(Json::arrayValue));
}

TEST_F(ListProtocolTest, ElementHasFiveKeys) {
    scratch::PutText(kDir + "/ftp.mount",
                     "[Mount]\nProtocol=ftp\nName=FTP\nActions=list,copy\nEnableCurl=true\n"
                     "DefaultPort=21\n");
    const Json::Value list = List();
    ASSERT_EQ(list.size(), 1U);
    EXPECT_THAT(list[0].getMemberNames(),
                ElementsAre("api", "default_port", "enable_curl", "name", "protocol"));
    EXPECT_EQ(list[0]["protocol"], "ftp");
    EXPECT_EQ(list[0]["name"], "FTP");
    EXPECT_EQ(list[0]["api"], "list,copy");
    EXPECT_EQ(list[0]["enable_curl"], "true");
    EXPECT_TRUE(list[0]["default_port"].isUInt());
    EXPECT_EQ(list[0]["default_port"].asUInt(), 21U);
}

TEST_F(ListProtocolTest, FileWithoutPortAndEnableCurlListsTheDefaults) {
    catalogue::Add("dav", "WebDAV", "list");
    const Json::Value list = List();
    ASSERT_EQ(list.size(), 1U);
    EXPECT_EQ(list[0]["default_port"].asUInt(), 80U);
    EXPECT_EQ(list[0]["enable_curl"], "false");
}

TEST_F(ListProtocolTest, SortsByNameWithoutCaseInUtf8) {
    catalogue::Add("a", "zeta", "");
    catalogue::Add("b", "\xc3\x89toile", "");  // capital e acute
    catalogue::Add("c", "\xc3\xa9tage", "");   // small e acute
    catalogue::Add("d", "Beta", "");
    catalogue::Add("e", "alpha", "");
    EXPECT_THAT(Texts(List(), "protocol"), ElementsAre("e", "d", "a", "c", "b"));
}

TEST_F(ListProtocolTest, EqualNamesKeepTheOrderOfTheFiles) {
    for (const char* protocol : {"c", "a", "d", "b"}) {
        catalogue::Add(protocol, *protocol % 2 == 0 ? "SAME" : "same", "");
    }
    EXPECT_THAT(Texts(List(), "protocol"), ElementsAre("a", "b", "c", "d"));
}

TEST_F(ListProtocolTest, OtherFilesAreNotListed) {
    catalogue::Add("ftp", "FTP", "");
    scratch::PutText(kDir + "/README", "[Mount]\nName=no\n");
    scratch::PutText(kDir + "/dav.mount.dpkg-old", "[Mount]\nName=no\n");
    EXPECT_THAT(Texts(List(), "name"), ElementsAre("FTP"));
}

TEST_F(ListProtocolTest, FileWithoutTheSectionIsARecordOfEmptyTexts) {
    catalogue::Add("ftp", "FTP", "list");
    scratch::PutText(kDir + "/odd.mount", "Name=no section\n");
    const Json::Value list = List();
    EXPECT_THAT(Texts(list, "name"), ElementsAre("", "FTP"));
    EXPECT_EQ(list[0]["protocol"], "");
    EXPECT_EQ(list[0]["default_port"].asUInt(), 80U);
}

TEST_F(ListProtocolTest, OneUnreadableFileLosesTheList) {
    catalogue::Add("ftp", "FTP", "list");
    std::filesystem::create_directory(kDir + "/bad.mount");
    ExpectFailure(VFS_ERR_FAILED);
    EXPECT_TRUE(seams::LoggedPart("YLIBCFileGetSection failed: " + kDir +
                                  "/bad.mount, zyroerr=[0x0900 section.cpp:"))
        << seams::LogDump();
    std::filesystem::remove(kDir + "/bad.mount");
    std::filesystem::create_symlink("/nowhere", kDir + "/bad.mount");
    ExpectFailure(VFS_ERR_FAILED);
}

TEST_F(ListProtocolTest, BinaryAndLargeFilesAreRead) {
    const std::string large(1 << 20, 'n');
    catalogue::Add("large", large, large);
    scratch::PutText(kDir + "/bin.mount", std::string("\0\x01[Mount]\n\xff\xfe=\0\n", 16));
    const Json::Value list = List();
    EXPECT_THAT(Texts(list, "name"), ElementsAre("", large));
}

TEST_F(ListProtocolTest, ManyFiles) {
    for (int i = 0; i < 1000; ++i) {
        catalogue::Add("p" + std::to_string(i), "Name " + std::to_string(1000 + i), "");
    }
    const std::vector<std::string> names = Texts(List(), "name");
    EXPECT_EQ(names.size(), 1000U);
    EXPECT_TRUE(std::is_sorted(names.begin(), names.end()));
}

TEST_F(ListProtocolTest, CatalogueThatCannotBeEnumeratedFails) {
    // As the user: a folder that may be passed but not read.
    std::filesystem::permissions(kDir, std::filesystem::perms(0711));
    EXPECT_EQ(scratch::InChild([] {
                  if (!scratch::BecomeUser(1234)) {
                      return 1;
                  }
                  ExpectFailure(VFS_ERR_FAILED);
                  EXPECT_TRUE(seams::LoggedPart("YLIBCFileEnumDir failed: " + kDir +
                                                ", zyroerr=[0x0300 file.cpp:"))
                      << seams::LogDump();
                  return testing::Test::HasFailure() ? 2 : 0;
              }),
              0);
}

TEST_F(ListProtocolTest, MemoryThatRunsOutIsTold) {
    failing_alloc::no_list = true;
    ExpectFailure(VFS_ERR_OUT_OF_MEMORY);
    EXPECT_TRUE(seams::Logged("YLIBCSzListAlloc(1024) failed [0x0200 heap.cpp:12]"))
        << seams::LogDump();
    failing_alloc::no_list = false;
    failing_alloc::no_hash = true;
    ExpectFailure(VFS_ERR_OUT_OF_MEMORY);
    EXPECT_TRUE(seams::Logged("YLIBCSzHashAlloc(1024) failed [0x0200 heap.cpp:12]"))
        << seams::LogDump();
}

class ListProtocolByUIDTest : public ListProtocolTest {
  protected:
    void SetUp() override {
        ListProtocolTest::SetUp();
        for (const char* protocol : {"dav", "ftp", "sharing", "sftp"}) {
            catalogue::Add(protocol, protocol, "list");
        }
    }
    /** The protocols that the user has a server of. */
    static std::vector<std::string> Used() {
        Json::Value out;
        EXPECT_TRUE(ListProtocolByUID(kUser, out));
        EXPECT_EQ(out.size(), 4U);
        std::vector<std::string> used;
        for (const Json::Value& element : out) {
            EXPECT_TRUE(element["has_server"].isBool());
            if (element["has_server"].asBool()) {
                used.push_back(element["protocol"].asString());
            }
        }
        return used;
    }
    static Json::Value Profile(const Json::Value& protocol) {
        Json::Value profile;
        profile["protocol"] = protocol;
        return profile;
    }
};

TEST_F(ListProtocolByUIDTest, SharingIsAlwaysOffered) {
    EXPECT_THAT(Used(), ElementsAre("sharing"));
}

TEST_F(ListProtocolByUIDTest, SavedServersMarkTheirProtocol) {
    Json::Value servers;
    servers["ftp://a"] = Profile("ftp");
    servers["ftp://b"] = Profile("ftp");
    servers["cifs://c"] = Profile("cifs");
    profiles::Put(profiles::VFS_CONFIG_SERVER, servers);
    EXPECT_THAT(Used(), ElementsAre("ftp", "sharing"));
}

TEST_F(ListProtocolByUIDTest, ConnectionsDoNotCount) {
    Json::Value servers;
    servers["ftp://a"] = Profile("ftp");
    profiles::Put(profiles::VFS_CONFIG_CONNECT, servers);
    EXPECT_THAT(Used(), ElementsAre("sharing"));
}

TEST_F(ListProtocolByUIDTest, ProfilesOfWrongTypesCountAsNone) {
    Json::Value servers;
    servers["1"] = Profile(21);
    servers["2"] = Profile(Json::Value(Json::objectValue));
    servers["3"] = "ftp";
    servers["4"] = Json::Value(Json::arrayValue);
    servers["5"] = Json::Value();
    servers["6"] = Profile("FTP");
    servers["7"] = Profile(Json::Value());
    profiles::Put(profiles::VFS_CONFIG_SERVER, servers);
    EXPECT_THAT(Used(), ElementsAre("sharing"));
    for (const char* document :
         {"[]", "1", "{}", "{\"servers\":[]}", "{\"servers\":\"ftp\"}", "{\"servers\":null}"}) {
        profiles::PutText(profiles::File(profiles::VFS_CONFIG_SERVER), document);
        EXPECT_THAT(Used(), ElementsAre("sharing")) << document;
    }
}

TEST_F(ListProtocolByUIDTest, StoreThatCannotBeReadFails) {
    profiles::PutText(profiles::File(profiles::VFS_CONFIG_SERVER), "{");
    Json::Value out;
    EXPECT_FALSE(ListProtocolByUID(kUser, out));
    EXPECT_EQ(GetError(), VFS_ERR_CONFIG_READ);
    EXPECT_TRUE(seams::LoggedPart("LoadVFSServerCfg failed: 1234, zyroerr=[0x"))
        << seams::LogDump();
}

TEST_F(ListProtocolByUIDTest, ListThatFailsIsTold) {
    std::filesystem::create_directory(kDir + "/bad.mount");
    Json::Value out;
    EXPECT_FALSE(ListProtocolByUID(kUser, out));
    EXPECT_EQ(GetError(), VFS_ERR_FAILED);
    EXPECT_TRUE(seams::LoggedPart("ListProtocol failed, zyroerr=[0x0900 section.cpp:"))
        << seams::LogDump();
}

}  // namespace
}  // namespace ZYROVFS::Protocol
