#include "support/cloudsim/gdrive_json.h"

#include "support/cloudsim/account.h"
#include "support/cloudsim/date.h"

namespace cloudsim::gdrive {
namespace {

Json::Value Sharer(const Node& node) {
    Json::Value user;
    user["kind"] = "drive#user";
    user["displayName"] = node.sharer.substr(0, node.sharer.find('@'));
    user["isAuthenticatedUser"] = false;
    user["permissionId"] = "09999999";
    user["emailAddress"] = node.sharer;
    return user;
}

Json::Value Owner(const View& view, const Node& node) {
    return node.sharer.empty() ? User(view.account) : Sharer(node);
}

std::string SelfLink(const View& view, const std::string& id) {
    return view.api + "/drive/v2/files/" + id;
}

Json::Value Labels(const Node& node) {
    Json::Value labels;
    labels["starred"] = node.starred;
    labels["hidden"] = false;
    labels["trashed"] = node.IsTrashed();
    labels["restricted"] = false;
    labels["viewed"] = true;
    return labels;
}

Json::Value Parents(const View& view, const Node& node) {
    Json::Value parents = Json::arrayValue;
    for (const Node* parent : node.Parents()) {
        Json::Value reference;
        reference["kind"] = "drive#parentReference";
        reference["id"] = parent->id;
        reference["selfLink"] = SelfLink(view, node.id) + "/parents/" + parent->id;
        reference["parentLink"] = SelfLink(view, parent->id);
        reference["isRoot"] = parent->id == view.root;
        parents.append(std::move(reference));
    }
    return parents;
}

Json::Value Permission(const View& view, const Node& node) {
    Json::Value permission;
    permission["kind"] = "drive#permission";
    permission["id"] = "me";
    permission["selfLink"] = SelfLink(view, node.id) + "/permissions/me";
    permission["role"] = node.sharer.empty() ? "owner" : "reader";
    permission["type"] = "user";
    return permission;
}

bool HasBytes(const Node& node) {
    return !node.folder && !IsDocument(node);
}

/** Only of what has bytes. */
Json::Value IfBytes(const Node& node, const std::string& text) {
    return HasBytes(node) ? Json::Value(text) : Json::Value();
}

std::string Size(const Node& node) {
    return node.content == nullptr ? "0" : std::to_string(node.content->Size());
}

std::string Extension(const Node& node) {
    const size_t dot = node.name.rfind('.');
    return dot == std::string::npos ? "" : node.name.substr(dot + 1);
}

std::string AlternateLink(const View& view, const Node& node) {
    if (node.folder) {
        return view.content + "/folderview?id=" + node.id + "&usp=drivesdk";
    }
    const std::string type = MimeType(node);
    const std::string kind = IsDocument(node) ? type.substr(type.rfind('.') + 1) : "file";
    return view.content + "/" + kind + "/d/" + node.id + "/edit?usp=drivesdk";
}

Json::Value ExportLinks(const View& view, const Node& node) {
    Json::Value links;
    const std::string type = MimeType(node);
    for (const auto& [mime_type, word] : ExportFormats(type)) {
        links[mime_type] = view.content + "/feeds/download/" + type.substr(type.rfind('.') + 1) +
                           "s/Export?id=" + node.id + "&exportFormat=" + word;
    }
    return links;
}

Json::Value Modified(const Node& node) {
    return UtcDate({node.content_modified, node.modified_millis});
}

using Maker = std::function<Json::Value(const View&, const Node&)>;

Maker Always(const Json::Value& value) {
    return [value](const View&, const Node&) { return value; };
}

Maker ByNode(Json::Value (*make)(const Node&)) {
    return [make](const View&, const Node& node) { return make(node); };
}

Maker OfShared(const std::function<Json::Value(const Node&)>& make) {
    return [make](const View&, const Node& node) {
        return node.shared == 0 ? Json::Value() : make(node);
    };
}

/** A null value is left out. */
using MakerTable = std::map<std::string, Maker>;

/** What every item has. */
MakerTable CommonMakers() {
    return {
        {"kind", Always("drive#file")},
        {"id", ByNode([](const Node& n) { return Json::Value(n.id); })},
        {"etag", ByNode([](const Node& n) {
             return Json::Value("\"" + n.id + "/" + std::to_string(n.version) + "\"");
         })},
        {"selfLink", [](const View& v, const Node& n) { return SelfLink(v, n.id); }},
        {"alternateLink", [](const View& v, const Node& n) { return AlternateLink(v, n); }},
        {"iconLink", [](const View& v, const Node&) { return v.content + "/images/icon.png"; }},
        {"title", ByNode([](const Node& n) { return Json::Value(n.name); })},
        {"mimeType", ByNode([](const Node& n) { return Json::Value(MimeType(n)); })},
        {"description", ByNode([](const Node& n) {
             return n.description.empty() ? Json::Value() : Json::Value(n.description);
         })},
        {"labels", ByNode(Labels)},
        {"createdDate", ByNode([](const Node& n) {
             return Json::Value(UtcDate({n.created, 0}));
         })},
        {"modifiedDate", ByNode(Modified)},
        {"modifiedByMeDate", ByNode(Modified)},
        {"lastViewedByMeDate", ByNode([](const Node& n) {
             return Json::Value(UtcDate({n.modified, 0}));
         })},
        {"markedViewedByMeDate", Always("1970-01-01T00:00:00.000Z")},
        {"version", ByNode([](const Node& n) { return Json::Value(std::to_string(n.version)); })},
        {"parents", Parents},
        {"explicitlyTrashed", ByNode([](const Node& n) {
             return n.IsTrashed() ? Json::Value(n.trashed) : Json::Value();
         })},
        {"appDataContents", Always(false)},
    };
}

/** Who may do what with it. */
MakerTable PeopleMakers() {
    return {
        {"sharedWithMeDate", OfShared([](const Node& n) {
             return Json::Value(UtcDate({n.shared, 0}));
         })},
        {"sharingUser", OfShared(Sharer)},
        {"userPermission", Permission},
        {"ownerNames",
         [](const View& v, const Node& n) {
             Json::Value names;
             names.append(Owner(v, n)["displayName"]);
             return names;
         }},
        {"owners",
         [](const View& v, const Node& n) {
             Json::Value owners;
             owners.append(Owner(v, n));
             return owners;
         }},
        {"lastModifyingUserName",
         [](const View& v, const Node& n) { return Owner(v, n)["displayName"]; }},
        {"lastModifyingUser", Owner},
        {"ownedByMe", ByNode([](const Node& n) { return Json::Value(n.sharer.empty()); })},
        {"editable", ByNode([](const Node& n) { return Json::Value(n.sharer.empty()); })},
        {"canComment", Always(true)},
        {"copyable", ByNode([](const Node& n) { return Json::Value(!n.folder); })},
        {"writersCanShare", Always(true)},
        {"shared", ByNode([](const Node& n) { return Json::Value(!n.sharer.empty()); })},
    };
}

/** The bytes and where they are. */
MakerTable ContentMakers() {
    return {
        {"webContentLink",
         [](const View& v, const Node& n) {
             return IfBytes(n, v.content + "/uc?id=" + n.id + "&export=download");
         }},
        {"exportLinks",
         [](const View& v, const Node& n) {
             return IsDocument(n) ? ExportLinks(v, n) : Json::Value();
         }},
        {"downloadUrl", [](const View& v, const Node& n) { return IfBytes(n, v.download_url(n)); }},
        {"originalFilename", ByNode([](const Node& n) { return IfBytes(n, n.name); })},
        {"fileExtension", ByNode([](const Node& n) { return IfBytes(n, Extension(n)); })},
        {"fullFileExtension", ByNode([](const Node& n) { return IfBytes(n, Extension(n)); })},
        {"md5Checksum",
         [](const View& v, const Node& n) {
             const std::string sum = HasBytes(n) ? v.md5(n) : "";
             return sum.empty() ? Json::Value() : Json::Value(sum);
         }},
        {"fileSize", ByNode([](const Node& n) { return IfBytes(n, Size(n)); })},
        {"quotaBytesUsed", ByNode([](const Node& n) {
             return Json::Value(HasBytes(n) && !n.weightless ? Size(n) : "0");
         })},
        {"headRevisionId", ByNode([](const Node& n) { return IfBytes(n, n.version_id); })},
    };
}

const MakerTable& Makers() {
    static const MakerTable makers = [] {
        MakerTable all = CommonMakers();
        all.merge(PeopleMakers());
        all.merge(ContentMakers());
        return all;
    }();
    return makers;
}

}  // namespace

Json::Value File(const View& view, const Node& node, const Mask& mask) {
    Json::Value file = Json::objectValue;
    const auto put = [&](const std::string& field, const Maker& make) {
        Json::Value value = make(view, node);
        if (!value.isNull()) {
            file[field] = mask.Of(field).Apply(value);
        }
    };
    if (mask.Wants("*")) {
        for (const auto& [field, make] : Makers()) {
            put(field, make);
        }
        return file;
    }
    for (const auto& [field, below] : mask.members) {
        const auto maker = Makers().find(field);
        if (maker != Makers().end()) {
            put(field, maker->second);
        }
    }
    return file;
}

Json::Value User(const Account& account) {
    Json::Value user;
    user["kind"] = "drive#user";
    user["displayName"] = account.Name();
    user["isAuthenticatedUser"] = true;
    user["permissionId"] = "0" + account.Id();
    user["emailAddress"] = account.Email();
    return user;
}

std::string ErrorText(int status, const std::string& reason, const std::string& message,
                      const std::string& parameter) {
    const bool limit = reason.find("LimitExceeded") != std::string::npos;
    Json::Value cause;
    cause["domain"] = limit ? "usageLimits" : "global";
    cause["reason"] = reason;
    cause["message"] = message;
    if (status == 401 || !parameter.empty()) {
        cause["locationType"] = status == 401 ? "header" : "parameter";
        cause["location"] = status == 401 ? "Authorization" : parameter;
    }
    Json::Value answer;
    answer["error"]["errors"].append(std::move(cause));
    answer["error"]["code"] = status;
    answer["error"]["message"] = message;
    return OneLine(answer);
}

Reply Error(int status, const std::string& reason, const std::string& message,
            const std::string& parameter) {
    return {status, ErrorText(status, reason, message, parameter),
            "application/json; charset=UTF-8"};
}

Failure NotFound(const std::string& id) {
    return {Error(404, "notFound", "File not found: " + id, "fileId")};
}

Failure NoPermission(const Node& node) {
    return {Error(403, "insufficientFilePermissions",
                  "The user does not have sufficient permissions for file " + node.id)};
}

}  // namespace cloudsim::gdrive
