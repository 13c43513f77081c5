#include <algorithm>
#include <cstring>
#include <vector>

#include "core/error_cell.h"
#include "core/log.h"
#include "core/no_throw.h"
#include "server/config_compare.h"
#include "server/config_document.h"
#include "server/server_mgr.h"
#include "zyrovfs/protocol.h"
#include "zyrovfs/server.h"

namespace ZYROVFS::Server {
namespace {

using Info = _tag_VFS_CONFIG_INFO_;
using Infos = std::vector<Info>;

bool Describe(unsigned int uid, VFS_CONFIG_MODE mode, Json::Value entry, Info& info) {
    return NoThrow(VFS_ERR_BAD_PARAM, [&] {
        ServerMgr mgr;
        return mgr.Load(uid, mode, entry, true, mode == VFS_CONFIG_CONNECT) &&
               mgr.DumpToStruct(uid, mode, info);
    });
}

/** A damaged entry is left out, so that the rest of the user's list can be shown. */
Infos Collect(unsigned int uid, VFS_CONFIG_MODE mode, const Json::Value& servers,
              const char* protocol) {
    Infos infos;
    for (auto it = servers.begin(); it != servers.end(); ++it) {
        if (protocol != nullptr && *protocol != '\0' && !HasText(*it, "protocol", protocol)) {
            continue;
        }
        Info info;
        if (!Describe(uid, mode, *it, info)) {
            LOG_ERROR("Skip malformed server config, serverID=%s, code=%u", it.name().c_str(),
                      GetError());
            continue;
        }
        info.id = it.name();
        infos.push_back(std::move(info));
    }
    return infos;
}

void Sort(Infos& infos, const char* sortBy, bool ascending) {
    std::stable_sort(infos.begin(), infos.end(), ConfigCompare(sortBy));
    if (!ascending) {
        std::reverse(infos.begin(), infos.end());  // equal entries change places, too
    }
}

/** Pages go round: one step behind the last entry lies the end of the list, and then the first
 * entry again. */
void CutPage(Infos& infos, unsigned long offset, unsigned long limit) {
    infos.erase(infos.begin(),
                infos.begin() + static_cast<Infos::difference_type>(offset % (infos.size() + 1)));
    if (infos.size() > limit) {
        infos.resize(limit);
    }
}

Json::Value SplitApi(std::string text) {
    Json::Value items(Json::arrayValue);
    char* rest = nullptr;
    for (char* item = strtok_r(text.data(), ",", &rest); item != nullptr;
         item = strtok_r(nullptr, ",", &rest)) {
        items.append(item);
    }
    return items;
}

/** Null when the catalogue does not have the protocol. */
const Json::Value& FindProtocol(const Json::Value& catalogue, const std::string& protocol) {
    const auto found = std::find_if(
        catalogue.begin(), catalogue.end(),
        [&](const Json::Value& element) { return element["protocol"].asString() == protocol; });
    return found == catalogue.end() ? Json::Value::nullSingleton() : *found;
}

Json::Value ToJson(const Info& info, const Json::Value& words) {
    Json::Value entry;
    entry["id"] = info.id;
    entry["protocol"] = info.protocol;
    entry["port"] = info.port;
    entry["hostname"] = info.hostname;
    entry["alias"] = info.alias;
    entry["account"] = info.account;
    entry["codepage"] = info.codepage;
    entry["api"] = SplitApi(words.isNull() ? "" : words["api"].asString());
    entry["protocol_name"] = words.isNull() ? info.protocol : words["name"].asString();
    entry["uri_path"] = info.uri_path;
    entry["uri"] = info.uri;
    entry["connect_status"] = info.connect_status;
    return entry;
}

bool PutOut(const Infos& infos, Json::Value& array) {
    Json::Value catalogue;
    if (!Protocol::ListProtocol(catalogue)) {
        LOG_ERROR("Failed to list protocol, code=%u", GetError());
        return Fail(VFS_ERR_CONFIG_READ);
    }
    array = Json::Value(Json::arrayValue);
    for (const Info& info : infos) {
        array.append(ToJson(info, FindProtocol(catalogue, info.protocol)));
    }
    return true;
}

}  // namespace

bool List(unsigned int uid, VFS_CONFIG_MODE mode, const char* protocol, const char* sortBy,
          bool ascending, unsigned long offset, unsigned long limit, Json::Value& out) {
    return NoThrow(VFS_ERR_CONFIG_READ, [&] {
        Json::Value doc;
        if (!CfgAccess(uid, mode, VFS_CONFIG_READ, doc)) {
            return Fail(VFS_ERR_CONFIG_READ);
        }
        Infos infos = Collect(uid, mode, ServersOf(doc), protocol);
        out = Json::Value(Json::objectValue);
        out["total"] = Json::UInt64(infos.size());
        out["offset"] = Json::UInt64(offset);
        if (sortBy != nullptr) {
            Sort(infos, sortBy, ascending);
        }
        if (limit != 0) {
            CutPage(infos, offset, limit);
        }
        return PutOut(infos, out[mode == VFS_CONFIG_CONNECT ? "connections" : "profiles"]);
    });
}

}  // namespace ZYROVFS::Server
