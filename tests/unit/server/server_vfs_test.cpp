#include "server/server_vfs.h"

#include <gtest/gtest.h>

#include <filesystem>

#include "support/profiles.h"
#include "support/seams.h"
#include "support/soup_seam.h"

namespace ZYROVFS::Server {
namespace {

using profiles::kUser;

Json::Value Profile() {
    Json::Value conf;
    conf["protocol"] = "sftp";
    conf["hostname"] = "nas.example";
    conf["port"] = 2222;
    conf["alias"] = "Home";
    conf["account"] = "amy";
    conf["password"] = "secret";
    conf["codepage"] = "UTF-8";
    return conf;
}

class VfsServer : public profiles::ProfileTest {
  protected:
    void SetUp() override {
        ProfileTest::SetUp();
        soup_seam::Reset();
    }
    void TearDown() override { soup_seam::Reset(); }

    bool Load(const Json::Value& conf) {
        ResetError();
        return server.Load(kUser, VFS_CONFIG_SERVER, conf, false, true);
    }
    void ExpectRefused(const Json::Value& conf) {
        bool loaded = true;
        EXPECT_NO_THROW(loaded = Load(conf));
        EXPECT_FALSE(loaded);
        EXPECT_EQ(GetError(), VFS_ERR_BAD_PARAM);
    }
    std::string IdOf(const Json::Value& conf) {
        EXPECT_TRUE(Load(conf)) << seams::LogDump();
        std::string id;
        EXPECT_TRUE(server.GetServerID(id));
        return id;
    }
    std::string IdOf(const char* protocol, const char* host, const char* account, unsigned port) {
        Json::Value conf = Profile();
        conf["protocol"] = protocol;
        conf["hostname"] = host;
        conf["account"] = account;
        conf["port"] = port;
        return IdOf(conf);
    }
    _tag_VFS_CONFIG_INFO_ Dump() {
        _tag_VFS_CONFIG_INFO_ info;
        EXPECT_TRUE(server.DumpToStruct(kUser, VFS_CONFIG_SERVER, info));
        return info;
    }

