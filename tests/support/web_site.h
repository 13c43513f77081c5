/** The web layer behind lighttpd, as a browser of a logged-in user sees it. */
#ifndef ZYROVFS_TESTS_WEB_SITE_H
#define ZYROVFS_TESTS_WEB_SITE_H

#include <gtest/gtest.h>
#include <json/reader.h>
#include <json/value.h>
#include <json/writer.h>
#include <sys/stat.h>

#include <filesystem>
#include <fstream>
#include <string>
#include <vector>

#include "support/locations.h"
#include "support/machine.h"

namespace web_site {

using machine::Eventually;
using machine::Must;

inline constexpr const char* kSite = "http://127.0.0.1:8090";
inline constexpr const char* kNoLogin = "http://127.0.0.1:8091";
inline constexpr unsigned kBen = 4002;

/** lighttpd with its own log-in on one port, and with none on the other. */
inline void StartWebServer() {
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
alias.url = ("/files/api" => "/run/web/zyrovfs-web")
$HTTP["url"] =~ "^/files/api" { cgi.assign = ("" => "") }
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
inline Answer Ask(const std::string& arguments, const std::string& address) {
    Answer answer;
    const std::string status = Must("curl -s -D /run/head -o /run/body -w '%{http_code}' " +
                                    arguments + " '" + address + "'");
    answer.status = std::stoi(status);
    answer.head = machine::Read("/run/head");
    answer.body = machine::Read("/run/body");
    return answer;
}

inline std::string Escaped(const std::string& text) {
    std::string escaped;
    char part[4];
    for (const char c : text) {
        snprintf(part, sizeof part, "%%%02X", static_cast<unsigned char>(c));
        escaped += part;
    }
    return escaped;
}

/** Address of an action on an item of a connection. */
inline std::string At(const std::string& action, const std::string& connection,
                      const std::string& path) {
    return std::string(kSite) + "/files/api/" + action + "?connection=" + Escaped(connection) +
           "&path=" + Escaped(path);
}

inline std::string Api(const std::string& action) {
    return std::string(kSite) + "/files/api/" + action;
}

inline constexpr const char* kAmyIs = "-u amy:a";
/** What the page's own script sends with whatever changes something. */
inline const std::string kFromPage =
    " -H 'X-Zyrovfs-Request: 1' -H 'Origin: http://127.0.0.1:8090'";
inline const std::string kOurs = kAmyIs + kFromPage;
inline const std::string kBens = "-u ben:b" + kFromPage;

/** A request that changes something. */
inline Answer Post(const std::string& action, const Json::Value& body,
                   const std::string& headers = kOurs) {
    std::ofstream("/run/request.json") << body;
    return Ask(headers + " --data-binary @/run/request.json", Api(action));
}

inline Json::Value Item(const std::string& connection, const std::string& path) {
    Json::Value body;
    body["connection"] = connection;
    body["path"] = path;
    return body;
}

inline std::vector<std::string> NamesAt(const std::string& connection, const std::string& path) {
    std::vector<std::string> names;
    const Json::Value answer = Ask(kAmyIs, At("list", connection, path)).Json();
    for (const Json::Value& entry : answer["entries"]) {
        names.push_back(entry["name"].asString());
    }
    return names;
}

}  // namespace web_site

#endif
