/** What changes the tree: create, delete, copy, move, and copies between accounts. */
#include "support/cloudsim/dropbox.h"

namespace cloudsim {
namespace {

Reply InMetadata(Json::Value metadata) {
    Json::Value answer;
    answer["metadata"] = std::move(metadata);
    return JsonReply(200, answer);
}

constexpr int64_t kReferenceLife = 30LL * 365 * 24 * 3600;

}  // namespace

Json::Value Dropbox::MakeFolder(const DropboxCall& call) {
    const Target target = TargetOf(call, call.args.Text("path"), "path");
    const std::string name = NameFor(target, true, call.args.Flag("autorename"), "path");
    return Show(tree_.AddFolder(MakeWay(target), name), false);
}

Reply Dropbox::CreateFolder(const DropboxCall& call) {
    return JsonReply(200, MakeFolder(call));
}

Reply Dropbox::CreateFolder2(const DropboxCall& call) {
    return InMetadata(MakeFolder(call));
}

/** What is gone from its place can still be asked for. */
void Dropbox::Remember(const Node& node) {
    const std::string path = dropbox::PathOf(node);
    deleted_[{node.owner, FoldCase(path)}] = path;
    for (const auto& [key, child] : node.children) {
        Remember(*child);
    }
}

Json::Value Dropbox::Remove(const DropboxCall& call) {
    Node& node = Find(call, call.args.Text("path"), "path_lookup");
    if (node.parent == nullptr) {
        throw dropbox::Fail({"path_lookup", "malformed_path"});
    }
    if (call.args.Has("parent_rev") &&
        (node.folder || call.args.Text("parent_rev") != dropbox::Revision(node))) {
        throw dropbox::Fail({"path_write", "conflict", node.folder ? "folder" : "file"});
    }
    Json::Value metadata = Show(node, true);
    Remember(node);
    tree_.Remove(node);
    return metadata;
}

Reply Dropbox::Delete(const DropboxCall& call) {
    return JsonReply(200, Remove(call));
}

Reply Dropbox::Delete2(const DropboxCall& call) {
    return InMetadata(Remove(call));
}

Json::Value Dropbox::CopyItem(const DropboxCall& call) {
    Node& from = Find(call, call.args.Text("from_path"), "from_lookup");
    const Target target = TargetOf(call, call.args.Text("to_path"), "to");
    if (from.parent == nullptr || (from.folder && target.folder->IsInside(from))) {
        throw from.parent == nullptr ? dropbox::Fail({"from_lookup", "malformed_path"})
                                     : dropbox::Fail({"duplicated_or_nested_paths"});
    }
    const std::string name = NameFor(target, from.folder, call.args.Flag("autorename"), "to");
    if (tree_.Used(call.account) + from.Size() > call.account.Quota()) {
        throw dropbox::Fail({"insufficient_quota"});
    }
    return Show(tree_.Copy(from, MakeWay(target), name), true);
}

/** A change of nothing but the case of letters is taken without effect. */
Json::Value Dropbox::MoveItem(const DropboxCall& call) {
    Node& from = Find(call, call.args.Text("from_path"), "from_lookup");
    const Target target = TargetOf(call, call.args.Text("to_path"), "to");
    if (from.parent == nullptr) {
        throw dropbox::Fail({"from_lookup", "malformed_path"});
    }
    if (from.folder && target.folder->IsInside(from)) {
        throw dropbox::Fail({"cant_move_folder_into_itself"});
    }
    if (target.taken == &from && target.name != from.name) {
        return Show(from, true);
    }
    const std::string name = NameFor(target, from.folder, call.args.Flag("autorename"), "to");
    Remember(from);
    tree_.Move(from, MakeWay(target), name);
    return Show(from, true);
}

Reply Dropbox::Copy(const DropboxCall& call) {
    return JsonReply(200, CopyItem(call));
}

Reply Dropbox::Copy2(const DropboxCall& call) {
    return InMetadata(CopyItem(call));
}

Reply Dropbox::Move(const DropboxCall& call) {
    return JsonReply(200, MoveItem(call));
}

Reply Dropbox::Move2(const DropboxCall& call) {
    return InMetadata(MoveItem(call));
}

Reply Dropbox::GetReference(const DropboxCall& call) {
    Node& node = Find(call, call.args.Text("path"), "path");
    if (node.parent == nullptr) {
        throw dropbox::Fail({"path", "malformed_path"});
    }
    const std::string reference = RandomText(32);
    references_[reference] = {&call.account, node.id};
    Json::Value answer;
    answer["metadata"] = Show(node, true);
    answer["copy_reference"] = reference;
    answer["expires"] = dropbox::Date(Now() + kReferenceLife);
    return JsonReply(200, answer);
}

/** Whoever has the reference may make the copy, in whatever account. */
Reply Dropbox::SaveReference(const DropboxCall& call) {
    const auto found = references_.find(call.args.Text("copy_reference"));
    const Target target = TargetOf(call, call.args.Text("path"), "path");
    if (found == references_.end()) {
        throw dropbox::Fail({"invalid_copy_reference"});
    }
    Node* from = tree_.Find(*found->second.owner, found->second.id);
    if (from == nullptr) {
        throw dropbox::Fail({"not_found"});
    }
    const std::string name = NameFor(target, from->folder, false, "path");
    if (tree_.Used(call.account) + from->Size() > call.account.Quota()) {
        throw dropbox::Fail({"path", "insufficient_space"});
    }
    return InMetadata(Show(tree_.Copy(*from, MakeWay(target), name), true));
}

}  // namespace cloudsim
