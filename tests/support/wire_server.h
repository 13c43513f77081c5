/**
 * A server that says exactly what a test wrote down, byte for byte, and keeps what it was told: for
 * answers that no honest server gives, and for connections that break at a chosen place. It listens
 * on a loopback port, in a thread of its own, and ends with the object.
 */
#ifndef ZYROVFS_TESTS_WIRE_SERVER_H
#define ZYROVFS_TESTS_WIRE_SERVER_H

#include <condition_variable>
#include <mutex>
#include <string>
#include <thread>
#include <vector>

namespace wire {

struct Step {
    enum Kind {
        kReadRequest,
        kReadHead,
        kReadLine,
        kReadBytes,
        kReadAll,
        kSend,
        kDrip,
        kStall,
        kReset
    } kind;
    std::string bytes;     ///< to send
    size_t number = 0;     ///< of bytes: to read, or per piece to send
    int milliseconds = 0;  ///< between two pieces
};

/** One HTTP request, body included; says "100 Continue" when that is waited for. */
Step ReadRequest();
/** Up to the empty line; the body stays unread. */
Step ReadHead();
/** One line, as FTP clients send. */
Step ReadLine();
Step ReadBytes(size_t number);
/** Until the other side closes. */
Step ReadAll();
Step Send(const std::string& bytes);
/** In pieces, with a pause before each. */
Step Drip(const std::string& bytes, size_t piece, int milliseconds);
/** Silence, until the other side goes away. */
Step Stall();
/** Ends the connection with a reset in place of an orderly close. */
Step Reset();

/** What one connection sees; behind the last step it is closed. */
using Script = std::vector<Step>;

/** An answer with its Content-Length. `headers` are whole lines. */
std::string Answer(int status, const std::string& body = "", const std::string& headers = "");

class WireServer {
  public:
    /** The n-th connection gets the n-th script; further ones are closed at once. */
    explicit WireServer(std::vector<Script> scripts);
    WireServer(const WireServer&) = delete;
    WireServer& operator=(const WireServer&) = delete;
    ~WireServer();

    int Port() const { return port_; }
    /** "SCHEME://127.0.0.1:PORT" and the path. */
    std::string Url(const std::string& path = "/", const std::string& scheme = "http") const;

    /** What each reading step has read, in order of time. */
    std::vector<std::string> Received() const;
    /** All of it. */
    std::string ReceivedText() const;
    /** Connections so far, those without a script included. */
    size_t Connections() const;
    /** True when every step of every script has been carried out, which may take a moment longer
     * than the client's view of it. */
    bool Finished() const;

  private:
    void Accept();
    void Converse(int fd, size_t number);
    bool Carry(int fd, const Step& step, std::string& buffer);
    void Keep(const std::string& bytes);

    std::vector<Script> scripts_;
    int port_ = 0;
    int listener_;
    mutable std::mutex mutex_;
    mutable std::condition_variable changed_;
    std::vector<std::string> received_;
    std::vector<int> open_;
    size_t connections_ = 0;
    size_t finished_ = 0;
    std::vector<std::thread> conversations_;
    std::thread acceptor_;
};

}  // namespace wire

#endif
