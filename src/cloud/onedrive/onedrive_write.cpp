#include "cloud/onedrive/onedrive.h"
#include "cloud/onedrive/onedrive_api.h"
#include "cloud/request.h"
#include "cloud/target.h"

namespace ZYROCloud {

using namespace ZYROVFS;
using namespace onedrive;

namespace {

Json::Value Only(const char* member, const std::string& text) {
    Json::Value body;
    body[member] = text;
    return body;
}

}  // namespace

bool OneDrive::CreateFolder(const std::string& parent, const std::string& name,
                            const Json::Value& /*params*/) {
    const std::string url = ItemUrl(parent == "root" ? "" : parent);
    return Request(*this, kFrame).Post(url).Body(Only("name", name)).Send();
}

bool OneDrive::Delete(const std::string& id) {
    return Request(*this, kFrame).Delete(Api(id)).Send();
}

bool OneDrive::Rename(const std::string& id, const std::string& new_name) {
    return Request(*this, kFrame).Put(Api(id)).Body(Only("name", new_name)).Send();
}

bool OneDrive::Move(const std::string& /*old_parent*/, const std::string& id,
                    const std::string& new_parent) {
    if (id.empty() || new_parent.empty()) {
        SetError(VFS_ERR_NOT_FOUND, "");
        return false;
    }
    return Request(*this, kFrame).To("MOVE", Api(id)).Body(Only("destination", new_parent)).Send();
}

bool OneDrive::Move(const std::string& from, const std::string& to) {
    return MoveByPath(*this, from, to);
}

bool OneDrive::Copy(const std::string& from, const std::string& to) {
    return DoCopy(from, to, true);
}

bool OneDrive::DoCopy(const std::string& from, const std::string& to, bool overwrite) {
    // The copy has its source's name, whatever `to` ends in.
    const auto describe = [this](const std::string& id, const std::string& parent_id) {
        Request request(*this, kFrame);
        request.To("COPY", Api(id)).Body(Only("destination", parent_id));
        return request;
    };
    const auto find = [&](Json::Value& item) {
        return GetFileInfoByPathFromServer(to, "", Json::Value(Json::objectValue), "", item);
    };
    return CopyByPath(*this, from, to, overwrite, describe, find);
}

bool OneDrive::SetModifiedDate(const std::string& /*id*/, const std::string& /*date*/) {
    return true;
}

}  // namespace ZYROCloud
