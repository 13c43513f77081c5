#include "cloud/service_config.h"

#include <sys/stat.h>

#include <algorithm>
#include <cerrno>
#include <cstring>
#include <iterator>

#include "cloud/service_document.h"
#include "core/entry_name.h"
#include "core/json.h"
#include "core/log.h"
#include "core/owned_folder.h"
#include "core/paths.h"
#include "zyrovfs/server.h"

namespace ZYROCloud {

using namespace ZYROVFS;

namespace service_document {
namespace {

constexpr size_t kPlainBuffer = 4097;

/** Whoever may write the document decides where tokens are sent. */
constexpr const char* kOthersMayWrite = "others than root may write it";

State Refuse(const char* why) {
    LOG_ERROR("Ignored %s, %s", paths::kServiceConfig, why);
    return State::kRefused;
}

}  // namespace

State Read(Json::Value& document) {
    document = Json::Value(Json::objectValue);
    const EntryPath place = SplitPath(paths::kServiceConfig);
    const OwnedFolder folder = OwnedFolder::Open(place.folder, 0);
    struct stat info {};
    if (!folder || !folder.Stat(place.name, info)) {
        const bool foreign = errno == EPERM;
        return errno == ENOENT ? State::kMissing
                               : Refuse(foreign ? kOthersMayWrite : strerror(errno));
    }
    if ((info.st_mode & (S_IWGRP | S_IWOTH)) != 0) {
        return Refuse(kOthersMayWrite);
    }
    Json::Value read;
    if (!json::fromFile(read, folder, place.name)) {
        return Refuse(strerror(errno));
    }
    if (!read.isObject()) {
        return Refuse("it is no JSON object");
    }
    document.swap(read);
    return State::kRead;
}

const Json::Value& Member(const Json::Value& object, const std::string& name) {
    const Json::Value* member =
        object.isObject() ? object.find(name.data(), name.data() + name.size()) : nullptr;
    return member == nullptr ? Json::Value::nullSingleton() : *member;
}

bool Passphrase(const Json::Value& document, std::string& passphrase) {
    const Json::Value& key = Member(document, kKey);
    if (!key.isString()) {
        return false;
    }
    char plain[kPlainBuffer] = "";
    const bool known = Server::SzDecrypt(key.asCString(), plain, sizeof plain) != 0;
    if (known) {
        passphrase = plain;
    }
    explicit_bzero(plain, sizeof plain);
    return known;
}

}  // namespace service_document

namespace {

using service_document::Member;

/** The services' public addresses. */
struct Host {
    const char* name;
    const char* address;
};
constexpr Host kBoxApi = {"BoxApiHost", "https://api.box.com"};
constexpr Host kBoxUpload = {"BoxUploadHost", "https://upload.box.com"};
constexpr Host kBoxAccount = {"BoxAccountHost", "https://account.box.com"};
constexpr Host kDropboxApi = {"DropboxApiHost", "https://api.dropboxapi.com"};
constexpr Host kDropboxContent = {"DropboxContentHost", "https://content.dropboxapi.com"};
constexpr Host kDropboxWeb = {"DropboxWebHost", "https://www.dropbox.com"};
constexpr Host kGoogleApi = {"GoogleApiHost", "https://www.googleapis.com"};
constexpr Host kGoogleAccounts = {"GoogleAccountsHost", "https://accounts.google.com"};
constexpr Host kLiveApi = {"LiveApiHost", "https://apis.live.net"};
constexpr Host kLiveLogin = {"LiveLoginHost", "https://login.live.com"};
constexpr Host kLiveStorage = {"LiveStorageDomain", ".users.storage.live.com"};

/** Host and port: what would lead elsewhere in an address has no place in them. */
bool IsAuthority(const std::string& text) {
    constexpr const char* kForeign = "/?#@\\\"<>^`{|}%";
    return !text.empty() && text.find_first_of(kForeign) == std::string::npos &&
           std::all_of(text.begin(), text.end(), [](char c) { return c > ' ' && c < 0x7f; });
}

/** A configured address in its own form; false for what is none. */
bool TakeBase(std::string& address) {
    if (!address.empty() && address.back() == '/') {
        address.pop_back();
    }
    for (const char* scheme : {"https://", "http://"}) {
        if (address.compare(0, strlen(scheme), scheme) == 0) {
            return IsAuthority(address.substr(strlen(scheme)));
        }
    }
    return false;
}

bool TakeDomain(std::string& domain) {
    if (!domain.empty() && domain.back() == '/') {
        domain.pop_back();
    }
    return domain.size() > 1 && domain.front() == '.' && domain[1] != ':' && IsAuthority(domain);
}

std::string Configured(const Host& host, bool (*take)(std::string&)) {
    Json::Value document;
    service_document::Read(document);
    const Json::Value& hosts = Member(document, service_document::kHosts);
    const Json::Value& value = Member(hosts, host.name);
    if (value.isNull() && (hosts.isNull() || hosts.isObject())) {
        return host.address;
    }
    std::string address = value.isString() ? value.asString() : "";
    if (!take(address)) {
        LOG_ERROR("Ignored %s of %s, it is no address", host.name, paths::kServiceConfig);
        return host.address;
    }
    return address;
}

/** The clients of a service, null when there are none. */
Json::Value ClientsOf(const std::string& service) {
    Json::Value document;
    service_document::Read(document);
    return Member(Member(document, service_document::kClients), service);
}

}  // namespace

std::string BoxApiHost() {
    return Configured(kBoxApi, TakeBase);
}

std::string BoxUploadHost() {
    return Configured(kBoxUpload, TakeBase);
}

std::string BoxAccountHost() {
    return Configured(kBoxAccount, TakeBase);
}

std::string DropboxApiHost() {
    return Configured(kDropboxApi, TakeBase);
}

std::string DropboxContentHost() {
    return Configured(kDropboxContent, TakeBase);
}

std::string DropboxWebHost() {
    return Configured(kDropboxWeb, TakeBase);
}

std::string GoogleApiHost() {
    return Configured(kGoogleApi, TakeBase);
}

std::string GoogleAccountsHost() {
    return Configured(kGoogleAccounts, TakeBase);
}

std::string LiveApiHost() {
    return Configured(kLiveApi, TakeBase);
}

std::string LiveLoginHost() {
    return Configured(kLiveLogin, TakeBase);
}

std::string LiveStorageDomain() {
    return Configured(kLiveStorage, TakeDomain);
}

bool FindClientSecret(const std::string& service, const std::string& client_id,
                      std::string& enciphered) {
    const Json::Value clients = ClientsOf(service);
    const Json::Value& secret = Member(clients, client_id);
    if (!secret.isString()) {
        return false;
    }
    enciphered = secret.asString();
    return true;
}

std::string FixedClientId(const std::string& service) {
    const Json::Value clients = ClientsOf(service);
    return clients.isObject() && !clients.empty() ? clients.getMemberNames().front() : "";
}

}  // namespace ZYROCloud
