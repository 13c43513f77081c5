#include "server/server_cloud.h"

#include <cstdlib>
#include <ctime>
#include <limits>

#include "cloud/account.h"
#include "core/error_cell.h"
#include "core/json.h"
#include "core/log.h"
#include "core/no_throw.h"
#include "server/profile_text.h"
#include "server/server_account.h"

namespace ZYROVFS::Server {
namespace {

constexpr const char* kTokens[] = {"access_token", "refresh_token"};

bool HasRequiredKeys(const CloudAccountRules& rules, const Json::Value& conf) {
    std::vector<const char*> required = {"protocol", "alias", "access_token", "client_id"};
    if (rules.expiring) {
        required.push_back("refresh_token");
    }
    for (const char* key : required) {
        if (!conf.isMember(key)) {
            LOG_ERROR("Profile without %s", key);
            return false;
        }
    }
    if (rules.expiring && !conf.isMember("expire_time") && !conf.isMember("expires_in")) {
        LOG_ERROR("Profile without expire_time");
        return false;
    }
    return true;
}

bool AreTextsFine(const Json::Value& conf) {
    return IsProfileText("protocol", conf["protocol"], kNameRule) &&
           IsProfileText("alias", conf["alias"], kNameRule) &&
           IsProfileText("access_token", conf["access_token"], kNameRule) &&
           IsProfileText("client_id", conf["client_id"], kNameRule) &&
           IsOptionalText("refresh_token", conf["refresh_token"], kNameRule) &&
           IsOptionalText("expire_time", conf["expire_time"], kNameRule) &&
           IsOptionalText("expires_in", conf["expires_in"], kNameRule) &&
           IsOptionalText("email", conf["email"], kNameRule) &&
           IsOptionalText("account_info", conf["account_info"], kAnyLengthRule) &&
           IsOptionalText("path", conf["path"], kRemoteNameRule);
}

/** Decimal text of now and so many seconds; a number beyond all times stays at the last one. */
std::string EndOf(const std::string& seconds) {
    long long end = 0;
    if (__builtin_add_overflow(static_cast<long long>(time(nullptr)),
                               strtoll(seconds.c_str(), nullptr, 10), &end)) {
        end = seconds[0] == '-' ? 0 : std::numeric_limits<long long>::max();
    }
    return std::to_string(end);
}

std::string ExpireTimeOf(const CloudAccountRules& rules, const Json::Value& conf) {
    const bool stored = conf.isMember("expire_time");
    const bool given = conf.isMember("expires_in");
    if (given && (rules.expires_in_first || !stored)) {
        return EndOf(conf["expires_in"].asString());
    }
    return stored ? conf["expire_time"].asString() : "";
}

}  // namespace

bool CloudServer::AskService(const CloudAccountRules& rules, unsigned int uid, Json::Value& conf) {
    // With its id the driver can write a renewed token into the profile, where there is one.
    conf["server_id"] = rules.scheme + conf.get("email", "").asString();
    Json::Value params(Json::objectValue);
    if (rules.fields != nullptr) {
        params["fields"] = rules.fields;
    }
    Json::Value answer;
    Json::Value error;
    const bool asked = ZYROCloud::AskAccount(rules.type, uid, conf, params, answer, error);
    const bool complete =
        rules.needed == nullptr || (answer.isObject() && answer.isMember(rules.needed));
    if (!asked || !complete) {
        LOG_ERROR_AT(rules.at, "GetAccountInfo failed, %s", json::toString(error).c_str());
        // Without a driver there is no record either.
        const int code =
            error.isObject() ? error.get("code", VFS_ERR_NONE).asInt() : VFS_ERR_FAILED;
        // An answer that came, but does not tell whose account it is, leaves no code.
        return Fail(code == VFS_ERR_NONE ? VFS_ERR_CLOUD_FAILED : static_cast<__tag_vfs_err_>(code),
                    rules.at);
    }
    return NoThrow(
        VFS_ERR_CLOUD_FAILED,
        [&] {
            const Json::Value* email = &answer;
            for (const char* member : rules.email) {
                email = &(*email)[member];
            }
            email_ = email->asString();
            account_info_ = json::toString(rules.document ? answer[rules.document] : answer);
            return true;
        },
        rules.at);
}

void CloudServer::TakeProfile(const CloudAccountRules& rules, const Json::Value& conf) {
    protocol_ = conf["protocol"].asString();
    alias_ = conf["alias"].asString();
    access_token_ = conf["access_token"].asString();
    refresh_token_ = conf.get("refresh_token", "").asString();
    path_ = conf.get("path", "").asString();
    client_id_ = conf["client_id"].asString();
    expire_time_ = ExpireTimeOf(rules, conf);
}

bool CloudServer::LoadBy(const CloudAccountRules& rules, unsigned int uid, VFS_CONFIG_MODE mode,
                         Json::Value& conf, bool decrypt, bool online) {
    return NoThrow(
        VFS_ERR_BAD_PARAM,
        [&] {
            if (!HasRequiredKeys(rules, conf) || !AreTextsFine(conf)) {
                return Fail(VFS_ERR_BAD_PARAM, rules.at);
            }
            if (decrypt) {
                // A token that does not decipher is refused by the service, with a better code.
                DecryptCredentials(uid, mode, conf);
            }
            if (!online) {
                email_ = conf.get("email", "").asString();
                account_info_ = conf.get("account_info", "").asString();
            } else if (!AskService(rules, uid, conf)) {
                return false;
            }
            if (!IsConfigValid(conf)) {
                return Fail(VFS_ERR_BAD_PARAM, rules.at);
            }
            TakeProfile(rules, conf);
            connect_status_ = GetConnectStatus(uid);
            return true;
        },
        rules.at);
}

bool CloudServer::IsConfigValid(Json::Value& conf) {
    return !conf.isMember("alias") || IsAliasValid(conf["alias"].asCString());
}

bool CloudServer::GetAccountName(std::string& name) {
    name = AccountNameOf(email_);
    return true;
}

bool CloudServer::GetURI(std::string& uri) {
    return GetServerID(uri);
}

bool CloudServer::Mount(unsigned int uid, VFS_CONFIG_MODE mode, const Json::Value& conf,
                        bool force) {
    std::string id;
    if (!GetServerID(id)) {
        LOG_ERROR("Failed to get server ID, uid=%u, mode=%u, code=%u", uid, mode, GetError());
        return Fail(VFS_ERR_INVALID_SERVER);
    }
    Json::Value credentials(Json::objectValue);
    credentials["access_token"] = access_token_;
    credentials["refresh_token"] = refresh_token_;
    credentials["expire_time"] = expire_time_;
    credentials["account_info"] = account_info_;
    return MountAccount(uid, email_, json::toString(credentials), id, conf, force);
}

bool CloudServer::Unmount(unsigned int uid, VFS_CONFIG_MODE) {
    std::string id;
    if (!GetServerID(id)) {
        LOG_ERROR("Failed to get server ID");
        return Fail(VFS_ERR_INVALID_SERVER);
    }
    return UnmountServer(uid, id, nullptr);
}

bool CloudServer::CreateJsonObj(unsigned int uid, VFS_CONFIG_MODE mode, Json::Value& out,
                                bool encrypt) {
    out = Json::Value(Json::objectValue);
    out["protocol"] = protocol_;
    out["alias"] = alias_.empty() ? email_ : alias_;
    out["expire_time"] = expire_time_;
    out["email"] = email_;
    out["account_info"] = account_info_;
    out["client_id"] = client_id_;
    out["path"] = "";
    // A token that a service does not give stays an empty text, which is no secret.
    if (!WriteSecret("access_token", access_token_, encrypt && !access_token_.empty(), out) ||
        !WriteSecret("refresh_token", refresh_token_, encrypt && !refresh_token_.empty(), out)) {
        return false;
    }
    std::string id;
    if (!GetServerID(id)) {
        LOG_ERROR("Failed to get server ID");
        return Fail(VFS_ERR_INVALID_SERVER);
    }
    return mode != VFS_CONFIG_CONNECT || WriteAccountPath(uid, id, path_, out);
}

bool CloudServer::DecryptCredentials(unsigned int, VFS_CONFIG_MODE, Json::Value& conf) {
    return NoThrow(VFS_ERR_FAILED, [&] {
        for (const char* key : kTokens) {
            if (conf.isMember(key) && !conf[key].asString().empty() && !DecipherSecret(key, conf)) {
                return false;
            }
        }
        return true;
    });
}

bool CloudServer::RemoveCredentials(unsigned int, VFS_CONFIG_MODE, Json::Value& conf) {
    if (conf.isObject()) {
        for (const char* key : kTokens) {
            conf.removeMember(key);
        }
    }
    return true;
}

bool CloudServer::DeletePostProcess(unsigned int, VFS_CONFIG_MODE) {
    return true;
}

bool CloudServer::DumpToStruct(unsigned int, VFS_CONFIG_MODE, _tag_VFS_CONFIG_INFO_& info) {
    std::string uri;
    GetURI(uri);
    DumpAccount(protocol_, uri, alias_, email_, connect_status_, info);
    return true;
}

bool CloudServer::IsUpdateNeedsRemount(unsigned int, VFS_CONFIG_MODE, const Json::Value&) {
    return false;
}

}  // namespace ZYROVFS::Server
