// The web layer behind lighttpd, as a browser of a logged-in user sees it: the program is started
// by the web server's own account and acts for the user, on a real WebDAV server and the user's
// tree.
#include <gmock/gmock.h>
#include <json/reader.h>
#include <sys/stat.h>

#include <filesystem>

#include "support/locations.h"
#include "support/vfs_cloud_remote.h"

namespace {

using namespace remote_side;
using machine::Eventually;
using machine::Must;
using testing::HasSubstr;
using testing::Not;
using testing::UnorderedElementsAre;
namespace fs = std::filesystem;

constexpr const char* kSite = "http://127.0.0.1:8090";
constexpr const char* kNoLogin = "http://127.0.0.1:8091";
constexpr unsigned kBen = 4002;

/** lighttpd with its own log-in on one port, and with none on the other. */
void StartWebServer() {
    Must("mkdir -p /run/web/root");
    Must("cp " + BuildDir() + "/web/zyrovfs-web /run/web/zyrovfs-web");
    Must("chown root:www-data /run/web/zyrovfs-web; chmod 4750 /run/web/zyrovfs-web");
    Must("printf 'amy:a\\nben:b\\ndaemon:d\\nroot:r\\nnobody-here:n\\n' >/run/web/users");
    std::ofstream("/run/web/lighttpd.conf") << R"(
server.modules = ("mod_auth", "mod_authn_file", "mod_alias", "mod_cgi")
server.document-root = "/run/web/root"
server.bind = "127.0.0.1"
server.port = 8090
server.username = "www-data"
server.groupname = "www-data"
server.errorlog = "/run/web/error.log"
server.stream-request-body = 2
server.stream-response-body = 2
alias.url = ("/files" => "/run/web/zyrovfs-web")
$HTTP["url"] =~ "^/files" { cgi.assign = ("" => "") }
auth.backend = "plain"
auth.backend.plain.userfile = "/run/web/users"
$SERVER["socket"] == "127.0.0.1:8091" { }
else $SERVER["socket"] == "127.0.0.1:8090" {
  auth.require = ("/" => ("method" => "basic", "realm" => "box", "require" => "valid-user"))
}
)";
    Must(
        "chown -R www-data /run/web/root /run/web/users; touch /run/web/error.log; "
        "chown www-data /run/web/error.log");
    Must("lighttpd -f /run/web/lighttpd.conf");
    ASSERT_TRUE(Eventually(
        [] { return machine::Run(std::string("curl -s -o /dev/null ") + kSite).status == 0; }));
}

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

struct Answer {
    int status = 0;
    std::string head, body;

    Json::Value Json() const {
        Json::Value value;
        Json::Reader().parse(body, value);
        return value;
    }
};

/** One request by curl; `arguments` stand in front of the address. */
Answer Ask(const std::string& arguments, const std::string& address) {
    Answer answer;
    const std::string status = Must("curl -s -D /run/head -o /run/body -w '%{http_code}' " +
                                    arguments + " '" + address + "'");
    answer.status = std::stoi(status);
    answer.head = machine::Read("/run/head");
    answer.body = machine::Read("/run/body");
    return answer;
}

std::string Escaped(const std::string& text) {
    std::string escaped;
    char part[4];
    for (const char c : text) {
        snprintf(part, sizeof part, "%%%02X", static_cast<unsigned char>(c));
        escaped += part;
    }
    return escaped;
}

std::string At(const std::string& action, const std::string& path) {
    return std::string(kSite) + "/files/api/" + action + "?connection=" + Escaped(dav_id) +
           "&path=" + Escaped(path);
}

constexpr const char* kAmyIs = "-u amy:a";
/** What the page's own script sends with whatever changes something. */
const std::string kOurs = "-u amy:a -H 'X-Zyrovfs-Request: 1' -H 'Origin: http://127.0.0.1:8090'";

Answer Change(const std::string& action, const std::string& path, const std::string& more = "",
              const std::string& headers = kOurs) {
    std::ofstream("/run/request.json")
        << "{\"connection\":\"" << dav_id << "\",\"path\":\"" << path << "\"" << more << "}";
    return Ask(headers + " --data-binary @/run/request.json",
               std::string(kSite) + "/files/api/" + action);
}

Answer Upload(const std::string& path, const std::string& bytes, const std::string& size = "",
              const std::string& headers = kOurs) {
    std::ofstream("/run/source", std::ios::binary) << bytes;
    return Ask(headers + " -F 'file=@/run/source'",
               At("upload", path) + (size.empty() ? "" : "&size=" + size));
}

std::vector<std::string> NamesAt(const std::string& path) {
    std::vector<std::string> names;
    const Json::Value answer = Ask(kAmyIs, At("list", path)).Json();
    for (const Json::Value& entry : answer["entries"]) {
        names.push_back(entry["name"].asString());
    }
    return names;
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
    const std::string as_ben = "-u ben:b" + kOurs.substr(std::string(kAmyIs).size());
    for (const char* action : {"mkdir", "rename", "delete"}) {
        EXPECT_EQ(Change(action, "/hello.txt", ",\"name\":\"x\"", as_ben).status, 404) << action;
    }
    EXPECT_EQ(Upload("/ben.txt", "ben's", "5", as_ben).status, 404);
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
    // lighttpd moves no folder whose address has no slash at its end.
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