    VFSServer server;
};

// --- load ---------------------------------------------------------------------------------------

TEST_F(VfsServer, EveryRequiredKeyIsRequired) {
    ASSERT_TRUE(Load(Profile()));
    for (const std::string& key : Profile().getMemberNames()) {
        Json::Value conf = Profile();
        conf.removeMember(key);
        SCOPED_TRACE(key);
        ExpectRefused(conf);
        EXPECT_TRUE(seams::Logged("Profile without " + key)) << seams::LogDump();
    }
}

TEST_F(VfsServer, OptionalKeysHaveDefaults) {
    ASSERT_TRUE(Load(Profile()));
    const _tag_VFS_CONFIG_INFO_ info = Dump();
    EXPECT_EQ(info.uri_path, "");
    EXPECT_EQ(info.max_connection, 0U);
    EXPECT_EQ(info.connect_status, 0);
}

TEST_F(VfsServer, NullOfAnOptionalKeyCountsAsMissing) {
    Json::Value conf = Profile();
    conf["uri_path"] = Json::Value();
    conf["max_connection"] = Json::Value();
    conf["path"] = Json::Value();
    ASSERT_TRUE(Load(conf)) << seams::LogDump();
    EXPECT_EQ(Dump().max_connection, 0U);
}

TEST_F(VfsServer, ValuesOfTheWrongTypeAreRefusedWithALogLine) {
    const Json::Value object(Json::objectValue);
    const Json::Value array(Json::arrayValue);
    for (const char* key : {"protocol", "hostname", "port", "alias", "account", "password",
                            "codepage", "uri_path", "path", "max_connection"}) {
        const bool number = std::string(key) == "port" || std::string(key) == "max_connection";
        const Json::Value other = number ? Json::Value("21") : Json::Value(21);
        for (const Json::Value& wrong : {object, array, other, Json::Value(true)}) {
            Json::Value conf = Profile();
            conf[key] = wrong;
            SCOPED_TRACE(key + wrong.toStyledString());
            seams::Reset();
            ExpectRefused(conf);
            EXPECT_TRUE(seams::LoggedPart(std::string("Wrong value of ") + key))
                << seams::LogDump();
        }
    }
}

TEST_F(VfsServer, NullOfARequiredKeyIsRefused) {
    for (const std::string& key : Profile().getMemberNames()) {
        Json::Value conf = Profile();
        conf[key] = Json::Value();
        SCOPED_TRACE(key);
        ExpectRefused(conf);
    }
}

TEST_F(VfsServer, ProfileThatIsNoObjectIsRefused) {
    for (const Json::Value& conf :
         {Json::Value(), Json::Value("text"), Json::Value(Json::arrayValue), Json::Value(7)}) {
        seams::Reset();
        ExpectRefused(conf);
        EXPECT_FALSE(seams::LogLines().empty());
    }
}

TEST_F(VfsServer, TextsThatNoInterfaceCarriesAreRefused) {
    const std::string huge(1 << 20, 'x');
    const std::string with_nul("a\0b", 3);
    for (const char* key : {"protocol", "hostname", "account", "password", "codepage", "alias"}) {
        for (const std::string& text : {huge, with_nul, std::string("\xff\xfe")}) {
            Json::Value conf = Profile();
            conf[key] = text;
            SCOPED_TRACE(key);
            seams::Reset();
            ExpectRefused(conf);
            EXPECT_TRUE(seams::LoggedPart(std::string("Wrong value of ") + key));
        }
    }
}

TEST_F(VfsServer, RemotePathMayHaveTheBytesOfItsCodepage) {
    Json::Value conf = Profile();
    conf["uri_path"] = "caf\xe9";
    conf["codepage"] = "ISO-8859-1";
    ASSERT_TRUE(Load(conf)) << seams::LogDump();
    EXPECT_EQ(Dump().uri_path, "caf\xe9");
    conf["uri_path"] = std::string("a\0b", 3);
    ExpectRefused(conf);
}

// --- ports --------------------------------------------------------------------------------------

TEST_F(VfsServer, Port65536FailsAndPort65535Passes) {
    Json::Value conf = Profile();
    for (const Json::Value& port : {Json::Value(1), Json::Value(65535), Json::Value(65535.0)}) {
        conf["port"] = port;
        EXPECT_TRUE(Load(conf)) << port.toStyledString();
    }
    for (const Json::Value& port : {Json::Value(65536), Json::Value(-1), Json::Value(4294967296.0),
                                    Json::Value(21.5), Json::Value(Json::UInt64(1) << 40)}) {
        conf["port"] = port;
        SCOPED_TRACE(port.toStyledString());
        ExpectRefused(conf);
    }
    EXPECT_TRUE(server.IsPortValid(1));
    EXPECT_TRUE(server.IsPortValid(65535));
    EXPECT_FALSE(server.IsPortValid(0));
    EXPECT_FALSE(server.IsPortValid(65536));
    EXPECT_FALSE(server.IsPortValid(4294967295U));
}

void Catalogue(const std::string& protocol, const std::string& line) {
    profiles::PutText("/usr/share/gvfs/mounts/" + protocol + ".mount", "[Mount]\n" + line + "\n");
}

TEST_F(VfsServer, Port0TakesTheDefaultOfTheCatalogue) {
    Catalogue("tport", "DefaultPort=4711");
    Json::Value conf = Profile();
    conf["protocol"] = "tport";
    conf["port"] = 0;
    ASSERT_TRUE(Load(conf)) << seams::LogDump();
    EXPECT_EQ(Dump().port, 4711U);
    Json::Value stored;
    ASSERT_TRUE(server.CreateJsonObj(kUser, VFS_CONFIG_SERVER, stored, false));
    EXPECT_EQ(stored["port"], 4711U);
}

TEST_F(VfsServer, Port0WithoutADefaultIsRefused) {
    Catalogue("tport", "Protocol=tport");
    Json::Value conf = Profile();
    conf["port"] = 0;
    for (const char* protocol : {"tport", "no-such-protocol"}) {
        conf["protocol"] = protocol;
        ExpectRefused(conf);
    }
}

TEST_F(VfsServer, DefaultsThatAreNoPortsAreRefused) {
    Json::Value conf = Profile();
    conf["protocol"] = "tport";
    conf["port"] = 0;
    for (const char* value : {"ftp", "-21", "0", "65536", "99999999999999999999", ""}) {
        Catalogue("tport", std::string("DefaultPort=") + value);
        SCOPED_TRACE(value);
        ExpectRefused(conf);
    }
}

TEST_F(VfsServer, PortOtherThan0DoesNotAskTheCatalogue) {
    Catalogue("tport", "DefaultPort=4711");
    Json::Value conf = Profile();
    conf["protocol"] = "tport";
    conf["port"] = 9;
    ASSERT_TRUE(Load(conf));
    EXPECT_EQ(Dump().port, 9U);
}

// --- alias, host, code page ---------------------------------------------------------------------

TEST_F(VfsServer, AliasOf255BytesPassesAndOneOf256Fails) {
    Json::Value conf = Profile();
    for (const size_t length : {size_t{0}, size_t{255}}) {
        conf["alias"] = std::string(length, 'a');
        EXPECT_TRUE(Load(conf)) << length;
    }
    conf["alias"] = std::string(256, 'a');
    ExpectRefused(conf);
    std::string bytes;
    for (int i = 0; i < 128; ++i) {
        bytes += "\xc3\xa4";
    }
    conf["alias"] = bytes;
    ExpectRefused(conf);
}

TEST_F(VfsServer, AnyHostAndAnyCodepageIsValid) {
    EXPECT_TRUE(server.IsHostnameValid(""));
    EXPECT_TRUE(server.IsHostnameValid("no host at all/"));
    EXPECT_TRUE(server.IsCodepageValid(""));
    EXPECT_TRUE(server.IsCodepageValid("EBCDIC-42"));
}

TEST_F(VfsServer, ConfigIsCheckedByTheMembersThatAreThere) {
    Json::Value conf(Json::objectValue);
    EXPECT_TRUE(server.IsConfigValid(conf));
    conf["port"] = 0;
    EXPECT_FALSE(server.IsConfigValid(conf));
    conf["port"] = 21;
    EXPECT_TRUE(server.IsConfigValid(conf));
    conf["alias"] = std::string(256, 'a');
    EXPECT_FALSE(server.IsConfigValid(conf));
    conf["alias"] = Json::Value(Json::objectValue);
    EXPECT_FALSE(server.IsConfigValid(conf));
}

// --- id -----------------------------------------------------------------------------------------

TEST_F(VfsServer, IdIsSchemeUserHostAndPort) {
    EXPECT_EQ(IdOf("sftp", "nas.example", "amy", 2222), "sftp://amy@nas.example:2222");
    EXPECT_EQ(IdOf("dav", "nas.example", "", 8080), "dav://nas.example:8080");
}

TEST_F(VfsServer, IdHoldsNeitherAliasNorRemotePathNorPassword) {
    Json::Value conf = Profile();
    conf["uri_path"] = "pub";
    conf["alias"] = "Other";
    conf["password"] = "other";
    EXPECT_EQ(IdOf(conf), IdOf(Profile()));
}

TEST_F(VfsServer, OnlyDefaultPortsThatLibsoupKnowsAreLeftOut) {
    EXPECT_EQ(IdOf("ftp", "h", "", 21), "ftp://h");
    EXPECT_EQ(IdOf("ftp", "h", "", 22), "ftp://h:22");
    EXPECT_EQ(IdOf("sftp", "h", "", 22), "sftp://h:22");
    EXPECT_EQ(IdOf("dav", "h", "", 80), "dav://h:80");
    EXPECT_EQ(IdOf("davs", "h", "", 443), "davs://h:443");
    EXPECT_EQ(IdOf("http", "h", "", 80), "http://h");
    EXPECT_EQ(IdOf("https", "h", "", 443), "https://h");
}

TEST_F(VfsServer, EscapesOfHostAndUserAreUndoneInTheId) {
    EXPECT_EQ(IdOf("ftp", "h", "amy@corp:x/y", 2121), "ftp://amy@corp:x/y@h:2121");
    EXPECT_EQ(IdOf("cifs", "h", "CORP\\amy", 445), "cifs://CORP\\amy@h:445");
    EXPECT_EQ(IdOf("ftp", "my host", "am%41y", 2121), "ftp://am%41y@my host:2121");
}

TEST_F(VfsServer, Ipv6HostsGetTheirBrackets) {
    EXPECT_EQ(IdOf("sftp", "fe80::1", "amy", 2222), "sftp://amy@[fe80::1]:2222");
    EXPECT_EQ(IdOf("sftp", "fe80::1%eth0", "amy", 2222), "sftp://amy@[fe80::1%eth0]:2222");
}

TEST_F(VfsServer, EmptyHostStillGivesAnId) {
    EXPECT_EQ(IdOf("ftp", "", "", 2121), "ftp://:2121");
}

TEST_F(VfsServer, IdCannotBeHadWithoutMemory) {
    ASSERT_TRUE(Load(Profile()));
    std::string id = "as it was";
    soup_seam::fail_new_after = 0;
    EXPECT_FALSE(server.GetServerID(id));
    EXPECT_TRUE(seams::Logged("soup_uri_new failed"));
    soup_seam::Reset();
    soup_seam::fail_to_string = true;
    EXPECT_FALSE(server.GetServerID(id));
    EXPECT_TRUE(
        seams::Logged("soup_uri_to_string failed, protocol: sftp, host: nas.example, "
                      "port: 2222"));
    EXPECT_EQ(id, "as it was");
}

// --- what is shown ------------------------------------------------------------------------------

TEST_F(VfsServer, UriForPeopleHasNoAccountAndNoPassword) {
    std::string uri;
    Json::Value conf = Profile();
    ASSERT_TRUE(Load(conf));
    EXPECT_TRUE(server.GetURI(uri));
    EXPECT_EQ(uri, "sftp://nas.example:2222");
    conf["uri_path"] = "pub/films";
    ASSERT_TRUE(Load(conf));
    EXPECT_TRUE(server.GetURI(uri));
    EXPECT_EQ(uri, "sftp://nas.example:2222/pub/films");
}

TEST_F(VfsServer, UriOfNothingLoadedHasNoPort) {
    std::string uri;
    EXPECT_TRUE(server.GetURI(uri));
    EXPECT_EQ(uri, "://");
}

TEST_F(VfsServer, DumpShowsTheProfile) {
    Json::Value conf = Profile();
    conf["uri_path"] = "pub";
    conf["max_connection"] = 5;
    ASSERT_TRUE(Load(conf));
    _tag_VFS_CONFIG_INFO_ info;
    info.id = "left alone";
    ASSERT_TRUE(server.DumpToStruct(kUser, VFS_CONFIG_SERVER, info));
    EXPECT_EQ(info.id, "left alone");
    EXPECT_EQ(info.protocol, "sftp");
    EXPECT_EQ(info.port, 2222U);
    EXPECT_EQ(info.hostname, "nas.example");
    EXPECT_EQ(info.alias, "Home");
    EXPECT_EQ(info.account, "amy");
    EXPECT_EQ(info.codepage, "UTF-8");
    EXPECT_EQ(info.uri_path, "pub");
    EXPECT_EQ(info.uri, "sftp://nas.example:2222/pub");
    EXPECT_EQ(info.connect_status, 0);
    EXPECT_EQ(info.max_connection, 5U);
}

TEST_F(VfsServer, LiveConnectionWithALocalPathShowsAsConnected) {
    Json::Value servers;
    servers["sftp://amy@nas.example:2222"]["path"] = "/tmp";
    profiles::Put(VFS_CONFIG_CONNECT, servers);
    ASSERT_TRUE(Load(Profile()));
    EXPECT_EQ(Dump().connect_status, 1);
}

// --- remount ------------------------------------------------------------------------------------

TEST_F(VfsServer, OnlyChangesOfTheMountNeedARemount) {
    const std::pair<const char*, bool> rows[] = {
        {"protocol", true}, {"hostname", true}, {"port", true},           {"account", true},
        {"password", true}, {"codepage", true}, {"uri_path", true},       {"alias", false},
        {"path", false},    {"other", false},   {"max_connection", false}};
    for (const auto& [key, remount] : rows) {
        Json::Value changes;
        changes[key] = Json::Value();
        EXPECT_EQ(server.IsUpdateNeedsRemount(kUser, VFS_CONFIG_CONNECT, changes), remount) << key;
    }
}

TEST_F(VfsServer, ChangeOfTheAliasAloneDoesNotUnmount) {
    Json::Value changes;
    changes["alias"] = "New";
    changes["max_connection"] = 9;
    EXPECT_FALSE(server.IsUpdateNeedsRemount(kUser, VFS_CONFIG_CONNECT, changes));
    changes["port"] = 21;
    EXPECT_TRUE(server.IsUpdateNeedsRemount(kUser, VFS_CONFIG_CONNECT, changes));
}

TEST_F(VfsServer, ChangesThatAreNoObjectNeedNoRemount) {
    EXPECT_FALSE(server.IsUpdateNeedsRemount(kUser, VFS_CONFIG_CONNECT, Json::Value()));
    EXPECT_NO_THROW(
        EXPECT_FALSE(server.IsUpdateNeedsRemount(kUser, VFS_CONFIG_CONNECT, Json::Value("text"))));
}

}  // namespace
}  // namespace ZYROVFS::Server
