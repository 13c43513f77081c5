// The web layer behind lighttpd: the program is started by the web server's own account and acts
// for the user, on a real WebDAV server and the user's tree.
#include <gmock/gmock.h>

#include "support/vfs_cloud_remote.h"
#include "support/web_site.h"

namespace {

using namespace remote_side;
using namespace web_site;
using testing::HasSubstr;
using testing::Not;
using testing::UnorderedElementsAre;
namespace fs = std::filesystem;

std::string dav_id;

class Site : public testing::Environment {
    void SetUp() override {
        machine::AddUser("amy", kAmy);
        machine::AddUser("ben", kBen);
        machine::Remote(std::string("start ") + kPassword);
        ASSERT_EQ(machine::InProcess([] {
                      dav_id = Connect(kDav);
                      std::ofstream("/run/dav-id") << dav_id;
                      return dav_id.empty() ? 1 : 0;
                  }),
                  0);
        dav_id = machine::Read("/run/dav-id");
        Must(BuildDir() + "/tools/zyrovfs/zyrovfs policy set --type all");
        StartWebServer();
    }
};

const auto* const kSetUp = testing::AddGlobalTestEnvironment(new Site);

std::string At(const std::string& action, const std::string& path) {
    return web_site::At(action, dav_id, path);
}

std::vector<std::string> NamesAt(const std::string& path) {
    return web_site::NamesAt(dav_id, path);
}

Answer Change(const std::string& action, const std::string& path, const std::string& more = "",
              const std::string& headers = kOurs) {
    std::ofstream("/run/request.json")
        << "{\"connection\":\"" << dav_id << "\",\"path\":\"" << path << "\"" << more << "}";
    return Ask(headers + " --data-binary @/run/request.json", Api(action));
}

Answer Upload(const std::string& path, const std::string& bytes, const std::string& size = "",
              const std::string& headers = kOurs) {
    std::ofstream("/run/source", std::ios::binary) << bytes;
    return Ask(headers + " -F 'file=@/run/source'",
               At("upload", path) + (size.empty() ? "" : "&size=" + size));
}

TEST(Web, NobodyIsServedWithoutALogIn) {
    EXPECT_EQ(Ask("", At("connections", "/")).status, 401);
    EXPECT_EQ(Ask("-u amy:wrong", At("connections", "/")).status, 401);
    const Answer nobody = Ask("", std::string(kNoLogin) + "/files/api/connections");
    EXPECT_EQ(nobody.status, 403);
    EXPECT_THAT(nobody.body, HasSubstr("Nobody is logged in."));
    const Answer forged = Ask("-H 'Remote-User: amy' -H 'X-Remote-User: amy'",
                              std::string(kNoLogin) + "/files/api/connections");
    EXPECT_EQ(forged.status, 403);
    for (const char* account : {"root:r", "daemon:d", "nobody-here:n"}) {
        const Answer answer = Ask(std::string("-u ") + account, At("connections", "/"));
        EXPECT_EQ(answer.status, 403) << account;
        EXPECT_THAT(answer.body, HasSubstr("There is no such user.")) << account;
    }
}

TEST(Web, EachUserSeesTheOwnConnectionsAndNoOthers) {
    const Answer amy = Ask(kAmyIs, std::string(kSite) + "/files/api/connections");
    ASSERT_EQ(amy.status, 200) << amy.body << machine::Read("/run/web/error.log");
    EXPECT_EQ(amy.Json()["user"], "amy");
    ASSERT_EQ(amy.Json()["connections"].size(), 1U) << amy.body;
    EXPECT_EQ(amy.Json()["connections"][0]["id"], dav_id);
    EXPECT_THAT(amy.body, Not(HasSubstr("password")));

    const Answer ben = Ask("-u ben:b", std::string(kSite) + "/files/api/connections");
    EXPECT_EQ(ben.status, 200);
    EXPECT_EQ(ben.Json()["connections"].size(), 0U);
    for (const char* action : {"list", "download"}) {
        EXPECT_EQ(Ask("-u ben:b", At(action, "/hello.txt")).status, 404) << action;
    }
    for (const char* action : {"mkdir", "rename", "delete"}) {
        EXPECT_EQ(Change(action, "/hello.txt", ",\"name\":\"x\"", kBens).status, 404) << action;
    }
    EXPECT_EQ(Upload("/ben.txt", "ben's", "5", kBens).status, 404);
    EXPECT_TRUE(fs::exists("/srv/remote/hello.txt"));
}

TEST(Web, FoldersAreListedWithWhatIsInThem) {
    const Answer answer = Ask(kAmyIs, At("list", "/"));
    ASSERT_EQ(answer.status, 200) << answer.body;
    EXPECT_THAT(NamesAt("/"), UnorderedElementsAre("hello.txt", "docs"));
    const Json::Value listing = answer.Json();
    for (const Json::Value& entry : listing["entries"]) {
        EXPECT_EQ(entry["folder"].asBool(), entry["name"] == "docs");
        if (entry["name"] == "hello.txt") {
            EXPECT_EQ(entry["size"].asInt(), 27);
            EXPECT_GT(entry["modified"].asInt64(), 1000000000);
        }
    }
    EXPECT_THAT(NamesAt("/docs"), UnorderedElementsAre("inner.txt"));
    EXPECT_EQ(Ask(kAmyIs, At("list", "/nothing")).status, 404);
    EXPECT_EQ(Ask(kAmyIs, At("list", "/hello.txt")).status, 404);
}

TEST(Web, FilesGoUpThroughTheRelayWithAndWithoutTheirSize) {
    for (const size_t size : {size_t{0}, size_t{1}, size_t{131072}, size_t{3 << 20}}) {
        const std::string bytes = Noise(size);
        for (const bool known : {true, false}) {
            const std::string name = "up " + std::to_string(size) + (known ? "k" : "u");
            const Answer answer = Upload("/" + name, bytes, known ? std::to_string(size) : "");
            EXPECT_EQ(answer.status, 200) << size << answer.body;
            EXPECT_TRUE(machine::Read(kRemote + name) == bytes) << size;
            fs::remove(kRemote + name);
        }
    }
}

TEST(Web, ALongListComesCompressedToThoseWhoTakeIt) {
    Must("mkdir -p '" + kRemote + "many' && cd '" + kRemote +
         "many' && seq -f 'entry %g' 200 | xargs -d '\\n' touch");
    Json::Value plain;
    ASSERT_TRUE(Eventually([&plain] {
        plain = Ask(kAmyIs, At("list", "/many")).Json();
        return plain["entries"].size() == 200;
    }));
    const Answer packed = Ask(std::string(kAmyIs) + " --compressed", At("list", "/many"));
    EXPECT_THAT(packed.head, HasSubstr("Content-Encoding: gzip"));
    EXPECT_EQ(packed.Json()["entries"].size(), 200U);
    fs::remove_all(kRemote + "many");
}

TEST(Web, AnUploadThatTellsAnotherSizeThanItsOwnIsRefused) {
    for (const char* size : {"99999", "101", "99", "-5", "x", "9223372036854775808"}) {
        const Answer answer = Upload("/lie.bin", std::string(100, 'x'), size);
        EXPECT_GE(answer.status, 400) << size;
        EXPECT_THAT(answer.body, HasSubstr("meaning")) << size;
        EXPECT_FALSE(fs::exists("/srv/remote/lie.bin")) << size;
    }
}

TEST(Web, FilesComeDownWholeAndInParts) {
    const std::string bytes = Noise(2 << 20);
    PutFile(kRemote + "film.bin", bytes);
    ASSERT_TRUE(Eventually([] {
        return Ask(kAmyIs, At("list", "/film.bin")).status == 404 &&
               Ask(kAmyIs, At("download", "/film.bin")).status == 200;
    }));
    const Answer whole = Ask(kAmyIs, At("download", "/film.bin"));
    EXPECT_EQ(whole.status, 200);
    EXPECT_TRUE(whole.body == bytes);
    EXPECT_THAT(whole.head, HasSubstr("Content-Type: application/octet-stream"));
    EXPECT_THAT(whole.head,
                HasSubstr("Content-Disposition: attachment; filename*=UTF-8''film.bin"));
    EXPECT_THAT(whole.head, HasSubstr("X-Content-Type-Options: nosniff"));
    EXPECT_THAT(whole.head, HasSubstr("Content-Security-Policy: default-src 'none'"));
    const struct {
        const char* range;
        size_t from, size;
    } rows[] = {{"0-999", 0, 1000},
                {"1000000-1000099", 1000000, 100},
                {"2097000-", 2097000, 152},
                {"-152", 2097000, 152},
                {"2097000-9999999", 2097000, 152}};
    for (const auto& row : rows) {
        const Answer part =
            Ask(std::string(kAmyIs) + " -r " + row.range, At("download", "/film.bin"));
        EXPECT_EQ(part.status, 206) << row.range;
        EXPECT_TRUE(part.body == bytes.substr(row.from, row.size)) << row.range;
        EXPECT_THAT(part.head, HasSubstr("Content-Range: bytes " + std::to_string(row.from) + "-" +
                                         std::to_string(row.from + row.size - 1) + "/2097152"));
    }
    EXPECT_EQ(Ask(std::string(kAmyIs) + " -r 2097152-", At("download", "/film.bin")).status, 416);
    EXPECT_EQ(Ask(kAmyIs, At("download", "/nothing.bin")).status, 404);
    fs::remove(kRemote + "film.bin");
}

TEST(Web, FoldersAreMadeAndDeleted) {
    EXPECT_EQ(Change("mkdir", "/new").status, 200);
    EXPECT_TRUE(fs::is_directory("/srv/remote/new"));
    EXPECT_EQ(Change("mkdir", "/new").status, 409);
    EXPECT_EQ(Change("delete", "/new").status, 200);
    EXPECT_FALSE(fs::exists("/srv/remote/new"));
    EXPECT_EQ(Change("delete", "/new").status, 404);
}

TEST(Web, FilesAreRenamedAndTakeNobodysPlace) {
    ASSERT_EQ(Upload("/old.txt", "renamed", "7").status, 200);
    const Answer renamed = Change("rename", "/old.txt", ",\"name\":\"young.txt\"");
    EXPECT_EQ(renamed.status, 200) << renamed.body;
    EXPECT_EQ(machine::Read("/srv/remote/young.txt"), "renamed");
    EXPECT_FALSE(fs::exists("/srv/remote/old.txt"));
    EXPECT_EQ(Change("rename", "/young.txt", ",\"name\":\"hello.txt\"").status, 409);
    EXPECT_EQ(machine::Read("/srv/remote/hello.txt"), "hello from the remote side\n");
    EXPECT_EQ(Change("rename", "/none.txt", ",\"name\":\"x\"").status, 404);
    EXPECT_EQ(Change("delete", "/young.txt").status, 200);
    EXPECT_FALSE(fs::exists("/srv/remote/young.txt"));
}

TEST(Web, AFullFolderIsDeletedOnlyWhenThatIsMeant) {
    Must(
        "mkdir -p /srv/remote/full/deep; echo x >/srv/remote/full/deep/file; "
        "chown -R remo: /srv/remote/full");
    ASSERT_TRUE(Eventually([] { return Ask(kAmyIs, At("list", "/full/deep")).status == 200; }));
    EXPECT_EQ(Change("delete", "/full").status, 409);
    EXPECT_TRUE(fs::exists("/srv/remote/full/deep/file"));
    EXPECT_EQ(Change("delete", "/full", ",\"recursive\":true").status, 200);
    EXPECT_FALSE(fs::exists("/srv/remote/full"));
}

TEST(Web, PathsThatLeadElsewhereAreRefused) {
    for (const char* path : {"/..", "/../etc", "/docs/../../etc", "/docs/..", "etc", "", "//etc",
                             "/docs//x", "/.", "/docs/"}) {
        EXPECT_EQ(Ask(kAmyIs, At("list", path)).status, 422) << path;
        EXPECT_EQ(Ask(kAmyIs, At("download", path)).status, 422) << path;
        EXPECT_EQ(Upload(path, "x", "1").status, 422) << path;
    }
    EXPECT_EQ(Change("mkdir", "/" + std::string(255, 'n')).status, 200);
    EXPECT_EQ(Change("delete", "/" + std::string(255, 'n')).status, 200);
    EXPECT_EQ(Change("mkdir", "/" + std::string(256, 'n')).status, 422);
    EXPECT_EQ(Change("rename", "/docs", ",\"name\":\"../docs\"").status, 422);
    EXPECT_EQ(Change("delete", "/").status, 422);
}

TEST(Web, RequestsOfOtherSitesChangeNothing) {
    const char* const foreign[] = {
        "-u amy:a",
        "-u amy:a -H 'X-Zyrovfs-Request: 1'",
        "-u amy:a -H 'Origin: http://127.0.0.1:8090'",
        "-u amy:a -H 'X-Zyrovfs-Request: 1' -H 'Origin: http://evil.example'",
        "-u amy:a -H 'X-Zyrovfs-Request: 1' -H 'Origin: https://127.0.0.1:8090'",
        "-u amy:a -H 'X-Zyrovfs-Request: 1' -H 'Origin: http://127.0.0.1:8091'",
        "-u amy:a -H 'X-Zyrovfs-Request: 1' -H 'Origin: null'",
    };
    for (const char* headers : foreign) {
        EXPECT_EQ(Change("mkdir", "/evil", "", headers).status, 403) << headers;
        EXPECT_EQ(Change("delete", "/hello.txt", "", headers).status, 403) << headers;
        EXPECT_EQ(Change("rename", "/docs", ",\"name\":\"x\"", headers).status, 403) << headers;
        EXPECT_EQ(Upload("/evil.txt", "x", "1", headers).status, 403) << headers;
    }
    for (const char* action : {"mkdir", "delete", "rename", "upload"}) {
        EXPECT_EQ(Ask(kAmyIs, At(action, "/hello.txt")).status, 405) << action;
    }
    EXPECT_TRUE(fs::exists("/srv/remote/hello.txt"));
    EXPECT_FALSE(fs::exists("/srv/remote/evil"));
    EXPECT_FALSE(fs::exists("/srv/remote/evil.txt"));
}

TEST(Web, WhatIsNoRequestIsRefused) {
    EXPECT_EQ(Ask(kAmyIs, std::string(kSite) + "/files/api/nothing").status, 404);
    EXPECT_EQ(Ask(kAmyIs, std::string(kSite) + "/files/api/list").status, 400);
    EXPECT_EQ(Ask(kAmyIs, At("list", "/") + "&x=%00").status, 400);
    EXPECT_EQ(Ask(kOurs + " --data '[1]'", std::string(kSite) + "/files/api/mkdir").status, 400);
    EXPECT_EQ(Ask(kOurs + " --data '{}'", std::string(kSite) + "/files/api/mkdir").status, 400);
    EXPECT_EQ(Ask(kOurs + " --data 'x'", At("upload", "/x")).status, 400);
    EXPECT_EQ(Ask(kOurs + " -H 'Content-Type: multipart/form-data; boundary=B' --data 'x'",
                  At("upload", "/x"))
                  .status,
              400);
    EXPECT_FALSE(fs::exists("/srv/remote/x"));
}

TEST(Web, WhomThePolicyShutsOutIsToldSo) {
    Must(BuildDir() + "/tools/zyrovfs/zyrovfs policy set --type admin");
    const Answer answer = Ask("-u ben:b", std::string(kSite) + "/files/api/connections");
    Must(BuildDir() + "/tools/zyrovfs/zyrovfs policy set --type all");
    EXPECT_EQ(answer.status, 403);
    EXPECT_THAT(answer.body, HasSubstr("The administrator has not allowed you"));
}

}  // namespace
