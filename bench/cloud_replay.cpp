#include "cloud_replay.h"

#include <arpa/inet.h>
#include <json/reader.h>
#include <netinet/in.h>
#include <netinet/tcp.h>
#include <poll.h>
#include <strings.h>
#include <sys/socket.h>
#include <unistd.h>

#include <cerrno>
#include <cstdio>
#include <cstdlib>
#include <memory>
#include <utility>
#include <vector>

namespace bench {
namespace {

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

size_t BodySize(const std::string& head) {
    const char* at = strcasestr(head.c_str(), "\r\nContent-Length:");
    return at == nullptr ? 0 : strtoul(at + 17, nullptr, 10);
}

}  // namespace

bool Ask(CURL* curl, const std::string& host, const Exchange& what, std::string& out) {
    out.clear();
    curl_easy_setopt(curl, CURLOPT_URL, (host + what.target).c_str());
    curl_easy_setopt(curl, CURLOPT_WRITEFUNCTION, Append);
    curl_easy_setopt(curl, CURLOPT_WRITEDATA, &out);
    if (what.method == "POST") {
        curl_easy_setopt(curl, CURLOPT_POSTFIELDSIZE, static_cast<long>(what.body.size()));
        curl_easy_setopt(curl, CURLOPT_COPYPOSTFIELDS, what.body.c_str());
    }
    return curl_easy_perform(curl) == CURLE_OK;
}

Replay::Replay(std::string upstream, const std::string& token)
    : upstream_(std::move(upstream)),
      authorization_(curl_slist_append(curl_slist_append(nullptr, "Content-Type: application/json"),
                                       ("Authorization: Bearer " + token).c_str())),
      listener_(socket(AF_INET, SOCK_STREAM | SOCK_CLOEXEC, 0)) {
    sockaddr_in address{};
    address.sin_family = AF_INET;
    address.sin_addr.s_addr = htonl(INADDR_LOOPBACK);
    socklen_t length = sizeof address;
    auto* where = reinterpret_cast<sockaddr*>(&address);
    Check(bind(listener_, where, length) == 0 && listen(listener_, 8) == 0, "listen");
    Check(getsockname(listener_, where, &length) == 0, "getsockname");
    port_ = ntohs(address.sin_port);
    thread_ = std::thread([this] { Serve(); });
}

Replay::~Replay() {
    shutdown(listener_, SHUT_RDWR);
    thread_.join();
    close(listener_);
    curl_slist_free_all(authorization_);
}

void Replay::Serve() {
    std::vector<Connection> open;
    for (;;) {
        std::vector<pollfd> waiting{{listener_, POLLIN, 0}};
        for (const Connection& each : open) {
            waiting.push_back({each.fd, POLLIN, 0});
        }
        if (poll(waiting.data(), waiting.size(), -1) < 0 && errno == EINTR) {
            continue;
        }
        for (size_t i = open.size(); i > 0; --i) {
            if (waiting[i].revents != 0 && !Converse(open[i - 1])) {
                close(open[i - 1].fd);
                open.erase(open.begin() + static_cast<std::ptrdiff_t>(i - 1));
            }
        }
        if (waiting[0].revents == 0) {
            continue;
        }
        const int fd = accept(listener_, nullptr, nullptr);
        if (fd < 0) {
            break;
        }
        const int on = 1;
        setsockopt(fd, IPPROTO_TCP, TCP_NODELAY, &on, sizeof on);
        open.push_back({fd, ""});
    }
    for (const Connection& each : open) {
        close(each.fd);
    }
}

bool Replay::Converse(Connection& connection) {
    char buffer[4096];
    const ssize_t n = read(connection.fd, buffer, sizeof buffer);
    if (n <= 0) {
        return false;
    }
    std::string& request = connection.request;
    request.append(buffer, static_cast<size_t>(n));
    const size_t end = request.find("\r\n\r\n");
    if (end == std::string::npos ||
        request.size() - end - 4 < BodySize(request.substr(0, end + 2))) {
        return true;
    }
    const std::string& body =
        Answer(request.substr(0, request.find(" HTTP/")), request.substr(end + 4));
    request.clear();
    return SendAll(connection.fd,
                   "HTTP/1.1 200 OK\r\nContent-Type: application/json\r\nContent-Length: " +
                       std::to_string(body.size()) + "\r\n\r\n") &&
           SendAll(connection.fd, body);
}

const std::string& Replay::Answer(const std::string& request_line, const std::string& body) {
    const Exchange*& known = known_[request_line + "\n" + body];
    if (known == nullptr) {
        const size_t blank = request_line.find(' ');
        Exchange exchange{request_line.substr(0, blank), request_line.substr(blank + 1), body, ""};
        CURL* curl = curl_easy_init();
        curl_easy_setopt(curl, CURLOPT_HTTPHEADER, authorization_);
        curl_easy_setopt(curl, CURLOPT_FAILONERROR, 1L);
        Check(Ask(curl, upstream_, exchange, exchange.answer), request_line.c_str());
        curl_easy_cleanup(curl);
        exchanges_.push_back(std::move(exchange));
        known = &exchanges_.back();
    }
    return known->answer;
}

bool TransferAndParse(const Replay& replay) {
    const std::unique_ptr<CURL, void (*)(CURL*)> curl(curl_easy_init(), curl_easy_cleanup);
    Json::CharReaderBuilder rules;
    rules["collectComments"] = false;
    std::string body;
    std::vector<Json::Value> pages;
    for (const Exchange& exchange : replay.Exchanges()) {
        Json::Value page;
        const std::unique_ptr<Json::CharReader> reader(rules.newCharReader());
        if (!Ask(curl.get(), replay.Url(), exchange, body) ||
            !reader->parse(body.data(), body.data() + body.size(), &page, nullptr) ||
            body.size() != exchange.answer.size()) {
            return false;
        }
        pages.push_back(std::move(page));
    }
    return !pages.empty();
}

RecordedListing::RecordedListing(const Service& service, unsigned items)
    : service_(service), items_(items) {
    const Simulated simulated(service);
    simulated.amy->AddMany(simulated.amy->Root(), items, 1);
    const Access access = simulated.Grant();
    replay_ = std::make_unique<Replay>(access.hosts.at("api"), access.token);
    Json::Value out;
    const auto driver = MakeDriver();
    Check(driver != nullptr && List(*driver, out), service.name);
}

std::unique_ptr<ZYROCloud::Cloud> RecordedListing::MakeDriver() const {
    Access access{{}, "token", "account"};
    for (const auto& [entry, use] : service_.hosts) {
        access.hosts[use] = replay_->Url();
    }
    return bench::MakeDriver(service_, access);
}

bool RecordedListing::List(ZYROCloud::Cloud& driver, Json::Value& out) const {
    return driver.ListFolder(service_.root, service_.listing, out) && out.size() == items_;
}

}  // namespace bench
