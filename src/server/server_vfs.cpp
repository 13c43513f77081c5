#include "server/server_vfs.h"

#include <glib.h>
#include <libsoup/soup.h>

#include <cstdlib>
#include <memory>

#include "core/error_cell.h"
#include "core/handle.h"
#include "core/log.h"
#include "core/no_throw.h"
#include "mount/glib_handle.h"
#include "server/profile_text.h"
#include "zyrovfs/protocol.h"
#include "zyrovfs/utils.h"

namespace ZYROVFS::Server {
namespace {

struct TextKey {
    const char* key;
    bool required;
    const TextRule& rule;
};

constexpr TextKey kTextKeys[] = {
    {"protocol", true, kNameRule},        {"hostname", true, kNameRule},
    {"alias", true, kNameRule},           {"account", true, kNameRule},
    {"password", true, kNameRule},        {"codepage", true, kNameRule},
    {"uri_path", false, kRemoteNameRule}, {"path", false, kRemoteNameRule},
};

/** A live mount does not see these change. Alias and limit of connections are not of the mount. */
constexpr const char* kRemountKeys[] = {"protocol", "hostname", "port",    "account",
                                        "password", "codepage", "uri_path"};

bool HasRequiredKeys(const Json::Value& conf) {
    for (const TextKey& text : kTextKeys) {
        if (text.required && !conf.isMember(text.key)) {
            LOG_ERROR("Profile without %s", text.key);
            return false;
        }
    }
    if (!conf.isMember("port")) {
        LOG_ERROR("Profile without port");
        return false;
    }
    return true;
}

bool AreTypesRight(const Json::Value& conf) {
    for (const TextKey& text : kTextKeys) {
        const auto is_fine = text.required ? IsProfileText : IsOptionalText;
        if (!is_fine(text.key, conf[text.key], text.rule, SourceLine::Here())) {
            return false;
        }
    }
    return IsProfileNumber("port", conf["port"]) &&
           IsOptionalNumber("max_connection", conf["max_connection"]);
}

/** A default that is no port is left to the check of ports. */
void FillDefaultPort(Json::Value& conf) {
    std::string text;
    if (conf["port"].asUInt() == 0 &&
        Protocol::GetByKey(conf["protocol"].asCString(), "DefaultPort", text)) {
        conf["port"] = static_cast<Json::Int64>(strtol(text.c_str(), nullptr, 10));
    }
}

}  // namespace

bool VFSServer::Load(unsigned int uid, VFS_CONFIG_MODE mode, Json::Value conf, bool decrypt, bool) {
    return NoThrow(VFS_ERR_BAD_PARAM, [&] {
        if (!HasRequiredKeys(conf) || !AreTypesRight(conf)) {
            return Fail(VFS_ERR_BAD_PARAM);
        }
        FillDefaultPort(conf);
        if (!IsConfigValid(conf)) {
            return Fail(VFS_ERR_BAD_PARAM);
        }
        if (decrypt) {
            // A password that cannot be read stays as it stands: the profile can still be shown,
            // changed and deleted.
            DecryptCredentials(uid, mode, conf);
        }
        Take(conf);
        connect_status_ = GetConnectStatus(uid);
        return true;
    });
}

void VFSServer::Take(const Json::Value& conf) {
    protocol_ = conf["protocol"].asString();
    hostname_ = conf["hostname"].asString();
    port_ = conf["port"].asUInt();
    alias_ = conf["alias"].asString();
    account_ = conf["account"].asString();
    password_ = conf["password"].asString();
    codepage_ = conf["codepage"].asString();
    uri_path_ = conf["uri_path"].asString();
    path_ = conf["path"].asString();
    max_connection_ = conf["max_connection"].asUInt();
}

bool VFSServer::IsHostnameValid(const char*) {
    return true;
}

bool VFSServer::IsPortValid(unsigned int port) {
    return port >= 1 && port <= 65535;
}

bool VFSServer::IsCodepageValid(const char*) {
    return true;
}

bool VFSServer::IsConfigValid(Json::Value& conf) {
    return NoThrow(VFS_ERR_BAD_PARAM, [&] {
        return (!conf.isMember("hostname") || IsHostnameValid(conf["hostname"].asCString())) &&
               (!conf.isMember("port") || IsPortValid(conf["port"].asUInt())) &&
               (!conf.isMember("alias") || IsAliasValid(conf["alias"].asCString())) &&
               (!conf.isMember("codepage") || IsCodepageValid(conf["codepage"].asCString()));
    });
}

bool VFSServer::GetServerID(std::string& id) {
    const UniqueSoupUri uri(soup_uri_new(nullptr));
    if (!uri) {
        LOG_ERROR("soup_uri_new failed");
        return false;
    }
    soup_uri_set_scheme(uri.get(), protocol_.c_str());
    soup_uri_set_host(uri.get(), hostname_.c_str());
    soup_uri_set_path(uri.get(), "");
    if (!account_.empty()) {
        soup_uri_set_user(uri.get(), account_.c_str());
    }
    if (port_ != 0) {
        soup_uri_set_port(uri.get(), port_);
    }
    const UniqueGText text(soup_uri_to_string(uri.get(), 0));
    if (!text) {
        LOG_ERROR("soup_uri_to_string failed, protocol: %s, host: %s, port: %u", protocol_.c_str(),
                  hostname_.c_str(), port_);
        return false;
    }
    id = Utils::DecodeURI(text.get());
    return true;
}

bool VFSServer::GetURI(std::string& uri) {
    uri = protocol_ + "://" + hostname_;
    if (port_ != 0) {
        uri += ":" + std::to_string(port_);
    }
    if (!uri_path_.empty()) {
        uri += "/" + uri_path_;
    }
    return true;
}

bool VFSServer::IsUpdateNeedsRemount(unsigned int, VFS_CONFIG_MODE, const Json::Value& changes) {
    return NoThrow(VFS_ERR_BAD_PARAM, [&] {
        for (const char* key : kRemountKeys) {
            if (changes.isMember(key)) {
                return true;
            }
        }
        return false;
    });
}

bool VFSServer::DumpToStruct(unsigned int, VFS_CONFIG_MODE, _tag_VFS_CONFIG_INFO_& info) {
    info.protocol = protocol_;
    info.port = port_;
    info.hostname = hostname_;
    info.alias = alias_;
    info.account = account_;
    info.codepage = codepage_;
    info.uri_path = uri_path_;
    GetURI(info.uri);
    info.connect_status = connect_status_;
    info.max_connection = max_connection_;
    return true;
}

}  // namespace ZYROVFS::Server
