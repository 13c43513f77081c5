#include "support/cloudsim/gdrive_fields.h"

#include "support/cloudsim/gdrive_json.h"

namespace cloudsim::gdrive {
namespace {

const Mask kAll;

/** `names` is a mask's text of names that have nothing below them. */
Schema Plain(const std::string& names) {
    Schema schema;
    for (size_t start = 0; start < names.size();) {
        const size_t end = std::min(names.find(',', start), names.size());
        schema.members[names.substr(start, end - start)];
        start = end + 1;
    }
    return schema;
}

Schema With(Schema schema, std::map<std::string, Schema> more) {
    schema.members.merge(more);
    return schema;
}

const Schema kUser =
    Plain("kind,displayName,picture,isAuthenticatedUser,permissionId,emailAddress");

class Parser {
  public:
    Parser(const std::string& text, const Schema& schema) : text_(text), schema_(schema) {}

    Mask Parse() {
        Mask mask;
        List(mask, schema_);
        return at_ == text_.size() ? mask : Fail(text_.substr(at_));
    }

  private:
    [[noreturn]] static Mask Fail(const std::string& what) {
        throw Failure{Error(400, "invalidParameter", "Invalid field selection " + what, "fields")};
    }

    void List(Mask& mask, const Schema& schema) {
        Path(mask, schema);
        while (Skip(',')) {
            Path(mask, schema);
        }
    }

    void Path(Mask& mask, const Schema& schema) {
        static const char kLetters[] =
            "abcdefghijklmnopqrstuvwxyzABCDEFGHIJKLMNOPQRSTUVWXYZ0123456789_-*";
        const size_t end = std::min(text_.find_first_not_of(kLetters, at_), text_.size());
        const std::string name = text_.substr(at_, end - at_);
        const auto known = schema.members.find(name);
        const bool open = schema.members.count("*") != 0;
        if (name.empty() || (known == schema.members.end() && name != "*" && !open)) {
            Fail(name.empty() ? text_.substr(at_) : name);
        }
        at_ = end;
        Mask& member = mask.members[name];
        const Schema& below = known == schema.members.end() ? kAll : known->second;
        if (Skip('/')) {
            Path(member, below);
        } else if (Skip('(')) {
            List(member, below);
            if (!Skip(')')) {
                Fail(name);
            }
        }
    }

    bool Skip(char c) {
        const bool there = at_ < text_.size() && text_[at_] == c;
        at_ += there ? 1 : 0;
        return there;
    }

    const std::string& text_;
    const Schema& schema_;
    size_t at_ = 0;
};

}  // namespace

const Schema kFileSchema = With(
    Plain("kind,id,etag,selfLink,webContentLink,alternateLink,embedLink,iconLink,thumbnailLink,"
          "title,mimeType,description,createdDate,modifiedDate,modifiedByMeDate,lastViewedByMeDate,"
          "markedViewedByMeDate,sharedWithMeDate,version,downloadUrl,originalFilename,"
          "fileExtension,fullFileExtension,md5Checksum,fileSize,quotaBytesUsed,ownerNames,"
          "lastModifyingUserName,editable,copyable,writersCanShare,shared,explicitlyTrashed,"
          "appDataContents,headRevisionId,webViewLink,ownedByMe,canComment,spaces"),
    {{"labels", Plain("starred,hidden,trashed,restricted,viewed,modified")},
     {"parents", Plain("kind,id,selfLink,parentLink,isRoot")},
     {"owners", kUser},
     {"lastModifyingUser", kUser},
     {"sharingUser", kUser},
     {"userPermission", Plain("kind,etag,id,selfLink,role,type")},
     {"exportLinks", Plain("*")}});

const Schema kListSchema = With(Plain("kind,etag,selfLink,nextPageToken,nextLink,incompleteSearch"),
                                {{"items", kFileSchema}});

const Schema kAboutSchema =
    With(Plain("kind,etag,selfLink,name,quotaBytesTotal,quotaBytesUsed,quotaBytesUsedAggregate,"
               "quotaBytesUsedInTrash,quotaType,largestChangeId,remainingChangeIds,rootFolderId,"
               "domainSharingPolicy,permissionId,isCurrentAppInstalled,languageCode"),
         {{"user", kUser}, {"maxUploadSizes", Plain("type,size")}});

bool Mask::Wants(const std::string& field) const {
    return members.empty() || members.count(field) != 0 || members.count("*") != 0;
}

const Mask& Mask::Of(const std::string& field) const {
    const auto found = members.find(field);
    return found == members.end() ? kAll : found->second;
}

Json::Value Mask::Apply(const Json::Value& document) const {
    if (members.empty() || (!document.isArray() && !document.isObject())) {
        return document;
    }
    Json::Value chosen(document.type());
    if (document.isArray()) {
        for (const Json::Value& element : document) {
            chosen.append(Apply(element));
        }
        return chosen;
    }
    for (const std::string& name : document.getMemberNames()) {
        if (Wants(name)) {
            chosen[name] = Of(name).Apply(document[name]);
        }
    }
    return chosen;
}

Mask ParseFields(const std::string& text, const Schema& schema) {
    return text.empty() ? Mask() : Parser(text, schema).Parse();
}

}  // namespace cloudsim::gdrive
