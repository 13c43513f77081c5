/** Waits for the browser that a service sends back, and for a person who pastes its address. */
#ifndef ZYROVFS_TOOLS_LOGIN_LISTENER_H
#define ZYROVFS_TOOLS_LOGIN_LISTENER_H

#include <libsoup/soup.h>

#include <memory>
#include <string>

namespace tool {

/** Serves one page on the loopback addresses, to whoever asks on this machine. */
class LoginListener {
  public:
    LoginListener() = default;
    LoginListener(const LoginListener&) = delete;
    LoginListener& operator=(const LoginListener&) = delete;
    ~LoginListener();

    /** False with a sentence when the port cannot be had. 0 takes any that is free. */
    bool Open(unsigned int port, std::string& problem);
    unsigned int Port() const { return port_; }

    /**
     * Waits up to `seconds` for an answer to the login of this state: at the port, if it is open,
     * and with `from_input` on standard input. What answers another login is told so and waited
     * past. False with a sentence.
     */
    bool Wait(const std::string& state, bool from_input, unsigned int seconds, std::string& answer,
              std::string& problem);

  private:
    struct Unref {
        void operator()(void* object) const { g_object_unref(object); }
    };

    static void Serve(SoupServer* server, SoupMessage* message, const char* path, GHashTable* query,
                      SoupClientContext* client, void* self);
    static gboolean ReadInput(int fd, GIOCondition condition, void* self);
    static gboolean GiveUp(void* self);
    bool IsAnswer(const std::string& text) const;
    void End(const std::string& problem);

    std::unique_ptr<SoupServer, Unref> server_;
    GMainLoop* loop_ = nullptr;
    unsigned int port_ = 0;
    std::string state_, input_, answer_, problem_;
};

}  // namespace tool

#endif
