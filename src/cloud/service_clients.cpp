#include <openssl/rand.h>
#include <sys/file.h>
#include <sys/stat.h>

#include <algorithm>
#include <cerrno>
#include <cstring>
#include <iterator>

#include "cloud/service_document.h"
#include "core/entry_name.h"
#include "core/handle.h"
#include "core/json.h"
#include "core/log.h"
#include "core/no_throw.h"
#include "core/owned_folder.h"
#include "core/paths.h"
#include "zyrovfs/cloud_utils.h"
#include "zyrovfs/utils.h"

namespace ZYROCloud::Utils {

using namespace ZYROVFS;
using service_document::kClients;
using service_document::kKey;
using service_document::State;

namespace {

constexpr const char* kServices[] = {"box", "dropbox", "google", "onedrive"};
constexpr mode_t kMode = 0640;
/** Backends run as their user in the group that all users have. */
constexpr FileOwner kOwner = {0, 100};
constexpr size_t kPassphraseBytes = 32;
constexpr unsigned int kCipherBuffer = 4096;

bool IsService(const std::string& service) {
    return std::find(std::begin(kServices), std::end(kServices), service) != std::end(kServices);
}

/** Secrets and ids travel as C texts. */
bool IsText(const std::string& text) {
    return !text.empty() && text.find('\0') == std::string::npos;
}

/** Two programs that change the document at once would each drop what the other wrote. The file of
 * the lock is root's alone, so nobody else can hold it. */
UniqueFd LockDocument() {
    constexpr unsigned kKeepOwner = static_cast<unsigned>(-1);
    ZYROVFS::Utils::MkdirP(paths::kConfigRoot, nullptr, 0, kKeepOwner, kKeepOwner, 0755);
    const std::string path = std::string(paths::kServiceConfig) + ".lock";
    const EntryPath place = SplitPath(path);
    UniqueFd fd = OwnedFolder::Open(place.folder, 0).Lock(place.name, LOCK_EX, 0600);
    if (!fd) {
        LOG_ERROR("Failed to lock %s, %m", path.c_str());
    }
    return fd;
}

bool IsObjectOrNull(const Json::Value& value) {
    return value.isObject() || value.isNull();
}

/** The document as it is, to be changed and written back; what is not understood is not touched. */
bool ReadToChange(Json::Value& document, const std::string& service) {
    if (service_document::Read(document) == State::kRefused) {
        return Fail(VFS_ERR_CONFIG_READ);
    }
    if (!IsObjectOrNull(document[kClients]) || !IsObjectOrNull(document[kClients][service])) {
        LOG_ERROR("Wrong clients in %s", paths::kServiceConfig);
        return Fail(VFS_ERR_CONFIG_READ);
    }
    return true;
}

bool Write(const Json::Value& document) {
    if (!json::toFile(document, paths::kServiceConfig, kMode, kOwner)) {
        LOG_ERROR("Failed to write %s, %m", paths::kServiceConfig);
        return Fail(VFS_ERR_CONFIG_WRITE);
    }
    return true;
}

/** A passphrase for a document that has none. */
bool MakePassphrase(Json::Value& document, std::string& passphrase) {
    constexpr char kAlphabet[] = "ABCDEFGHIJKLMNOPQRSTUVWXYZabcdefghijklmnopqrstuvwxyz0123456789-_";
    unsigned char random[kPassphraseBytes];
    char enciphered[kCipherBuffer] = "";
    if (RAND_bytes(random, sizeof random) != 1) {
        LOG_ERROR("Failed to make a key for %s", paths::kServiceConfig);
        return Fail(VFS_ERR_CONFIG_WRITE);
    }
    passphrase.clear();
    for (const unsigned char byte : random) {
        passphrase += kAlphabet[byte % (sizeof kAlphabet - 1)];
    }
    if (Server::SzEncrypt(passphrase.c_str(), enciphered, sizeof enciphered) == 0) {
        LOG_ERROR("Failed to encipher the key of %s, " ZYROERR_FORMAT, paths::kServiceConfig,
                  ZYROERR_ARGS);
        return Fail(VFS_ERR_CONFIG_WRITE);
    }
    document[kKey] = enciphered;
    return true;
}

/** A key of another machine stays: what was enciphered under it may still be moved back. */
bool TakePassphrase(Json::Value& document, std::string& passphrase) {
    if (document[kKey].isNull()) {
        return MakePassphrase(document, passphrase);
    }
    if (!service_document::Passphrase(document, passphrase)) {
        LOG_ERROR("Failed to decipher the key of %s, it was not made on this machine",
                  paths::kServiceConfig);
        return Fail(VFS_ERR_CONFIG_READ);
    }
    return true;
}

bool Put(Json::Value& document, const std::string& service, const std::string& client_id,
         const std::string& secret) {
    std::string passphrase;
    if (!TakePassphrase(document, passphrase)) {
        return false;
    }
    const std::string enciphered = service_document::Encipher(passphrase, secret);
    explicit_bzero(passphrase.data(), passphrase.size());
    if (enciphered.empty()) {
        LOG_ERROR("Failed to encipher the secret of %s", client_id.c_str());
        return Fail(VFS_ERR_CONFIG_WRITE);
    }
    if (enciphered.size() > service_document::kLongestSecret) {
        LOG_ERROR("Too long secret of %s", client_id.c_str());
        return Fail(VFS_ERR_BAD_PARAM);
    }
    document[kClients][service][client_id] = enciphered;
    return Write(document);
}

}  // namespace

bool AddClient(const std::string& service, const std::string& client_id,
               const std::string& secret) {
    return NoThrow(VFS_ERR_CONFIG_READ, [&] {
        if (!IsService(service) || !IsText(client_id) || !IsText(secret)) {
            LOG_ERROR("Wrong parameters");
            return Fail(VFS_ERR_BAD_PARAM);
        }
        const UniqueFd lock = LockDocument();
        Json::Value document;
        return lock ? ReadToChange(document, service) && Put(document, service, client_id, secret)
                    : Fail(VFS_ERR_CONFIG_WRITE);
    });
}

bool RemoveClient(const std::string& service, const std::string& client_id) {
    return NoThrow(VFS_ERR_CONFIG_READ, [&] {
        if (!IsService(service) || !IsText(client_id)) {
            LOG_ERROR("Wrong parameters");
            return Fail(VFS_ERR_BAD_PARAM);
        }
        const UniqueFd lock = LockDocument();
        Json::Value document;
        if (!lock) {
            return Fail(VFS_ERR_CONFIG_WRITE);
        }
        if (!ReadToChange(document, service)) {
            return false;
        }
        Json::Value& clients = document[kClients];
        if (!clients[service].isMember(client_id)) {
            return true;
        }
        clients[service].removeMember(client_id);
        if (clients[service].empty()) {
            clients.removeMember(service);
        }
        return Write(document);
    });
}

bool ListClients(Json::Value& out) {
    return NoThrow(VFS_ERR_CONFIG_READ, [&] {
        out = Json::Value(Json::objectValue);
        Json::Value document;
        if (service_document::Read(document) == State::kRefused) {
            return Fail(VFS_ERR_CONFIG_READ);
        }
        const Json::Value& services = service_document::Member(document, kClients);
        if (!IsObjectOrNull(services)) {
            LOG_ERROR("Wrong clients in %s", paths::kServiceConfig);
            return Fail(VFS_ERR_CONFIG_READ);
        }
        for (const std::string& service : services.getMemberNames()) {
            if (!services[service].isObject()) {
                continue;
            }
            out[service] = Json::Value(Json::arrayValue);
            for (const std::string& id : services[service].getMemberNames()) {
                out[service].append(id);
            }
        }
        return true;
    });
}

}  // namespace ZYROCloud::Utils
