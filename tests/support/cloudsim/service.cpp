#include "support/cloudsim/service.h"

#include <ctime>
#include <stdexcept>

namespace cloudsim {
namespace {

Journal::Options JournalOptions(const ServerOptions& options) {
    return {options.journal_body_limit, options.keep_journal, options.journal_file};
}

}  // namespace

Service::Service(const ServerOptions& options, const TreeRules& rules)
    : options_(options),
      journal_(JournalOptions(options)),
      tokens_([this] { return Now(); }),
      tree_([this] { return Now(); }, rules) {}

Service::~Service() = default;

void Service::Start() {
    ServerHooks hooks;
    hooks.begin = [this](Request& request) { return Begin(request); };
    hooks.role = [this](const Request& request) { return Role(request); };
    hooks.expire_token = [this](const Request& request) { tokens_.Expire(request.BearerToken()); };
    server_ = std::make_unique<Server>(options_, journal_, faults_, std::move(hooks));
}

std::string Service::Address(const std::string& name) const {
    const bool usual = Port() == (Secure() ? 443 : 80);
    return (Secure() ? "https://" : "http://") + name + (usual ? "" : ":" + std::to_string(Port()));
}

void Service::AddClient(const std::string& id, const std::string& secret) {
    tokens_.AddClient(id, secret);
}

Account& Service::AddAccount(const std::string& email, const std::string& name) {
    const std::string shown = name.empty() ? email.substr(0, email.find('@')) : name;
    const std::lock_guard<std::mutex> lock(mutex_);
    accounts_.push_back(
        std::make_unique<Account>(*this, email, shown, AccountId(accounts_.size())));
    tree_.AddAccount(*accounts_.back());
    return *accounts_.back();
}

std::string Service::AccountId(size_t index) const {
    return std::to_string(270000001 + index);
}

int64_t Service::Now() const {
    return time(nullptr) + ahead_;
}

std::unique_ptr<Sink> Service::NewSink() const {
    return MakeSink(options_.storage, options_.hash_uploads);
}

std::map<std::string, std::string> Service::Attributes(const Account&, const Item& item) {
    return {{"id::file", item.id}};
}

}  // namespace cloudsim
