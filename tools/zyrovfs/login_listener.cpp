#include "login_listener.h"

#include <glib-unix.h>
#include <unistd.h>

#include <cstring>
#include <iostream>

namespace tool {
namespace {

constexpr const char* kArrived =
    "<!DOCTYPE html><meta charset=utf-8><title>Signed in</title><p>The answer has arrived. Close "
    "this page, and go on where you began.";
constexpr const char* kForeign =
    "<!DOCTYPE html><meta charset=utf-8><title>Not this one</title><p>This is not the answer to "
    "the "
    "login that is waiting. Begin again from the address that the command has shown.";
/** No address of a service is longer. */
constexpr size_t kLongestLine = 16384;

void Reply(SoupMessage* message, unsigned int status, const char* page) {
    soup_message_set_status(message, status);
    soup_message_set_response(message, "text/html; charset=utf-8", SOUP_MEMORY_STATIC, page,
                              strlen(page));
    SoupMessageHeaders* headers = message->response_headers;
    // The address holds a code until the service has taken it back.
    soup_message_headers_append(headers, "Cache-Control", "no-store");
    soup_message_headers_append(headers, "Referrer-Policy", "no-referrer");
    soup_message_headers_append(headers, "Content-Security-Policy", "default-src 'none'");
    soup_message_headers_append(headers, "X-Content-Type-Options", "nosniff");
}

}  // namespace

LoginListener::~LoginListener() {
    if (loop_ != nullptr) {
        g_main_loop_unref(loop_);
    }
}

bool LoginListener::Open(unsigned int port, std::string& problem) {
    GError* error = nullptr;
    server_.reset(SOUP_SERVER(g_object_new(SOUP_TYPE_SERVER, nullptr)));
    // No options: both loopback addresses, no TLS.
    if (soup_server_listen_local(server_.get(), port, static_cast<SoupServerListenOptions>(0),
                                 &error) == FALSE) {
        problem = "Port " + std::to_string(port) + " of this machine cannot be had: " +
                  (error == nullptr ? "no cause was given" : error->message) +
                  ". Take another one that is registered at the service with --port, or --paste.";
        g_clear_error(&error);
        server_.reset();
        return false;
    }
    GSList* uris = soup_server_get_uris(server_.get());
    port_ = uris == nullptr ? port : soup_uri_get_port(static_cast<SoupURI*>(uris->data));
    g_slist_free_full(uris, reinterpret_cast<GDestroyNotify>(soup_uri_free));
    soup_server_add_handler(server_.get(), nullptr, Serve, this, nullptr);
    return true;
}

bool LoginListener::IsAnswer(const std::string& text) const {
    return !state_.empty() && text.find("state=" + state_) != std::string::npos;
}

void LoginListener::End(const std::string& problem) {
    problem_ = problem;
    g_main_loop_quit(loop_);
}

void LoginListener::Serve(SoupServer* /*server*/, SoupMessage* message, const char* path,
                          GHashTable* /*query*/, SoupClientContext* /*client*/, void* opaque) {
    auto* const self = static_cast<LoginListener*>(opaque);
    const SoupURI* uri = soup_message_get_uri(message);
    const char* query = uri == nullptr || uri->query == nullptr ? "" : uri->query;
    if (message->method != SOUP_METHOD_GET || strcmp(path, "/") != 0) {
        soup_message_set_status(message, SOUP_STATUS_NOT_FOUND);
    } else if (!self->answer_.empty() || !self->IsAnswer(query)) {
        Reply(message, SOUP_STATUS_BAD_REQUEST, kForeign);
    } else {
        self->answer_ = query;
        Reply(message, SOUP_STATUS_OK, kArrived);
        // Not before the person has the page.
        g_signal_connect_swapped(message, "finished", G_CALLBACK(g_main_loop_quit), self->loop_);
    }
}

gboolean LoginListener::ReadInput(int fd, GIOCondition /*condition*/, void* opaque) {
    auto* const self = static_cast<LoginListener*>(opaque);
    char piece[4096];
    const ssize_t n = read(fd, piece, sizeof piece);
    if (n <= 0 || self->input_.size() > kLongestLine) {
        if (!self->server_) {
            self->End("The input ended before an answer.");
        }
        return G_SOURCE_REMOVE;
    }
    self->input_.append(piece, static_cast<size_t>(n));
    for (size_t end; (end = self->input_.find('\n')) != std::string::npos;) {
        const std::string line = self->input_.substr(0, end);
        self->input_.erase(0, end + 1);
        if (self->IsAnswer(line)) {
            self->answer_ = line;
            self->End("");
            return G_SOURCE_REMOVE;
        }
        std::cerr << "That is not the answer to this login. Paste the whole address that the "
                     "browser has ended at.\n";
    }
    return G_SOURCE_CONTINUE;
}

gboolean LoginListener::GiveUp(void* self) {
    static_cast<LoginListener*>(self)->End("No answer came in time.");
    return G_SOURCE_CONTINUE;
}

bool LoginListener::Wait(const std::string& state, bool from_input, unsigned int seconds,
                         std::string& answer, std::string& problem) {
    state_ = state;
    loop_ = g_main_loop_new(nullptr, FALSE);
    const unsigned int timeout = g_timeout_add_seconds(seconds, GiveUp, this);
    if (from_input) {
        g_unix_fd_add(STDIN_FILENO, static_cast<GIOCondition>(G_IO_IN | G_IO_HUP), ReadInput, this);
    }
    g_main_loop_run(loop_);
    g_source_remove(timeout);
    answer = answer_;
    problem = problem_;
    return !answer_.empty();
}

}  // namespace tool
