#include "support/tls_server.h"

#include <arpa/inet.h>
#include <json/reader.h>
#include <json/writer.h>
#include <openssl/bio.h>
#include <openssl/evp.h>
#include <openssl/pem.h>
#include <openssl/ssl.h>
#include <signal.h>
#include <sys/mman.h>
#include <sys/prctl.h>
#include <sys/socket.h>
#include <sys/wait.h>
#include <unistd.h>

#include <algorithm>
#include <stdexcept>
#include <thread>

namespace tls {
namespace {

[[noreturn]] void Die(const std::string& step) {
    throw std::runtime_error("test server: " + step);
}

union Address {
    sockaddr any;
    sockaddr_in v4;
    sockaddr_in6 v6;
};

Address Loopback(int port, bool ipv6) {
    Address address{};
    if (ipv6) {
        address.v6.sin6_family = AF_INET6;
        address.v6.sin6_addr = in6addr_loopback;
        address.v6.sin6_port = htons(static_cast<uint16_t>(port));
    } else {
        address.v4.sin_family = AF_INET;
        address.v4.sin_addr.s_addr = htonl(INADDR_LOOPBACK);
        address.v4.sin_port = htons(static_cast<uint16_t>(port));
    }
    return address;
}

int Bind(int port, bool ipv6) {
    const Address address = Loopback(port, ipv6);
    const int fd = socket(address.any.sa_family, SOCK_STREAM | SOCK_CLOEXEC, 0);
    const int on = 1;
    setsockopt(fd, SOL_SOCKET, SO_REUSEADDR, &on, sizeof on);
    if (bind(fd, &address.any, ipv6 ? sizeof address.v6 : sizeof address.v4) != 0) {
        close(fd);
        Die("bind");
    }
    return fd;
}

/** It stands at the same place in the addresses of both families. */
int PortOf(int fd) {
    Address address{};
    socklen_t length = sizeof address;
    getsockname(fd, &address.any, &length);
    return ntohs(address.v4.sin_port);
}

SSL_CTX* NewContext(const Identity& identity) {
    SSL_CTX* context = SSL_CTX_new(TLS_server_method());
    BIO* chain = BIO_new_mem_buf(identity.certificate.data(), -1);
    X509* certificate = PEM_read_bio_X509(chain, nullptr, nullptr, nullptr);
    SSL_CTX_use_certificate(context, certificate);
    X509_free(certificate);
    while ((certificate = PEM_read_bio_X509(chain, nullptr, nullptr, nullptr)) != nullptr) {
        SSL_CTX_add_extra_chain_cert(context, certificate);
    }
    BIO_free(chain);
    BIO* bio = BIO_new_mem_buf(identity.key.data(), -1);
    EVP_PKEY* key = PEM_read_bio_PrivateKey(bio, nullptr, nullptr, nullptr);
    const bool fits = SSL_CTX_use_PrivateKey(context, key) == 1;
    EVP_PKEY_free(key);
    BIO_free(bio);
    if (!fits) {
        Die("key and certificate do not fit");
    }
    return context;
}

/** One connection, with or without TLS. */
class Stream {
  public:
    Stream(int fd, SSL_CTX* context) : fd_(fd), ssl_(context ? SSL_new(context) : nullptr) {
        if (ssl_ != nullptr) {
            SSL_set_fd(ssl_, fd_);
        }
    }
    Stream(const Stream&) = delete;
    Stream& operator=(const Stream&) = delete;
    ~Stream() {
        if (ssl_ != nullptr) {
            SSL_shutdown(ssl_);
            SSL_free(ssl_);
        }
        close(fd_);
    }

    bool Handshake() { return ssl_ == nullptr || SSL_accept(ssl_) == 1; }

    bool ReadInto(std::string& text) {
        char buffer[4096];
        const ssize_t n = ssl_ != nullptr ? SSL_read(ssl_, buffer, sizeof buffer)
                                          : read(fd_, buffer, sizeof buffer);
        if (n > 0) {
            text.append(buffer, static_cast<size_t>(n));
        }
        return n > 0;
    }

    void Write(const std::string& text) {
        if (ssl_ != nullptr) {
            SSL_write(ssl_, text.data(), static_cast<int>(text.size()));
        } else if (write(fd_, text.data(), text.size()) < 0) {
            return;  // the other side is gone: nobody to tell
        }
    }

