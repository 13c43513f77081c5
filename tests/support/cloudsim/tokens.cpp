#include "support/cloudsim/tokens.h"

#include <openssl/evp.h>

#include "support/cloudsim/http.h"

namespace cloudsim {
namespace {

constexpr int64_t kRefreshLife = 60 * 24 * 3600;
constexpr int64_t kCodeLife = 60;

/** SHA-256 in unpadded base64 for addresses. */
std::string S256(const std::string& verifier) {
    unsigned char digest[EVP_MAX_MD_SIZE];
    unsigned int length = 0;
    EVP_Digest(verifier.data(), verifier.size(), digest, &length, EVP_sha256(), nullptr);
    static constexpr char kAlphabet[] =
        "ABCDEFGHIJKLMNOPQRSTUVWXYZabcdefghijklmnopqrstuvwxyz0123456789-_";
    std::string text;
    for (unsigned int bit = 0; bit < length * 8; bit += 6) {
        const unsigned int at = bit / 8;
        const unsigned int next = at + 1 < length ? digest[at + 1] : 0;
        const unsigned int both = digest[at] * 256U + next;
        text += kAlphabet[both >> (10 - bit % 8) & 63];
    }
    return text;
}

}  // namespace

void TokenStore::AddClient(const std::string& id, const std::string& secret) {
    const std::lock_guard<std::mutex> lock(mutex_);
    clients_[id] = secret;
    if (first_client_.empty()) {
        first_client_ = id;
    }
}

bool TokenStore::IsClient(const std::string& id, const std::string& secret) const {
    const std::lock_guard<std::mutex> lock(mutex_);
    if (clients_.empty()) {
        return id == "client" && secret == "secret";
    }
    const auto found = clients_.find(id);
    return found != clients_.end() && found->second == secret;
}

bool TokenStore::IsClientId(const std::string& id) const {
    const std::lock_guard<std::mutex> lock(mutex_);
    return clients_.empty() ? id == "client" : clients_.count(id) != 0;
}

std::string TokenStore::FirstClient() const {
    const std::lock_guard<std::mutex> lock(mutex_);
    return first_client_.empty() ? "client" : first_client_;
}

Tokens TokenStore::Make(Account& account, const std::string& client, int64_t token_life) {
    Tokens tokens;
    tokens.access_token = RandomText(32);
    tokens.refresh_token = RandomText(64);
    tokens.expires_in = token_life;
    access_[tokens.access_token] = {&account, client, now_() + token_life};
    refresh_[tokens.refresh_token] = {&account, client, now_() + kRefreshLife};
    last_[&account] = tokens;
    return tokens;
}

Tokens TokenStore::Issue(Account& account, const std::string& client, int64_t token_life) {
    const std::string of = client.empty() ? FirstClient() : client;
    const std::lock_guard<std::mutex> lock(mutex_);
    return Make(account, of, token_life);
}

std::string TokenStore::IssueCode(Account& account, const CodeLogin& login) {
    const std::lock_guard<std::mutex> lock(mutex_);
    // Codes of one service have slashes in them.
    const std::string code = "4/" + RandomText(40);
    codes_[code] = {&account, login, now_() + kCodeLife};
    return code;
}

bool TokenStore::Exchange(const std::string& code, const CodeLogin& login, Tokens& tokens) {
    const std::lock_guard<std::mutex> lock(mutex_);
    const auto found = codes_.find(code);
    if (found == codes_.end()) {
        return false;
    }
    const Code issued = found->second;
    codes_.erase(found);
    const bool proved =
        issued.login.proof.empty() ? login.proof.empty() : S256(login.proof) == issued.login.proof;
    if (issued.login.client != login.client || issued.login.redirect_uri != login.redirect_uri ||
        !proved || issued.expires <= now_()) {
        return false;
    }
    tokens = Make(*issued.account, login.client, life);
    return true;
}

Tokens TokenStore::Last(const Account& account) const {
    const std::lock_guard<std::mutex> lock(mutex_);
    const auto found = last_.find(&account);
    return found == last_.end() ? Tokens() : found->second;
}

Account* TokenStore::Owner(const std::string& access_token) const {
    const std::lock_guard<std::mutex> lock(mutex_);
    const auto found = access_.find(access_token);
    return found != access_.end() && now_() < found->second.expires ? found->second.account
                                                                    : nullptr;
}

void TokenStore::Expire(const std::string& access_token) {
    const std::lock_guard<std::mutex> lock(mutex_);
    const auto found = access_.find(access_token);
    if (found != access_.end()) {
        found->second.expires = 0;
    }
}

bool TokenStore::IsExpired(const std::string& access_token) const {
    const std::lock_guard<std::mutex> lock(mutex_);
    const auto found = access_.find(access_token);
    return found != access_.end() && found->second.expires <= now_();
}

void TokenStore::Drop(Grants& grants, const Account& account) {
    for (auto grant = grants.begin(); grant != grants.end();) {
        grant = grant->second.account == &account ? grants.erase(grant) : std::next(grant);
    }
}

void TokenStore::ExpireAll(const Account& account) {
    const std::lock_guard<std::mutex> lock(mutex_);
    for (auto& [token, grant] : access_) {
        grant.expires = grant.account == &account ? 0 : grant.expires;
    }
}

void TokenStore::RevokeAll(const Account& account) {
    const std::lock_guard<std::mutex> lock(mutex_);
    Drop(refresh_, account);
}

bool TokenStore::Refresh(const std::string& refresh_token, const std::string& client,
                         Tokens& tokens) {
    const std::lock_guard<std::mutex> lock(mutex_);
    const auto found = refresh_.find(refresh_token);
    if (found == refresh_.end() || found->second.client != client ||
        found->second.expires <= now_()) {
        return false;
    }
    Account& account = *found->second.account;
    if (rotate) {
        refresh_.erase(found);
        tokens = Make(account, client, life);
        return true;
    }
    tokens = {RandomText(32), refresh_token, life};
    access_[tokens.access_token] = {&account, client, now_() + life};
    last_[&account] = tokens;
    return true;
}

}  // namespace cloudsim
