#include "support/cloudsim/service.h"

#include <ctime>
#include <stdexcept>

#include "support/cloudsim/consent.h"

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

std::unique_ptr<Handler> Service::Consent(const Request& request) {
    const ConsentRequest consent(request);
    const std::string problem = consent.Problem(tokens_);
    if (!problem.empty()) {
        return Ready(Reply(400, problem, "text/plain; charset=UTF-8"));
    }
    if (request.method != "POST") {
        std::vector<std::string> accounts;
        const std::lock_guard<std::mutex> lock(mutex_);
        for (const auto& account : accounts_) {
            accounts.push_back(account->Email());
        }
        return Ready(ConsentPage(consent, accounts));
    }
    return Collect([this, consent](const std::string& text) {
        Request form;
        form.query = ParseForm(text);
        const std::lock_guard<std::mutex> lock(mutex_);
        for (const auto& account : accounts_) {
            if (form.Query("decision") == "allow" && account->Email() == form.Query("account")) {
                const std::string code = tokens_.IssueCode(
                    *account, {consent.client, consent.redirect_uri, consent.challenge});
                return Reply(302).With("Location", consent.Back({{"code", code}}));
            }
        }
        return Reply(302).With("Location", consent.Back({{"error", "access_denied"}}));
    });
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
