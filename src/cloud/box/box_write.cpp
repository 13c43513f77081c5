#include "cloud/box/box.h"
#include "cloud/box/box_api.h"
#include "cloud/guard.h"
#include "cloud/request.h"
#include "cloud/target.h"

namespace ZYROCloud {

using namespace ZYROVFS;
using namespace box;

namespace {

Json::Value Into(const std::string& parent_id) {
    Json::Value body;
    body["parent"]["id"] = StripIdPrefix(parent_id);
    return body;
}

}  // namespace

bool Box::CreateFolder(const std::string& parent, const std::string& name,
                       const Json::Value& /*params*/) {
    Json::Value body = Into(parent);
    body["name"] = name;
    return Request(*this, kFrame).Post(Api("folders")).Body(body).Send();
}

bool Box::Delete(const std::string& id) {
    Json::Value query;
    query["recursive"] = true;
    return Request(*this, kFrame).Delete(Api(id)).Query(query).Send();
}

bool Box::Rename(const std::string& id, const std::string& new_name) {
    Json::Value body;
    body["name"] = new_name;
    return Request(*this, kFrame).Put(Api(id)).Body(body).Send();
}

bool Box::Move(const std::string& /*from*/, const std::string& /*to*/) {
    return false;
}

bool Box::Move(const std::string& /*old_parent*/, const std::string& id,
               const std::string& new_parent) {
    if (id.empty() || new_parent.empty()) {
        SetError(VFS_ERR_NOT_FOUND, "");
        return false;
    }
    return Request(*this, kFrame).Put(Api(id)).Body(Into(new_parent)).Send();
}

bool Box::Copy(const std::string& from, const std::string& to) {
    return DoCopy(from, to, true);
}

bool Box::DoCopy(const std::string& from, const std::string& to, bool overwrite) {
    // Without a name in the body the copy has its source's name, whatever `to` ends in.
    const auto describe = [this](const std::string& id, const std::string& parent_id) {
        Request request(*this, kFrame);
        request.Post(Api(id + "/copy")).Body(Into(parent_id));
        return request;
    };
    const auto find = [&](Json::Value& item) {
        return GetFileInfoByPathFromServer("", to, Json::Value(Json::objectValue), "", item);
    };
    return CopyByPath(*this, from, to, overwrite, describe, find);
}

bool Box::SetModifiedDate(const std::string& /*id*/, const std::string& /*date*/) {
    return true;
}

}  // namespace ZYROCloud
