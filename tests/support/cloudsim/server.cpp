#include "support/cloudsim/server.h"

#include <arpa/inet.h>
#include <microhttpd.h>

#include <cstdarg>
#include <stdexcept>
#include <vector>

#include "support/cloudsim/exchange.h"

namespace cloudsim {
namespace {

using Held = std::shared_ptr<Exchange>;

/** The first that is heard of a request: its target as sent. */
void* NewExchange(void* server, const char* target, MHD_Connection*) {
    return new Held(std::make_shared<Exchange>(*static_cast<Server*>(server), target));
}

MHD_Result Handle(void*, MHD_Connection* connection, const char*, const char* method,
                  const char* version, const char* data, size_t* size, void** context) {
    Exchange& exchange = **static_cast<Held*>(*context);
    bool good;
    if (!exchange.Started()) {
        good = exchange.Start(connection, method, version);
    } else if (*size != 0) {
        good = exchange.Data(data, *size);
        *size = 0;
    } else {
        good = exchange.Answer();
    }
    return good ? MHD_YES : MHD_NO;
}

void EndExchange(void*, MHD_Connection*, void** context, MHD_RequestTerminationCode) {
    const std::unique_ptr<Held> held(static_cast<Held*>(*context));
    *context = nullptr;
    if (held != nullptr) {
        (*held)->End();
    }
}

void NoteConnection(void* server, MHD_Connection*, void** context,
                    MHD_ConnectionNotificationCode code) {
    if (code == MHD_CONNECTION_NOTIFY_STARTED) {
        auto kept = std::make_unique<Connection>();
        kept->number = static_cast<Server*>(server)->journal.AddConnection();
        *context = kept.release();
    } else {
        delete static_cast<Connection*>(*context);
        *context = nullptr;
    }
}

/** Clients that go away in the middle are what tests are about, and no news. */
void Hush(void*, const char*, va_list) {}

MHD_OptionItem Option(MHD_OPTION option, intptr_t value, const void* pointer = nullptr) {
    return {option, value, const_cast<void*>(pointer)};
}

}  // namespace

Server::Server(const ServerOptions& server_options, class Journal& journal_of,
               FaultPlan& fault_plan, ServerHooks server_hooks)
    : options(server_options),
      journal(journal_of),
      faults(fault_plan),
      hooks(std::move(server_hooks)) {
    sockaddr_in address{};
    address.sin_family = AF_INET;
    address.sin_port = htons(static_cast<uint16_t>(options.port));
    address.sin_addr.s_addr = htonl(INADDR_LOOPBACK);
    unsigned flags = MHD_USE_INTERNAL_POLLING_THREAD | MHD_USE_THREAD_PER_CONNECTION |
                     MHD_USE_POLL | MHD_USE_ERROR_LOG;
    std::vector<MHD_OptionItem> more = {Option(MHD_OPTION_CONNECTION_MEMORY_LIMIT, 512 * 1024),
                                        Option(MHD_OPTION_CONNECTION_MEMORY_INCREMENT, 128 * 1024),
                                        Option(MHD_OPTION_LISTEN_BACKLOG_SIZE, 128)};
    if (!options.certificate.empty()) {
        flags |= MHD_USE_TLS;
        more.push_back(Option(MHD_OPTION_HTTPS_MEM_CERT, 0, options.certificate.c_str()));
        more.push_back(Option(MHD_OPTION_HTTPS_MEM_KEY, 0, options.key.c_str()));
    }
    more.push_back(Option(MHD_OPTION_END, 0));
    daemon_ = MHD_start_daemon(
        flags, 0, nullptr, nullptr, Handle, this, MHD_OPTION_EXTERNAL_LOGGER, Hush, nullptr,
        MHD_OPTION_URI_LOG_CALLBACK, NewExchange, this, MHD_OPTION_NOTIFY_COMPLETED, EndExchange,
        this, MHD_OPTION_NOTIFY_CONNECTION, NoteConnection, this, MHD_OPTION_SOCK_ADDR, &address,
        MHD_OPTION_ARRAY, more.data(), MHD_OPTION_END);
    if (daemon_ == nullptr) {
        throw std::runtime_error("cloudsim cannot serve port " + std::to_string(options.port));
    }
    port_ = MHD_get_daemon_info(daemon_, MHD_DAEMON_INFO_BIND_PORT)->port;
}

Server::~Server() {
    {
        const std::lock_guard<std::mutex> lock(mutex_);
        stopping_ = true;
    }
    stopped_.notify_all();
    MHD_stop_daemon(daemon_);
}

void Server::SleepUntil(Time time) {
    std::unique_lock<std::mutex> lock(mutex_);
    stopped_.wait_until(lock, time, [this] { return stopping_; });
}

}  // namespace cloudsim
