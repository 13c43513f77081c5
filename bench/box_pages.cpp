#include "box_pages.h"

#include <arpa/inet.h>
#include <json/value.h>
#include <netinet/in.h>
#include <netinet/tcp.h>
#include <sys/socket.h>
#include <unistd.h>

#include <cstdio>
#include <cstdlib>
#include <filesystem>
#include <fstream>

#include "support/cloudsim/cloudsim.h"
#include "zyrovfs/cloud_utils.h"

namespace bench {
namespace {

constexpr const char* kFields = "id,name,size,created_at,modified_at,parent,owned_by";
constexpr const char* kServiceConfig = "/usr/zyro/etc/zyrovfs/cloud.conf";

size_t Append(char* data, size_t size, size_t count, std::string* out) {
    out->append(data, size * count);
    return size * count;
}

void Check(bool ok, const char* what) {
    if (!ok) {
        std::perror(what);
        std::exit(1);
    }
}

bool SendAll(int fd, const std::string& bytes) {
    for (size_t sent = 0; sent < bytes.size();) {
        const ssize_t n = send(fd, bytes.data() + sent, bytes.size() - sent, MSG_NOSIGNAL);
        if (n <= 0) {
            return false;
        }
        sent += static_cast<size_t>(n);
    }
    return true;
}

std::string Query(unsigned offset) {
    return std::string("?fields=") + kFields + "&limit=" + std::to_string(kPageSize) +
           "&offset=" + std::to_string(offset);
}

}  // namespace

bool Fetch(CURL* curl, const std::string& url, std::string& out) {
    out.clear();
    curl_easy_setopt(curl, CURLOPT_URL, url.c_str());
    curl_easy_setopt(curl, CURLOPT_WRITEFUNCTION, Append);
    curl_easy_setopt(curl, CURLOPT_WRITEDATA, &out);
    return curl_easy_perform(curl) == CURLE_OK;
}

Pages RecordPages(unsigned items) {
    cloudsim::BoxOptions options;
    options.max_offset = items;
    cloudsim::BoxService service(options);
    cloudsim::Account& account = service.AddAccount("amy@example.com", "Amy Doe");
    account.AddMany(account.Root(), items, 1);
    CURL* curl = curl_easy_init();
    curl_slist* headers = curl_slist_append(
        nullptr, ("Authorization: Bearer " + account.IssueTokens().access_token).c_str());
    curl_easy_setopt(curl, CURLOPT_HTTPHEADER, headers);
    Pages pages;
    for (unsigned offset = 0; offset < items; offset += kPageSize) {
        Check(
            Fetch(curl, service.ApiHost() + "/2.0/folders/0/items" + Query(offset), pages[offset]),
            "record");
    }
    curl_slist_free_all(headers);
    curl_easy_cleanup(curl);
    return pages;
}

PageServer::PageServer(Pages pages)
    : pages_(std::move(pages)), listener_(socket(AF_INET, SOCK_STREAM | SOCK_CLOEXEC, 0)) {
    sockaddr_in address{};
    address.sin_family = AF_INET;
    address.sin_addr.s_addr = htonl(INADDR_LOOPBACK);
    socklen_t length = sizeof address;
    auto* where = reinterpret_cast<sockaddr*>(&address);
    Check(bind(listener_, where, length) == 0 && listen(listener_, 8) == 0, "listen");
    Check(getsockname(listener_, where, &length) == 0, "getsockname");
    port_ = ntohs(address.sin_port);
    thread_ = std::thread([this] { Serve(); });

    std::filesystem::create_directories("/usr/zyro/etc/zyrovfs");
    const std::string host = "http://127.0.0.1:" + std::to_string(port_);
    std::ofstream(kServiceConfig) << R"({"hosts":{"BoxApiHost":")" << host
                                  << R"(","BoxUploadHost":")" << host << R"("}})";
    std::filesystem::permissions(kServiceConfig, std::filesystem::perms(0640));
}

PageServer::~PageServer() {
    shutdown(listener_, SHUT_RDWR);
    thread_.join();
    close(listener_);
}

std::string PageServer::Url(unsigned offset) const {
    return "http://127.0.0.1:" + std::to_string(port_) + "/2.0/folders/0/items" + Query(offset);
}

void PageServer::Serve() {
    for (int fd = accept(listener_, nullptr, nullptr); fd >= 0;
         fd = accept(listener_, nullptr, nullptr)) {
        const int on = 1;
        setsockopt(fd, IPPROTO_TCP, TCP_NODELAY, &on, sizeof on);
        Converse(fd);
        close(fd);
    }
}

void PageServer::Converse(int fd) const {
    std::string request;
    char buffer[4096];
    for (ssize_t n = read(fd, buffer, sizeof buffer); n > 0; n = read(fd, buffer, sizeof buffer)) {
        request.append(buffer, static_cast<size_t>(n));
        if (request.find("\r\n\r\n") == std::string::npos) {
            continue;
        }
        const size_t at = request.find("offset=");
        const auto page = pages_.find(
            at == std::string::npos ? ~0U : static_cast<unsigned>(std::atoi(&request[at + 7])));
        const std::string body = page == pages_.end() ? "{}" : page->second;
        if (!SendAll(fd, "HTTP/1.1 200 OK\r\nContent-Type: application/json\r\nContent-Length: " +
                             std::to_string(body.size()) + "\r\n\r\n" + body)) {
            return;
        }
        request.clear();
    }
}

std::unique_ptr<ZYROCloud::Cloud> MakeBox() {
    Json::Value profile;
    profile["access_token"] = "token";
    profile["server_id"] = "box://amy@example.com";
    return std::unique_ptr<ZYROCloud::Cloud>(
        ZYROCloud::Utils::CreateCloudByConfig(ZYROCloud::CLOUD_TYPE_BOX, 4001, profile));
}

}  // namespace bench
