#include "cloud/gdrive/gdrive.h"
#include "cloud/gdrive/gdrive_api.h"
#include "cloud/gdrive/gdrive_body.h"
#include "cloud/request.h"
#include "cloud/target.h"
#include "core/log.h"
#include "zyrovfs/cloud_utils.h"

namespace ZYROCloud {

using namespace ZYROVFS;
using namespace gdrive;

namespace {

std::string Item(const std::string& id, const char* action = "") {
    return Files("/" + id + action);
}

/** The service wants to be told of a body even where there is none. */
Request& WithoutBody(Request& request) {
    return request.Header("Content-Type", "application/json").Header("Content-Length", 0);
}

bool Succeed() {
    return true;
}

}  // namespace

bool GDrive::CreateFolder(const std::string& parent_id, const std::string& name,
                          const Json::Value& params) {
    if (name.empty()) {
        SetError(VFS_ERR_CLOUD_FAILED, "");
        return false;
    }
    Json::Value body;
    // As it is: what the tree makes is looked for under the name that was asked for.
    body["title"] = name;
    if (!parent_id.empty()) {
        body["parents"] = Parents(parent_id);
    }
    body["mimeType"] = kFolderType;
    return Request(*this, kFrame).Post(Files()).Query(params).Body(body).Send();
}

bool GDrive::Rename(const std::string& id, const std::string& name) {
    Json::Value body;
    body["title"] = Utils::EscapeDoubleQuote(name);
    return Request(*this, kFrame).Put(Item(id)).Body(body).Send();
}

bool GDrive::Move(const std::string& old_parent, const std::string& id,
                  const std::string& new_parent) {
    if (old_parent.empty() || id.empty() || new_parent.empty()) {
        SetError(VFS_ERR_NOT_FOUND, "");
        return false;
    }
    Json::Value query;
    query["addParents"] = new_parent;
    query["removeParents"] = old_parent;
    Request request(*this, kFrame);
    return WithoutBody(request.Put(Item(id)).Query(query)).Send();
}

bool GDrive::Move(const std::string& from, const std::string& to) {
    return MoveByPath(*this, from, to);
}

bool GDrive::Copy(const std::string& from, const std::string& to) {
    std::string folder;
    std::string name;
    std::string id;
    std::string parent_id;
    if (!CutTarget(*this, from, folder, name) || !FindCopyIds(*this, from, to, id, parent_id)) {
        return false;
    }
    const std::string new_name = to.substr(to.rfind('/') + 1);
    Json::Value body;
    body["title"] = Utils::EscapeDoubleQuote(new_name.empty() ? name : new_name);
    body["parents"] = Parents(parent_id);
    return Request(*this, kFrame).Post(Item(id, "/copy")).Body(body).Send();
}

bool GDrive::Delete(const std::string& id) {
    Request request(*this, kFrame);
    return WithoutBody(request.To("POST", Item(id, "/trash")))
        .Unless(VFS_ERR_NOT_FOUND, Succeed)
        .Send();
}

bool GDrive::DeleteStarred(const std::string& id) {
    Json::Value body;
    body["labels"]["starred"] = false;
    return Request(*this, kFrame)
        .Put(Item(id))
        .Body(body)
        .Unless(VFS_ERR_NOT_FOUND, Succeed)
        .Send();
}

bool GDrive::SetModifiedDate(const std::string& id, const std::string& date) {
    if (id.empty()) {
        LOG_ERROR("File ID is empty");
        return false;
    }
    Json::Value query;
    query["setModifiedDate"] = true;
    Json::Value body;
    body["modifiedDate"] = date;
    return Request(*this, kFrame).Put(Item(id)).Query(query).Body(body).Send();
}

}  // namespace ZYROCloud
