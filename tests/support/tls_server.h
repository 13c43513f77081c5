/**
 * A small web server on a loopback port, over TLS or plain, in a process of its own: the test's
 * process stays without threads and may fork. It ends with the object.
 */
#ifndef ZYROVFS_TESTS_TLS_SERVER_H
#define ZYROVFS_TESTS_TLS_SERVER_H

#include <sys/types.h>

#include <functional>
#include <map>
#include <string>
#include <vector>

#include "support/test_certs.h"

namespace tls {

struct Request {
    std::string method;
    std::string target;
    std::map<std::string, std::string> headers;  ///< names in lower case
    std::string body;
};

struct Response {
    int status = 200;
    std::map<std::string, std::string> headers;
    std::string body;
};

enum class Manner {
    kServe,                ///< one request a connection
    kKeepOpen,             ///< request after request, until the other side goes
    kCloseAtOnce,          ///< accepts, and closes before the handshake
    kCloseAfterHandshake,  ///< reads a request and closes without an answer
    kSilent,               ///< accepts, and says nothing until the other side goes
};

struct ServerOptions {
    Identity identity;  ///< empty: plain HTTP
    /** Answers a request, in the server's process. */
    std::function<Response(const Request&)> answer = [](const Request&) { return Response(); };
    Manner manner = Manner::kServe;
    int port = 0;  ///< 0: any that is free
    bool ipv6 = false;
};

class TlsServer {
  public:
    explicit TlsServer(ServerOptions options);
    explicit TlsServer(const Identity& identity) : TlsServer(With(identity)) {}
    TlsServer(const TlsServer&) = delete;
    TlsServer& operator=(const TlsServer&) = delete;
    ~TlsServer();

    int Port() const { return port_; }
    /** "https://localhost:PORT", or "[::1]" in its place, and the path. */
    std::string Url(const std::string& path = "/") const;

    /** All requests so far, in order. */
    std::vector<Request> Requests() const;

    /** Ends this server and serves the same port anew, as after a renewal of the certificate. */
    void Restart(const Identity& identity);

  private:
    static ServerOptions With(const Identity& identity);
    void Start();
    void Stop();

    ServerOptions options_;
    int port_ = 0;
    int journal_ = -1;  ///< memory file, one JSON text per line
    pid_t pid_ = -1;
};

/** A loopback port on which nothing listens. */
int RefusedPort();

/** The value of a Basic Authorization header. */
std::string Basic(const std::string& user, const std::string& password);

}  // namespace tls

#endif
