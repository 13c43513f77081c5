/** What becomes of uploaded bytes: the modes of writing, and their conflicts. */
#include "support/cloudsim/dropbox.h"

namespace cloudsim {

bool Dropbox::IsSame(const Node& file, const Content& content) {
    return dropbox_options_.hash_uploads && !file.folder && file.Size() == content.Size() &&
           file.content->Sha1() == content.Sha1();
}

/** By the mode alone; a folder in the place is always in the way. */
bool Dropbox::MayOverwrite(const dropbox::Arguments& commit, const Node& taken) const {
    const std::string mode = commit.Tag("mode", "add");
    return !taken.folder &&
           (mode == "overwrite" ||
            (mode == "update" && commit.Object("mode").Text("update") == dropbox::Revision(taken)));
}

Node& Dropbox::Commit(const DropboxCall& call, const dropbox::Arguments& commit,
                      const ContentPtr& content) {
    const Target target = TargetOf(call, commit.Text("path"), "path");
    const std::string mode = commit.Tag("mode", "add");
    const bool update = mode == "update";
    if (mode != "add" && mode != "overwrite" && !update) {
        commit.Refuse("mode: unknown tag '" + mode + "'");
    }
    if (target.taken == nullptr && update && commit.Flag("strict_conflict")) {
        throw dropbox::Fail({"path", "conflict", "file"});
    }
    const auto modified = commit.Date("client_modified");
    Node& file = Store(call, commit, target, content);
    file.content_modified = modified ? *modified : file.content_modified;
    return file;
}

Node& Dropbox::Store(const DropboxCall& call, const dropbox::Arguments& commit,
                     const Target& target, const ContentPtr& content) {
    Node* taken = target.taken;
    const bool overwrite = taken != nullptr && MayOverwrite(commit, *taken);
    const bool same = taken != nullptr && IsSame(*taken, *content);
    if (same && (overwrite || !commit.Flag("strict_conflict"))) {
        return *taken;
    }
    std::string name = target.name;
    if (taken != nullptr && !overwrite) {
        name = NameFor(target, false, commit.Flag("autorename"), "path");
        for (int n = 1; commit.Tag("mode", "add") == "update"; n++) {
            name = dropbox::Conflicted(target.name, call.account.Name(), n);
            if (tree_.Child(*target.folder, name) == nullptr) {
                break;
            }
        }
    }
    const uint64_t freed = overwrite ? taken->Size() : 0;
    if (tree_.Used(call.account) - freed + content->Size() > call.account.Quota()) {
        throw dropbox::Fail({"path", "insufficient_space"});
    }
    if (overwrite) {
        tree_.SetContent(*taken, content);
        return *taken;
    }
    return tree_.AddFile(MakeWay(target), name, content);
}

}  // namespace cloudsim
