#include <zosplatform/text.h>

#include "cloud/conflict.h"
#include "cloud/dropbox/dropbox.h"
#include "cloud/dropbox/dropbox_api.h"
#include "cloud/guard.h"
#include "cloud/path_walk.h"
#include "cloud/request.h"
#include "core/json.h"
#include "core/json_member.h"
#include "core/log.h"
#include "mount/glib_handle.h"

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

/** A letter and its accent as one character; a path that is no UTF-8 as it is. */
std::string Composed(const std::string& path) {
    const UniqueGText text(g_utf8_normalize(path.c_str(), -1, G_NORMALIZE_DEFAULT_COMPOSE));
    return text == nullptr ? path : text.get();
}

/** The service keeps names as they are written and finds them in any case and either spelling. */
bool IsSamePath(const std::string& a, const std::string& b) {
    return YLIBCUnicodeUTF8StrCaseCmp(Composed(a).c_str(), Composed(b).c_str()) == 0;
}

/** Whether an answer describes an item; it has one mark of its kind or the other. */
bool TellsKind(const Json::Value& item) {
    const std::string tag = json::TextOf(item, ".tag");
    return json::MemberOf(item, "is_dir").isBool() || tag == "file" || tag == "folder";
}

/** What names a file wherever it is; "" when the service does not tell. */
std::string IdOf(const Json::Value& item) {
    return json::TextOf(item, "id");
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
    Json::Value reference;
    if (source == nullptr) {
        SetError(VFS_ERR_CLOUD_FAILED, "");
        return false;
    }
    if (!source->AskCopyRef(from, reference)) {
        SetError(VFS_ERR_CLOUD_FAILED, "");
        LOG_ERROR("Faile to get copy_ref from %s, err: %s", from.c_str(),
                  json::toString(source->GetError()).c_str());
        return false;
    }
    const std::string id = IdOf(json::MemberOf(reference, "metadata"));
    const bool one_account = MayShareAccount(*source);
    const auto is_source = [&](const Json::Value& item) {
        return (!id.empty() && id == IdOf(item)) || (one_account && IsSamePath(from, to));
    };
    return SendChange({from, to, kCopyRef, reference[kCopyRef].asString()}, true, is_source);
}

/** Two profiles of different ids have different accounts; of others nothing is known. */
bool Dropbox::MayShareAccount(const Dropbox& other) const {
    return server_id.empty() || other.server_id.empty() || IsSamePath(server_id, other.server_id);
}

bool Dropbox::GetCopyRef(const std::string& path, std::string& out) {
    Json::Value reference;
    if (!AskCopyRef(path, reference)) {
        return false;
    }
    out = reference[kCopyRef].asString();
    return true;
}

/** The answer, with the reference as a text in member "copy_ref". */
bool Dropbox::AskCopyRef(const std::string& path, Json::Value& out) {
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
                answer[kCopyRef] = answer[member].asString();
                out = answer;
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
    // A reference alone does not tell whose item it is.
    return SendChange({from, to, action, copy_ref}, overwrite,
                      [&](const Json::Value& /*item*/) { return IsSamePath(from, to); });
}

bool Dropbox::SendChange(const Change& what, bool overwrite, const IsSource& is_source) {
    std::string url;
    const Json::Value body = Describe(what.from, what.to, what.action, what.copy_ref, url);
    Request request(*this, kFrame);
    request.Post(url).RawBody(body);
    if (overwrite && what.action != kRename) {
        request.Unless(VFS_ERR_CONFLICT, [&] { return ReplaceTarget(what, is_source); });
    }
    return request.Send();
}

/** The file at the target gives way, unless it is the one that is on its way there. */
bool Dropbox::ReplaceTarget(const Change& what, const IsSource& is_source) {
    const auto find = [&](Json::Value& item) {
        if (!GetFileInfo(what.to, Json::Value(), item)) {
            return false;
        }
        if (!TellsKind(item)) {
            SetError(VFS_ERR_CLOUD_FAILED, "");
            LOG_ERROR("No item in response, %s", what.to.c_str());
            return false;
        }
        return true;
    };
    const auto is_folder = [this](const Json::Value& item) {
        // Items come with one mark or the other. A folder that is taken for a file is lost.
        return IsDir(item) || item.get(".tag", "").asString() == "folder";
    };
    const auto remove = [&](const Json::Value& item) {
        return !is_source(item) && Delete(what.to);
    };
    return ReplaceFile(*this, find, is_folder, remove,
                       [&] { return SendChange(what, false, is_source); });
}

}  // namespace ZYROCloud
