// The whole catalogue, sorted, and what the user has of it.
#include <gmock/gmock.h>

#include "support/catalogue_test.h"

namespace ZYROVFS::Protocol {
namespace {

using catalogue::Put;
using profiles::kUser;
using profiles::VFS_CONFIG_CONNECT;
using profiles::VFS_CONFIG_SERVER;
using testing::ElementsAre;
using testing::IsEmpty;

class ListProtocolTest : public catalogue::CatalogueTest {
  protected:
    static void PutNamed(const std::string& protocol, const std::string& name) {
        Put(protocol + ".mount", "[Mount]\nProtocol=" + protocol + "\nName=" + name + "\n");
    }

    std::vector<std::string> Protocols() const {
        std::vector<std::string> all;
        for (const Json::Value& element : out_) {
            all.push_back(element["protocol"].asString());
        }
        return all;
    }

    /** Protocols that ListProtocolByUID marks. */
    std::vector<std::string> Used() const {
        std::vector<std::string> used;
        for (const Json::Value& element : out_) {
            if (element["has_server"] == true) {
                used.push_back(element["protocol"].asString());
            }
        }
        return used;
    }

    Json::Value out_ = "before";
};

TEST_F(ListProtocolTest, WithoutTheFolderOfTheCatalogueTheListIsEmptyAndTrue) {
    std::filesystem::remove_all(paths::kCatalogueDir);
    EXPECT_TRUE(ListProtocol(out_));
    EXPECT_EQ(out_, Json::Value(Json::arrayValue));
    std::ofstream(paths::kCatalogueDir) << "a file in the folder's place";
    EXPECT_TRUE(ListProtocol(out_));
    EXPECT_EQ(out_, Json::Value(Json::arrayValue));
    std::filesystem::remove(paths::kCatalogueDir);
}

TEST_F(ListProtocolTest, EmptyFolderGivesAnEmptyList) {
    EXPECT_TRUE(ListProtocol(out_));
    EXPECT_EQ(out_, Json::Value(Json::arrayValue));
}

TEST_F(ListProtocolTest, ElementHasTheseFiveKeys) {
    Put("sftp.mount",
        "[Mount]\nProtocol=sftp\nName=SSH\nActions=list,read\nEnableCurl=true\nDefaultPort=22\n");
    ASSERT_TRUE(ListProtocol(out_));
    Json::Value expected;
    expected["protocol"] = "sftp";
    expected["name"] = "SSH";
    expected["api"] = "list,read";
    expected["enable_curl"] = "true";
    expected["default_port"] = 22U;
    ASSERT_EQ(out_.size(), 1U);
    EXPECT_EQ(out_[0], expected);
}

TEST_F(ListProtocolTest, WithoutDefaultPort80AndWithoutEnableCurlFalse) {
    PutNamed("ftp", "FTP");
    ASSERT_TRUE(ListProtocol(out_));
    EXPECT_EQ(out_[0]["default_port"].asUInt(), 80U);
    EXPECT_EQ(out_[0]["enable_curl"], "false");
}

TEST_F(ListProtocolTest, DefaultPortIsTheDecimalNumberThatItsTextBeginsWith) {
    for (const auto& [text, port] :
         {std::pair("0x16", 0U), std::pair("21 or so", 21U), std::pair("none", 0U),
          std::pair("", 0U), std::pair("-1", 4294967295U), std::pair("010", 10U)}) {
        Put("x.mount", std::string("[Mount]\nDefaultPort=") + text + "\n");
        ASSERT_TRUE(ListProtocol(out_)) << text;
        EXPECT_EQ(out_[0]["default_port"].asUInt(), port) << text;
    }
}

TEST_F(ListProtocolTest, OnlyMountFilesAreListed) {
    PutNamed("ftp", "FTP");
    Put("readme.txt", "[Mount]\nProtocol=text\n");
    Put("ftp.mount.bak", "[Mount]\nProtocol=bak\n");
    ASSERT_TRUE(ListProtocol(out_));
    EXPECT_THAT(Protocols(), ElementsAre("ftp"));
}

TEST_F(ListProtocolTest, SortsByNameNotByProtocolAndIgnoresCase) {
    PutNamed("a", "zebra");
    PutNamed("b", "APPLE");
    PutNamed("c", "banana");
    PutNamed("d", "apricot");
    ASSERT_TRUE(ListProtocol(out_));
    EXPECT_THAT(Protocols(), ElementsAre("b", "d", "c", "a"));
}

TEST_F(ListProtocolTest, SortingIgnoresCaseBeyondAscii) {
    PutNamed("a", "\u00d6zel 3");  // capital O with diaeresis
    PutNamed("b", "\u00f6zel 1");  // the small one
    PutNamed("c", "\u00d6ZEL 2");
    PutNamed("d", "\u03b1 2");  // small alpha
    PutNamed("e", "\u0391 1");  // capital alpha
    ASSERT_TRUE(ListProtocol(out_));
    EXPECT_THAT(Protocols(), ElementsAre("b", "c", "a", "e", "d"));
}

TEST_F(ListProtocolTest, EqualNamesKeepTheEnumerationOrder) {
    for (const char* protocol : {"f", "b", "d", "a", "e", "c"}) {
        PutNamed(protocol, protocol[0] % 2 == 0 ? "Same" : "sAME");
    }
    ASSERT_TRUE(ListProtocol(out_));
    EXPECT_THAT(Protocols(), ElementsAre("a", "b", "c", "d", "e", "f"));
}

TEST_F(ListProtocolTest, FileWithoutTheSectionGivesARecordOfEmptyTexts) {
    for (const auto& [name, text] : catalogue::DamagedTexts()) {
        SCOPED_TRACE(name);
        Put("x.mount", text);
        PutNamed("ftp", "FTP");
        ASSERT_TRUE(ListProtocol(out_));
        ASSERT_EQ(out_.size(), 2U);
        EXPECT_EQ(out_[0]["protocol"], "");
        EXPECT_EQ(out_[0]["name"], "");
        EXPECT_EQ(out_[0]["api"], "");
        EXPECT_EQ(out_[0]["default_port"].asUInt(), 80U);
        EXPECT_EQ(out_[1]["protocol"], "ftp");
    }
}

TEST_F(ListProtocolTest, KeysOfOneFileDoNotReachTheNext) {
    Put("a.mount", "[Mount]\nProtocol=a\nName=A\nActions=list\nDefaultPort=7\n");
    Put("b.mount", "[Mount]\nProtocol=b\n");
    ASSERT_TRUE(ListProtocol(out_));
    EXPECT_EQ(out_[0]["protocol"], "b");  // its name is empty
    EXPECT_EQ(out_[0]["api"], "");
    EXPECT_EQ(out_[0]["default_port"].asUInt(), 80U);
}

TEST_F(ListProtocolTest, OneUnreadableFileLosesTheList) {
    PutNamed("ftp", "FTP");
    std::filesystem::create_directory(catalogue::Path("dir.mount"));
    EXPECT_FALSE(ListProtocol(out_));
    EXPECT_EQ(GetError(), VFS_ERR_FAILED);
    EXPECT_EQ(out_, Json::Value(Json::arrayValue));
    EXPECT_TRUE(seams::LoggedPart("YLIBCFileGetSection failed: " + catalogue::Path("dir.mount") +
                                  ", zyroerr=[0x"))
        << seams::LogDump();
}

TEST_F(ListProtocolTest, FilesThatCannotBeOpenedLoseTheListWithoutWaiting) {
    PutNamed("ftp", "FTP");
    std::filesystem::create_symlink("/nowhere", catalogue::Path("link.mount"));
    EXPECT_FALSE(ListProtocol(out_));
    EXPECT_EQ(GetError(), VFS_ERR_FAILED);
    std::filesystem::remove(catalogue::Path("link.mount"));
    ResetError();
    ASSERT_EQ(mkfifo(catalogue::Path("fifo.mount").c_str(), 0666), 0);
    EXPECT_FALSE(ListProtocol(out_));
    EXPECT_EQ(GetError(), VFS_ERR_FAILED);
}

TEST_F(ListProtocolTest, FolderThatMayNotBeReadFails) {
    PutNamed("ftp", "FTP");
    ASSERT_EQ(chmod(paths::kCatalogueDir, 0700), 0);
    catalogue::AsUser([&] { EXPECT_FALSE(ListProtocol(out_)); });
    ASSERT_EQ(chmod(paths::kCatalogueDir, 0755), 0);
    EXPECT_EQ(GetError(), VFS_ERR_FAILED);
    EXPECT_TRUE(seams::LoggedPart("YLIBCFileEnumDir failed: " + std::string(paths::kCatalogueDir) +
                                  ", zyroerr=[0x"))
        << seams::LogDump();
}

TEST_F(ListProtocolTest, WithoutMemoryForEitherContainerTheListFails) {
    catalogue::out_of_lists = true;
    EXPECT_FALSE(ListProtocol(out_));
    EXPECT_EQ(GetError(), VFS_ERR_OUT_OF_MEMORY);
    EXPECT_TRUE(seams::LoggedPart("YLIBCSzListAlloc(1024) failed [0x")) << seams::LogDump();
    catalogue::out_of_lists = false;
    catalogue::out_of_hashes = true;
    ResetError();
    EXPECT_FALSE(ListProtocol(out_));
    EXPECT_EQ(GetError(), VFS_ERR_OUT_OF_MEMORY);
    EXPECT_TRUE(seams::LoggedPart("YLIBCSzHashAlloc(1024) failed [0x")) << seams::LogDump();
    EXPECT_EQ(out_, "before");
}

TEST_F(ListProtocolTest, TenThousandFilesAreListed) {
    for (int i = 0; i < 10000; ++i) {
        PutNamed("p" + std::to_string(i), "n" + std::to_string(10000 - i));
    }
    ASSERT_TRUE(ListProtocol(out_));
    EXPECT_EQ(out_.size(), 10000U);
}

class ListProtocolByUidTest : public ListProtocolTest {
  protected:
    void SetUp() override {
        ListProtocolTest::SetUp();
        PutNamed("ftp", "FTP");
        PutNamed("sharing", "Shared");
        PutNamed("smb", "Windows");
    }

