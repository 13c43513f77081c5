#include <zosplatform/text.h>

#include "cloud/conflict.h"
#include "cloud/dropbox/dropbox.h"
#include "cloud/dropbox/dropbox_api.h"
#include "cloud/guard.h"
#include "cloud/path_walk.h"
#include "cloud/request.h"
#include "core/json.h"
#include "core/log.h"

namespace ZYROCloud {

using namespace ZYROVFS;
using namespace dropbox;

namespace {

constexpr const char* kCopy = "copy";
constexpr const char* kMove = "move";
constexpr const char* kRename = "rename";
constexpr const char* kCopyRef = "copy_ref";

/** The call that makes `to`, and what it is told. */
Json::Value Describe(const std::string& from, const std::string& to, const std::string& action,
                     const std::string& copy_ref, std::string& url) {
    Json::Value body;
    if (action == kCopyRef) {
        url = Api("files/copy_reference/save");
        body["path"] = to;
        body["copy_reference"] = copy_ref;
    } else {
        url = Api(std::string("files/") + (action == kCopy ? kCopy : kMove));
        body["from_path"] = from;
        body["to_path"] = to;
    }
    return body;
}

/** The service keeps names as they are written and finds them in any case. */
bool IsSamePath(const std::string& a, const std::string& b) {
    return YLIBCUnicodeUTF8StrCaseCmp(a.c_str(), b.c_str()) == 0;
}

}  // namespace

bool Dropbox::CreateFolder(const std::string& parent, const std::string& name,
                           const Json::Value& /*params*/) {
    Json::Value body;
    body["path"] = (parent == "/" ? "" : parent) + "/" + name;
    return Request(*this, kFrame).Post(Api("files/create_folder")).RawBody(body).Send();
}

bool Dropbox::Delete(const std::string& path) {
    Json::Value body;
    body["path"] = path;
    return Request(*this, kFrame)
        .Post(Api("files/delete"))
        .RawBody(body)
        .Unless(VFS_ERR_NOT_FOUND, [] { return true; })
        .Send();
}

bool Dropbox::Copy(const std::string& from, const std::string& to) {
    return MVCP(from, to, kCopy, "", true);
}

bool Dropbox::Move(const std::string& from, const std::string& to) {
    return MVCP(from, to, kMove, "", true);
}

bool Dropbox::Rename(const std::string& path, const std::string& new_name) {
    std::string parent;
    std::string name;
    if (!CutAtLastSlash(path, parent, name)) {
        SetError(VFS_ERR_CLOUD_FAILED, "");
        return false;
    }
    return MVCP(path, parent + "/" + new_name, kRename, "", true);
}

bool Dropbox::CopyFromRef(const std::string& from, const std::string& to, Dropbox* source) {
    std::string reference;
    if (source == nullptr) {
        SetError(VFS_ERR_CLOUD_FAILED, "");
        return false;
    }
    if (!source->GetCopyRef(from, reference)) {
        SetError(VFS_ERR_CLOUD_FAILED, "");
        LOG_ERROR("Faile to get copy_ref from %s, err: %s", from.c_str(),
                  json::toString(source->GetError()).c_str());
        return false;
    }
    return MVCP(from, to, kCopyRef, reference, true);
}

bool Dropbox::GetCopyRef(const std::string& path, std::string& out) {
    return Guard(*this, [&] {
        Json::Value body;
        Json::Value answer;
        body["path"] = path;
        if (path.empty() || !Request(*this, kFrame)
                                 .Post(Api("files/copy_reference/get"))
                                 .RawBody(body)
                                 .Send(answer)) {
            return false;
        }
        for (const char* member : {kCopyRef, "copy_reference"}) {
            if (answer.isMember(member)) {
                out = answer[member].asString();
                return true;
            }
        }
        SetError(VFS_ERR_CLOUD_FAILED, "");
        LOG_ERROR("No copy reference in response");
        return false;
    });
}

bool Dropbox::MVCP(const std::string& from, const std::string& to, const std::string& action,
                   const std::string& copy_ref, bool overwrite) {
    std::string url;
    const Json::Value body = Describe(from, to, action, copy_ref, url);
    Request request(*this, kFrame);
    request.Post(url).RawBody(body);
    if (overwrite && action != kRename) {
        request.Unless(VFS_ERR_CONFLICT, [&] { return ReplaceTarget(from, to, action, copy_ref); });
    }
    return request.Send();
}

bool Dropbox::ReplaceTarget(const std::string& from, const std::string& to,
                            const std::string& action, const std::string& copy_ref) {
    const auto find = [&](Json::Value& item) { return GetFileInfo(to, Json::Value(), item); };
    const auto is_folder = [this](const Json::Value& item) {
        // Items come with one mark or the other. A folder that is taken for a file is lost.
        return IsDir(item) || item.get(".tag", "").asString() == "folder";
    };
    const auto remove = [&](const Json::Value& /*item*/) {
        // An item in its own way would be deleted to make room for itself.
        return (action == kCopyRef || !IsSamePath(from, to)) && Delete(to);
    };
    return ReplaceFile(*this, find, is_folder, remove,
                       [&] { return MVCP(from, to, action, copy_ref, false); });
}

}  // namespace ZYROCloud
