#include <glib.h>
#include <libsoup/soup.h>
#include <zosplatform/credential.h>

#include <memory>

#include "core/handle.h"
#include "core/log.h"
#include "core/no_throw.h"
#include "mount/glib_handle.h"
#include "mount/server_uri.h"
#include "server/location_id.h"
#include "zyrovfs/global.h"
#include "zyrovfs/server.h"
#include "zyrovfs/utils.h"

namespace ZYROVFS::Server {
namespace {

/** The user of a URI, decoded; a URI without one leaves `user` alone. */
void TakeUser(const char* uri, std::string& user) {
    const UniqueSoupUri parsed(soup_uri_new(ReadableUri(uri).c_str()));
    const char* text = parsed ? soup_uri_get_user(parsed.get()) : nullptr;
    if (text != nullptr) {
        user = Utils::DecodeURI(text);
    }
}

/** Appends the connection's remote path as the server names it. */
void AppendRemotePath(const Json::Value& connection, std::string& uri) {
    const std::string stored = connection.get("uri_path", "").asString();
    if (stored.empty()) {
        return;
    }
    const std::string codepage = connection.get("codepage", "").asString();
    std::string path = stored;
    if (!codepage.empty() && codepage != "UTF-8") {
        Utils::ConvString(path, stored.c_str(), "UTF-8", codepage.c_str());
    }
    if (uri.empty() || uri.back() != '/') {
        uri += '/';
    }
    uri += path;
}

}  // namespace

int SzEncrypt(const char* plain, char* out, unsigned int size) {
    return YLIBCCryptSzEncrypt(plain, out, size);
}

int SzDecrypt(const char* cipher, char* out, unsigned int size) {
    return YLIBCCryptSzDecrypt(cipher, out, size);
}

bool GetUserAndURI(const char* uri, std::string& user, std::string& outURI) {
    return NoThrow(VFS_ERR_BAD_PARAM, [&] {
        if (uri == nullptr) {
            LOG_ERROR("Wrong parameters");
            return false;
        }
        std::string id;
        std::string behind;
        std::string base;
        if (!Utils::GetURIParts(uri, id, behind)) {
            return false;
        }
        TakeUser(uri, user);
        Json::Value connection;
        if (!FindConnection(uri, id, behind, connection)) {
            LOG_ERROR("Failed to get %s config, uid %u", id.c_str(), GetActorUID());
            return false;
        }
        if (!Utils::GetBaseURI(id.c_str(), base, false)) {
            return false;
        }
        TakeUser(id.c_str(), user);
        AppendRemotePath(connection, base);
        outURI = base + behind;
        return true;
    });
}

}  // namespace ZYROVFS::Server