    static Json::Value Profile(const Json::Value& protocol) {
        Json::Value profile;
        profile["protocol"] = protocol;
        return profile;
    }
};

TEST_F(ListProtocolByUidTest, MarksTheProtocolsOfSavedProfiles) {
    Json::Value servers;
    servers["one"] = Profile("smb");
    servers["two"] = Profile("smb");
    servers["three"] = Profile("gopher");
    profiles::Put(VFS_CONFIG_SERVER, servers);
    ASSERT_TRUE(ListProtocolByUID(kUser, out_));
    EXPECT_THAT(Protocols(), ElementsAre("ftp", "sharing", "smb"));
    EXPECT_THAT(Used(), ElementsAre("sharing", "smb"));
    EXPECT_EQ(out_[0]["has_server"], false);
    EXPECT_EQ(out_[0].size(), 6U);
}

TEST_F(ListProtocolByUidTest, SharingAlwaysHasAServer) {
    ASSERT_TRUE(ListProtocolByUID(kUser, out_));
    EXPECT_THAT(Used(), ElementsAre("sharing"));
}

TEST_F(ListProtocolByUidTest, LiveConnectionsAreNoSavedProfiles) {
    Json::Value servers;
    servers["one"] = Profile("ftp");
    profiles::Put(VFS_CONFIG_CONNECT, servers);
    ASSERT_TRUE(ListProtocolByUID(kUser, out_));
    EXPECT_THAT(Used(), ElementsAre("sharing"));
}

TEST_F(ListProtocolByUidTest, ProtocolsAreComparedExactly) {
    Json::Value servers;
    servers["one"] = Profile("FTP");
    servers["two"] = Profile("smb ");
    profiles::Put(VFS_CONFIG_SERVER, servers);
    ASSERT_TRUE(ListProtocolByUID(kUser, out_));
    EXPECT_THAT(Used(), ElementsAre("sharing"));
}

TEST_F(ListProtocolByUidTest, DamagedProfilesMatchNothing) {
    Json::Value servers;
    servers["number"] = 7;
    servers["array"] = Json::Value(Json::arrayValue);
    servers["null"] = Json::Value();
    servers["without"]["alias"] = "x";
    servers["wrong"] = Profile(21);
    servers["object"] = Profile(Json::Value(Json::objectValue));
    servers["good"] = Profile("ftp");
    profiles::Put(VFS_CONFIG_SERVER, servers);
    ASSERT_TRUE(ListProtocolByUID(kUser, out_));
    EXPECT_THAT(Used(), ElementsAre("ftp", "sharing"));
    for (const char* text : {"[]", "{}", "7", "null", "{\"servers\":[]}", "{\"servers\":\"x\"}"}) {
        profiles::PutText(profiles::File(VFS_CONFIG_SERVER), text);
        EXPECT_TRUE(ListProtocolByUID(kUser, out_)) << text;
        EXPECT_THAT(Used(), ElementsAre("sharing")) << text;
    }
}

TEST_F(ListProtocolByUidTest, UnreadableProfilesFail) {
    profiles::PutText(profiles::File(VFS_CONFIG_SERVER), "{\"servers\":");
    EXPECT_FALSE(ListProtocolByUID(kUser, out_));
    EXPECT_EQ(GetError(), VFS_ERR_CONFIG_READ);
    EXPECT_TRUE(seams::LoggedPart("LoadVFSServerCfg failed: 1234, zyroerr=[0x"))
        << seams::LogDump();
}

TEST_F(ListProtocolByUidTest, UnreadableCatalogueFails) {
    std::filesystem::create_directory(catalogue::Path("dir.mount"));
    EXPECT_FALSE(ListProtocolByUID(kUser, out_));
    EXPECT_EQ(GetError(), VFS_ERR_FAILED);
    EXPECT_TRUE(seams::LoggedPart("ListProtocol failed, zyroerr=[0x")) << seams::LogDump();
}

TEST_F(ListProtocolByUidTest, EmptyCatalogueNeedsNoProfiles) {
    catalogue::Clear();
    EXPECT_TRUE(ListProtocolByUID(kUser, out_));
    EXPECT_THAT(Protocols(), IsEmpty());
}

}  // namespace
}  // namespace ZYROVFS::Protocol
