// bench_web [--rounds N] [--size MIB] WEB_PROGRAM CGI_PROGRAM: a file through lighttpd and the web
// layer to a simulated cloud and back, against a CGI that only counts (or makes) the bytes and one
// transfer by libcurl alone: CPU of the CGI's side, wall, and the web layer's peak memory.
#include <curl/curl.h>
#include <fcntl.h>
#include <sys/resource.h>
#include <sys/stat.h>
#include <sys/wait.h>
#include <unistd.h>
#include <zyrovfs/server.h>

#include <algorithm>
#include <array>
#include <chrono>
#include <cstdlib>
#include <fstream>
#include <functional>

#include "cloud_bare_upload.h"
#include "service_process.h"

namespace {

using namespace ZYROVFS;
using bench::Fail;

constexpr unsigned kUid = 4001;
constexpr long long kMiB = 1048576;
constexpr const char* kSource = "/dev/shm/web_source";
constexpr const char* kFolder = "/run/web-bench";
const std::string kId = "dropbox://amy@example.com";

void Run(const std::string& command) {
    if (std::system((command + " >/dev/null").c_str()) != 0) {
        Fail(command);
    }
}

struct Sample {
    double wall = 0, cpu = 0;
    long peak = 0;  ///< KiB
};

double Now() {
    return std::chrono::duration<double>(std::chrono::steady_clock::now().time_since_epoch())
        .count();
}

/** A request by curl; the CGI's side writes down what it took. */
Sample Request(const std::string& arguments) {
    const std::string usage = std::string(kFolder) + "/usage";
    unlink(usage.c_str());
    Sample sample;
    const double start = Now();
    Run("curl -sf -u amy:a -H 'X-Zyrovfs-Request: 1' -H 'Origin: http://127.0.0.1:8090' "
        "-o /dev/null " +
        arguments);
    sample.wall = Now() - start;
    for (int i = 0; i < 500; ++i) {
        if (std::ifstream(usage) >> sample.cpu >> sample.peak) {
            return sample;
        }
        usleep(10000);
    }
    Fail("nothing was weighed");
}

Sample InChild(const std::function<bool()>& work) {
    Sample sample;
    const double start = Now();
    const pid_t child = fork();
    if (child == 0) {
        _exit(work() ? 0 : 1);
    }
    int status = 0;
    rusage usage{};
    wait4(child, &status, 0, &usage);
    if (status != 0) {
        Fail("bare libcurl");
    }
    const auto seconds = [](const timeval& time) {
        return static_cast<double>(time.tv_sec) + static_cast<double>(time.tv_usec) / 1e6;
    };
    sample.wall = Now() - start;
    sample.cpu = seconds(usage.ru_utime) + seconds(usage.ru_stime);
    return sample;
}

size_t Drop(char*, size_t size, size_t count, void*) {
    return size * count;
}

bool DownloadBare(const bench::Access& access, const std::string& name) {
    CURL* curl = curl_easy_init();
    curl_slist* headers =
        curl_slist_append(nullptr, ("Authorization: Bearer " + access.token).c_str());
    headers = curl_slist_append(headers, ("Dropbox-API-Arg: {\"path\":\"/" + name + "\"}").c_str());
    headers = curl_slist_append(headers, "Content-Type:");
    const std::string url = access.hosts.at("content") + "/2/files/download";
    curl_easy_setopt(curl, CURLOPT_URL, url.c_str());
    curl_easy_setopt(curl, CURLOPT_HTTPHEADER, headers);
    curl_easy_setopt(curl, CURLOPT_POSTFIELDS, "");
    curl_easy_setopt(curl, CURLOPT_WRITEFUNCTION, Drop);
    curl_easy_setopt(curl, CURLOPT_FAILONERROR, 1L);
    const bool done = curl_easy_perform(curl) == CURLE_OK;
    curl_slist_free_all(headers);
    curl_easy_cleanup(curl);
    return done;
}

std::string Sealed(const std::string& text) {
    std::array<char, 4096> room{};
    if (Server::SzEncrypt(text.c_str(), room.data(), room.size()) == 0) {
        Fail("enciphering");
    }
    return room.data();
}

/** A user with a connection to the service, and the place where the account would be mounted. */
void Connect(const bench::Service& service, const bench::Access& access, long long mib) {
    Run("useradd --create-home --uid 4001 --gid 100 --groups sudo amy && mkdir -p "
        "/run/web-bench/tree && "
        "truncate -s " +
        std::to_string(mib) + "M /run/web-bench/tree/down.bin");
    bench::SetHosts(service, access.hosts);
    Json::Value record;
    for (const auto& [key, value] : {std::pair<const char*, std::string>{"protocol", "dropbox"},
                                     {"alias", "bench"},
                                     {"email", "amy@example.com"},
                                     {"client_id", "client"},
                                     {"refresh_token", Sealed("none")},
                                     {"access_token", Sealed(access.token)},
                                     {"path", "/run/web-bench/tree"},
                                     {"account_info", "{\"id\":\"" + access.account + "\"}"},
                                     {"expire_time", std::to_string(time(nullptr) + 86400)}}) {
        record[key] = value;
    }
    if (!Server::CfgAppend(kUid, Server::VFS_CONFIG_CONNECT, kId.c_str(), record)) {
        Fail("the connection");
    }
}

void StartServer(const std::string& web, const std::string& cgi) {
    Run("cd /run/web-bench && cp " + web + " zyrovfs-web && cp " + cgi + " bare && cp " + cgi +
        " weigh-bare && cp " + cgi +
        " weigh && chown root:www-data zyrovfs-web && "
        "chmod 4750 zyrovfs-web && chown www-data . && echo amy:a >users");
    std::ofstream("/run/web-bench/lighttpd.conf") << R"(
server.modules = ("mod_auth", "mod_authn_file", "mod_alias", "mod_cgi")
server.document-root = "/run/web-bench/tree"
server.bind = "127.0.0.1"
server.port = 8090
server.username = "www-data"
server.groupname = "www-data"
server.stream-request-body = 2
server.stream-response-body = 2
alias.url = ("/files/api" => "/run/web-bench/weigh", "/bare" => "/run/web-bench/weigh-bare")
$HTTP["url"] =~ "^/(files/api|bare)" { cgi.assign = ("" => "") }
auth.backend = "plain"
auth.backend.plain.userfile = "/run/web-bench/users"
auth.require = ("/" => ("method" => "basic", "realm" => "box", "require" => "valid-user"))
)";
    Run("chown www-data /run/web-bench/users && lighttpd -f /run/web-bench/lighttpd.conf");
}

