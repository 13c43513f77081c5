// The set-up files that are installed, on the web servers that they are for: log-in by PAM, the
// page with its policy, and bodies that are passed on as they come, with no file of anybody's in
// between.
#include <gmock/gmock.h>

#include <regex>

#include "support/vfs_cloud_remote.h"
#include "support/web_site.h"

namespace {

using namespace remote_side;
using namespace web_site;
using testing::AllOf;
using testing::HasSubstr;
using testing::Not;
namespace fs = std::filesystem;

constexpr const char* kLighttpd = "http://127.0.0.1:8092";
constexpr const char* kNginx = "http://127.0.0.1:8093";

std::string dav_id = "dav://remo@127.0.0.1:8080";

/** A set-up file with the places of this machine in it. */
std::string SetUpFile(const std::string& name) {
    std::string text = machine::Read(SourceDir() + "/packaging/web/" + name + ".conf.in");
    text = std::regex_replace(text, std::regex("@CMAKE_INSTALL_FULL_LIBEXECDIR@"), "/run/libexec");
    return std::regex_replace(text, std::regex("@CMAKE_INSTALL_FULL_DATADIR@"), "/run/share");
}

void Install() {
    Must("mkdir -p /run/libexec/zyrovfs /run/share/zyrovfs/web /run/servers && cp " + BuildDir() +
         "/web/zyrovfs-web /run/libexec/zyrovfs/");
    Must(
        "chown root:www-data /run/libexec/zyrovfs/zyrovfs-web; "
        "chmod 4750 /run/libexec/zyrovfs/zyrovfs-web");
    Must(
        "echo '<!DOCTYPE html><title>Files</title>' >/run/share/zyrovfs/web/index.html; "
        "echo 'export {}' >/run/share/zyrovfs/web/page.mjs");
    Must("cp " + SourceDir() + "/packaging/web/pam /etc/pam.d/zyrovfs-web");
    Must(
        "usermod -a -G shadow www-data; echo amy:amys-secret | chpasswd; "
        "echo ben:bens-secret | chpasswd");
}

void StartLighttpd() {
    std::ofstream("/run/servers/lighttpd.conf")
        << "server.document-root = \"/run/share\"\nserver.bind = \"127.0.0.1\"\n"
           "server.port = 8092\nserver.username = \"www-data\"\nserver.groupname = \"www-data\"\n"
           "server.errorlog = \"/run/servers/lighttpd.log\"\n"
        << SetUpFile("lighttpd");
    Must(
        "touch /run/servers/lighttpd.log; chown www-data /run/servers/lighttpd.log; "
        "lighttpd -f /run/servers/lighttpd.conf");
}

void StartNginx() {
    std::ofstream("/run/servers/nginx.conf")
        << "load_module modules/ngx_http_auth_pam_module.so;\nuser www-data;\nevents {}\n"
           "pid /run/servers/nginx.pid;\nerror_log /run/servers/nginx.log;\nhttp {\n"
           "access_log off;\nserver {\nlisten 127.0.0.1:8093;\n"
        << SetUpFile("nginx") << "}\n}\n";
    Must("setpriv --reuid=www-data --regid=www-data --clear-groups true");
    Must(
        "spawn-fcgi -s /run/zyrovfs-web.socket -M 0600 -u www-data -g www-data -U www-data "
        "-- /usr/sbin/fcgiwrap -f -c 8 >/dev/null 2>&1");
    Must("nginx -c /run/servers/nginx.conf >/dev/null 2>&1");
}

class Site : public testing::Environment {
    void SetUp() override {
        machine::AddUser("amy", kAmy);
        machine::AddUser("ben", kBen);
        machine::Remote(std::string("start ") + kPassword);
        ASSERT_EQ(machine::InProcess([] { return Connect(kDav).empty() ? 1 : 0; }), 0);
        Must(BuildDir() + "/tools/zyrovfs/zyrovfs policy set --type all");
        Install();
        StartLighttpd();
        StartNginx();
    }
};

const auto* const kSetUp = testing::AddGlobalTestEnvironment(new Site);

class WebServer : public testing::TestWithParam<const char*> {
  protected:
    static constexpr const char* kAmys = "-u amy:amys-secret";
    static std::string Site() { return GetParam(); }
    static std::string Page() {
        return std::string("-u amy:amys-secret -H 'X-Zyrovfs-Request: 1' -H 'Origin: ") + Site() +
               "'";
    }
    static std::string At(const std::string& action, const std::string& path) {
        return Site() + "/files/api/" + action + "?connection=" + Escaped(dav_id) +
               "&path=" + Escaped(path);
    }
    static Answer Upload(const std::string& name, const std::string& bytes) {
        std::ofstream("/run/source", std::ios::binary) << bytes;
        return Ask(Page() + " -F 'file=@/run/source'",
                   At("upload", "/" + name) + "&size=" + std::to_string(bytes.size()));
    }
};

TEST_P(WebServer, TheBoxesUsersLogInWithTheirPasswords) {
    for (const char* place : {"/files/", "/files/page.mjs", "/files/api/connections"}) {
        EXPECT_EQ(Ask("", Site() + place).status, 401) << place;
        EXPECT_EQ(Ask("-u amy:wrong", Site() + place).status, 401) << place;
        EXPECT_EQ(Ask("-u nobody-here:x", Site() + place).status, 401) << place;
        EXPECT_EQ(Ask(kAmys, Site() + place).status, 200) << place;
    }
    EXPECT_EQ(Ask(kAmys, Site() + "/files/api/connections").Json()["user"], "amy");
    const Answer ben = Ask("-u ben:bens-secret", Site() + "/files/api/connections");
    EXPECT_EQ(ben.Json()["connections"].size(), 0U);
    EXPECT_EQ(ben.Json()["user"], "ben");
}

TEST_P(WebServer, ThePageComesWithAPolicyThatLetsNoForeignScriptRun) {
    const Answer page = Ask(kAmys, Site() + "/files/");
    EXPECT_THAT(page.head, AllOf(HasSubstr("default-src 'none'; script-src 'self'"),
                                 HasSubstr("nosniff"), HasSubstr("text/html")));
    EXPECT_THAT(page.head, Not(HasSubstr("unsafe")));
    EXPECT_THAT(page.body, HasSubstr("<title>Files</title>"));
    EXPECT_THAT(Ask(kAmys, Site() + "/files/page.mjs").head, HasSubstr("text/javascript"));
    // The program's answers keep their own, which is stricter.
    EXPECT_THAT(Ask(kAmys, Site() + "/files/api/connections").head,
                AllOf(HasSubstr("sandbox"), Not(HasSubstr("script-src"))));
    EXPECT_NE(
        Ask(std::string(kAmys) + " --path-as-is", Site() + "/files/../libexec/zyrovfs/zyrovfs-web")
            .status,
        200);
}

TEST_P(WebServer, FilesGoUpAndDownAndInParts) {
    const std::string bytes = Noise(5 << 20);
    const Answer up = Upload("up.bin", bytes);
    EXPECT_EQ(up.status, 200) << up.body << machine::Read("/run/servers/nginx.log");
    EXPECT_TRUE(machine::Read(kRemote + "up.bin") == bytes);
    ASSERT_TRUE(Eventually([&] { return Ask(kAmys, At("download", "/up.bin")).status == 200; }));
    EXPECT_TRUE(Ask(kAmys, At("download", "/up.bin")).body == bytes);
    const Answer part = Ask(std::string(kAmys) + " -r 100-199", At("download", "/up.bin"));
    EXPECT_EQ(part.status, 206);
    EXPECT_TRUE(part.body == bytes.substr(100, 100));
    EXPECT_EQ(Ask(kAmys, At("zip", "/up.bin")).status, 200);
    EXPECT_EQ(machine::Run("unzip -t /run/body").status, 0);
    EXPECT_EQ(Ask(kAmys, At("list", "/none")).status, 404);
    fs::remove(kRemote + "up.bin");
}

TEST_P(WebServer, ABrokenArchiveIsBrokenForTheBrowser) {
    Must(
        "mkdir -p /srv/remote/lie; ln -sf ../hello.txt /srv/remote/lie/link; "
        "chown -Rh remo: /srv/remote/lie");
    ASSERT_TRUE(Eventually([&] { return Ask(kAmys, At("list", "/lie")).status == 200; }));
    EXPECT_NE(
        machine::Run("curl -s -o /run/body " + std::string(kAmys) + " '" + At("zip", "/lie") + "'")
            .status,
        0);
    fs::remove_all(kRemote + "lie");
}

TEST_P(WebServer, WithoutRoomInTmpAndVarFilesGoThrough) {
    // Where the box's own files lie is kept, and what is tested; every other place is full.
    Must("mkdir -p /run/build && mount --bind '" + BuildDir() + "' /run/build");
    Must(
        "mkdir -p /run/keep && cp -a /var/tmp/. /run/keep/ && mkdir -p /run/small && "
        "mount -t tmpfs -o size=1m tmpfs /run/small && mkdir -m 1777 /run/small/tmp && "
        "mount --bind /run/small/tmp /tmp");
    if (BuildDir().rfind("/tmp/", 0) == 0) {
        Must("mkdir -p '" + BuildDir() + "' && mount --bind /run/build '" + BuildDir() + "'");
    }
    Must("(dd if=/dev/zero of=/tmp/full bs=4k 2>/dev/null; true)");
    for (const char* place : {"/var/cache", "/var/lib/nginx", "/var/spool", "/var/log"}) {
        Must(std::string("mkdir -p ") + place + " && mount --bind /run/small/tmp " + place);
    }
    const std::string before = Must("ls -A /tmp");
    const std::string bytes = Noise(32 << 20);
    const Answer up = Upload("through.bin", bytes);
    EXPECT_EQ(up.status, 200) << up.body;
    EXPECT_TRUE(machine::Read(kRemote + "through.bin") == bytes);
    EXPECT_TRUE(
        Eventually([&] { return Ask(kAmys, At("download", "/through.bin")).status == 200; }));
    EXPECT_TRUE(Ask(kAmys, At("download", "/through.bin")).body == bytes);
    EXPECT_EQ(Must("ls -A /tmp"), before);
    Must(
        "umount -R /tmp && umount /run/build /var/cache /var/lib/nginx /var/spool /var/log; umount "
        "/run/small");
    fs::remove(kRemote + "through.bin");
}

INSTANTIATE_TEST_SUITE_P(Each, WebServer, testing::Values(kLighttpd, kNginx), [](const auto& row) {
    return row.param == kLighttpd ? "lighttpd" : "nginx";
});

}  // namespace
