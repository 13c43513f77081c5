/** What only reads: account, metadata in both forms, downloads. */
#include "support/cloudsim/dropbox.h"
#include "support/cloudsim/dropbox_hash.h"

namespace cloudsim {

Reply Dropbox::GetAccount(const DropboxCall& call) {
    return JsonReply(200, dropbox::User(call.account));
}

Reply Dropbox::GetSpace(const DropboxCall& call) {
    Json::Value answer;
    answer["used"] = Json::UInt64(tree_.Used(call.account));
    answer["allocation"][".tag"] = "individual";
    answer["allocation"]["allocated"] = Json::UInt64(call.account.Quota());
    return JsonReply(200, answer);
}

/** The sum of a long file takes its time; a benchmark goes without it. */
std::string Dropbox::Hash(const Node& node) {
    if (node.folder || !dropbox_options_.hash_uploads) {
        return "";
    }
    const auto known = sums_.find(node.version_id);
    return known != sums_.end() ? known->second
                                : sums_[node.version_id] = dropbox::ContentHash(*node.content);
}

Json::Value Dropbox::Show(const Node& node, bool tag) {
    return dropbox::Metadata(node, Hash(node), tag);
}

Reply Dropbox::GetMetadata(const DropboxCall& call) {
    const std::string path = call.args.Text("path");
    if (path.empty() || path == "/") {
        call.args.Refuse("path: The root folder is unsupported.");
    }
    const Node* node = Walk(Resolve(call, path, "path"));
    const auto gone = deleted_.find({&call.account, FoldCase(path)});
    if (node == nullptr && call.args.Flag("include_deleted") && gone != deleted_.end()) {
        return JsonReply(200, dropbox::Deleted(gone->second));
    }
    return JsonReply(200, Show(Find(call, path, "path"), true));
}

/**
 * The path stands in the address, as in the interface's first version, and so do its parameters:
 * `list` for what a folder holds, `include_deleted` for what isn't there any more.
 */
Reply Dropbox::GetOldMetadata(const Request& request, Account& account) {
    const DropboxCall call = {request, account, {"files/get_metadata", "request", "{}"}};
    std::vector<std::string> names = request.Segments();
    Json::Value answer;
    std::string path;
    for (size_t i = 3; i < names.size(); i++) {
        path += "/" + names[i];
    }
    const Node* node = Walk(Resolve(call, path, "path"));
    const auto gone = deleted_.find({&account, FoldCase(path)});
    if (node == nullptr && request.Query("include_deleted") == "true" && gone != deleted_.end()) {
        answer = dropbox::Deleted(gone->second);
        answer["path"] = gone->second;
        answer["is_deleted"] = true;
        return JsonReply(200, answer);
    }
    const Node& found = Find(call, path, "path");
    answer = Show(found, true);
    dropbox::AddOldMembers(found, answer);
    for (const auto& [key, child] : found.children) {
        if (request.Query("list", "true") == "true") {
            Json::Value item = Show(*child, true);
            dropbox::AddOldMembers(*child, item);
            answer["contents"].append(std::move(item));
        }
    }
    return JsonReply(200, answer);
}

Reply Dropbox::Download(const DropboxCall& call) {
    const Node& node = Find(call, call.args.Text("path"), "path");
    if (node.folder) {
        throw dropbox::Fail({"path", "not_file"});
    }
    const std::string tag = "W/\"" + dropbox::Revision(node) + "\"";
    if (call.request.Header("If-None-Match") == tag) {
        return Reply(304).With("ETag", tag);
    }
    Reply reply = ContentReply(call.request, node.content, "application/octet-stream");
    if (reply.status == 416) {
        return reply;
    }
    return reply.With("Dropbox-API-Result", dropbox::HeaderText(Show(node, false)))
        .With("ETag", tag);
}

}  // namespace cloudsim