double Median(std::vector<double> values) {
    std::sort(values.begin(), values.end());
    return values[values.size() / 2];
}

void Compare(const char* what, int rounds, const std::function<Sample()>& ours,
             const std::function<Sample()>& cgi, const std::function<Sample()>& libcurl) {
    std::vector<double> cpu;
    std::vector<double> wall;
    long peak = 0;
    for (int i = 0; i < rounds; ++i) {
        const Sample a = ours();
        const Sample b = cgi();
        const Sample c = libcurl();
        cpu.push_back(a.cpu / (b.cpu + c.cpu));
        wall.push_back(a.wall / std::max(b.wall, c.wall));
        peak = std::max(peak, a.peak);
        std::printf(
            "  %s: web layer %.2f s wall %.2f s cpu; CGI that counts %.2f and %.2f, "
            "libcurl alone %.2f and %.2f\n",
            what, a.wall, a.cpu, b.wall, b.cpu, c.wall, c.cpu);
    }
    std::printf("%s: cpu %.2f of both together, wall %.2f of the slower, peak memory %.1f MiB\n",
                what, Median(cpu), Median(wall), static_cast<double>(peak) / 1024);
    std::fflush(stdout);
}

}  // namespace

int main(int argc, char** argv) {
    int rounds = 5;
    long long mib = 1024;
    std::vector<std::string> words;
    for (int i = 1; i < argc; ++i) {
        const std::string word = argv[i];
        if (word == "--rounds" && i + 1 < argc) {
            rounds = static_cast<int>(std::max(1L, std::strtol(argv[++i], nullptr, 10)));
        } else if (word == "--size" && i + 1 < argc) {
            mib = std::max(1LL, std::strtoll(argv[++i], nullptr, 10));
        } else {
            words.push_back(word);
        }
    }
    if (words.size() != 2) {
        Fail("bench_web WEB_PROGRAM CGI_PROGRAM");
    }
    const bench::Service& service = bench::FindService("dropbox");
    const long long size = mib * kMiB;
    const bench::ServiceProcess process(service, [&](cloudsim::Account& amy) {
        amy.AddPattern(amy.Root(), "down.bin", static_cast<uint64_t>(size));
    });
    const int fd = open(kSource, O_RDWR | O_CREAT | O_TRUNC | O_CLOEXEC, 0644);
    if (fd < 0 || posix_fallocate(fd, 0, size) != 0) {
        Fail(kSource);
    }
    Connect(service, process.access, mib);
    StartServer(words[0], words[1]);

    const std::string api = "'http://127.0.0.1:8090/files/api/";
    const std::string target = "?connection=dropbox%3A%2F%2Famy%40example.com&path=%2F";
    const auto upload_bare = [&] {
        const int source = open(kSource, O_RDONLY | O_CLOEXEC);
        return bench::UploadBare(service, process.access, "bare.bin", source, size);
    };
    Compare(
        "Upload", rounds,
        [&] {
            return Request("-F file=@" + std::string(kSource) + " " + api + "upload" + target +
                           "up.bin&size=" + std::to_string(size) + "'");
        },
        [&] { return Request("-F file=@" + std::string(kSource) + " http://127.0.0.1:8090/bare"); },
        [&] { return InChild(upload_bare); });
    Compare(
        "Download", rounds, [&] { return Request(api + "download" + target + "down.bin'"); },
        [&] { return Request("'http://127.0.0.1:8090/bare?" + std::to_string(size) + "'"); },
        [&] { return InChild([&] { return DownloadBare(process.access, "down.bin"); }); });
    close(fd);
    unlink(kSource);
    return 0;
}