  private:
    int fd_;
    SSL* ssl_;
};

void ParseHead(const std::string& head, Request& request) {
    size_t at = head.find("\r\n");
    const std::string line = head.substr(0, at);
    const size_t first = line.find(' ');
    request.method = line.substr(0, first);
    request.target = line.substr(first + 1, line.rfind(' ') - first - 1);
    while (at != std::string::npos && at + 2 < head.size()) {
        const size_t next = head.find("\r\n", at + 2);
        const std::string field = head.substr(at + 2, next - at - 2);
        const size_t colon = field.find(": ");
        if (colon != std::string::npos) {
            std::string name = field.substr(0, colon);
            std::transform(name.begin(), name.end(), name.begin(), ::tolower);
            request.headers[name] = field.substr(colon + 2);
        }
        at = next;
    }
}

bool ReadRequest(Stream& stream, Request& request) {
    std::string text;
    size_t end = 0;
    while ((end = text.find("\r\n\r\n")) == std::string::npos) {
        if (!stream.ReadInto(text)) {
            return false;
        }
        if (text[0] < ' ') {  // a handshake at a plain port
            stream.Write("HTTP/1.1 400 Bad Request\r\n\r\n");
            return false;
        }
    }
    ParseHead(text.substr(0, end), request);
    if (request.headers.count("expect") != 0) {
        stream.Write("HTTP/1.1 100 Continue\r\n\r\n");
    }
    const auto length = request.headers.find("content-length");
    const size_t size = length == request.headers.end() ? 0 : std::stoul(length->second);
    request.body = text.substr(end + 4);
    while (request.body.size() < size && stream.ReadInto(request.body)) {
    }
    return true;
}

std::string Format(const Response& response, bool keep_open) {
    std::string text = "HTTP/1.1 " + std::to_string(response.status) + " Told\r\n" +
                       (keep_open ? "" : "Connection: close\r\n") +
                       "Content-Length: " + std::to_string(response.body.size()) + "\r\n";
    for (const auto& [name, value] : response.headers) {
        text += name + ": " + value + "\r\n";
    }
    return text + "\r\n" + response.body;
}

void Record(int journal, const Request& request) {
    Json::Value line;
    line["method"] = request.method;
    line["target"] = request.target;
    line["body"] = request.body;
    for (const auto& [name, value] : request.headers) {
        line["headers"][name] = value;
    }
    Json::StreamWriterBuilder one_line;
    one_line["indentation"] = "";
    const std::string text = Json::writeString(one_line, line) + "\n";
    if (write(journal, text.data(), text.size()) < 0) {
        _exit(1);
    }
}

void Converse(const ServerOptions& options, int fd, SSL_CTX* context, int journal) {
    if (options.manner == Manner::kCloseAtOnce) {
        close(fd);
        return;
    }
    if (options.manner == Manner::kSilent) {
        char buffer[4096];
        while (read(fd, buffer, sizeof buffer) > 0) {
        }
        close(fd);
        return;
    }
    Stream stream(fd, context);
    bool more = stream.Handshake();
    while (more) {
        Request request;
        if (!ReadRequest(stream, request)) {
            return;
        }
        Record(journal, request);
        more = options.manner == Manner::kKeepOpen;
        if (more || options.manner == Manner::kServe) {
            stream.Write(Format(options.answer(request), more));
        }
    }
}

[[noreturn]] void Serve(const ServerOptions& options, int listener, int journal) {
    prctl(PR_SET_PDEATHSIG, SIGKILL);
    signal(SIGPIPE, SIG_IGN);
    SSL_CTX* context =
        options.identity.certificate.empty() ? nullptr : NewContext(options.identity);
    for (;;) {
        const int fd = accept4(listener, nullptr, nullptr, SOCK_CLOEXEC);
        if (fd < 0) {
            _exit(1);
        }
        std::thread(Converse, std::cref(options), fd, context, journal).detach();
    }
}

}  // namespace

TlsServer::TlsServer(ServerOptions options) : options_(std::move(options)) {
    journal_ = memfd_create("journal", MFD_CLOEXEC);
    Start();
}

TlsServer::~TlsServer() {
    Stop();
    close(journal_);
}

ServerOptions TlsServer::With(const Identity& identity) {
    ServerOptions options;
    options.identity = identity;
    return options;
}

void TlsServer::Start() {
    const int listener = Bind(port_ != 0 ? port_ : options_.port, options_.ipv6);
    port_ = PortOf(listener);
    listen(listener, 16);
    pid_ = fork();
    if (pid_ == 0) {
        try {
            Serve(options_, listener, journal_);
        } catch (const std::exception&) {
            _exit(1);
        }
    }
    close(listener);
}

void TlsServer::Stop() {
    kill(pid_, SIGKILL);
    waitpid(pid_, nullptr, 0);
}

void TlsServer::Restart(const Identity& identity) {
    Stop();
    options_.identity = identity;
    Start();
}

std::string TlsServer::Url(const std::string& path) const {
    const char* scheme = options_.identity.certificate.empty() ? "http" : "https";
    const char* host = options_.ipv6 ? "[::1]" : "localhost";
    return std::string(scheme) + "://" + host + ":" + std::to_string(port_) + path;
}

std::vector<Request> TlsServer::Requests() const {
    std::string text(static_cast<size_t>(lseek(journal_, 0, SEEK_END)), '\0');
    if (pread(journal_, text.data(), text.size(), 0) != static_cast<ssize_t>(text.size())) {
        Die("journal");
    }
    std::vector<Request> requests;
    for (size_t at = 0; at < text.size();) {
        const size_t end = text.find('\n', at);
        Json::Value line;
        const std::unique_ptr<Json::CharReader> reader(Json::CharReaderBuilder().newCharReader());
        reader->parse(text.data() + at, text.data() + end, &line, nullptr);
        Request request{
            line["method"].asString(), line["target"].asString(), {}, line["body"].asString()};
        for (const std::string& name : line["headers"].getMemberNames()) {
            request.headers[name] = line["headers"][name].asString();
        }
        requests.push_back(request);
        at = end + 1;
    }
    return requests;
}

int RefusedPort() {
    const int fd = Bind(0, false);
    const int port = PortOf(fd);
    close(fd);
    return port;
}

std::string Basic(const std::string& user, const std::string& password) {
    const std::string text = user + ":" + password;
    std::string coded(4 * (text.size() / 3 + 1) + 1, '\0');
    coded.resize(static_cast<size_t>(EVP_EncodeBlock(
        reinterpret_cast<unsigned char*>(coded.data()),
        reinterpret_cast<const unsigned char*>(text.data()), static_cast<int>(text.size()))));
    return "Basic " + coded;
}

}  // namespace tls
