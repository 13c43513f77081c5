/** What changes the tree: insert, update, copy, trash, delete. */
#include <json/value.h>

#include <algorithm>

#include "support/cloudsim/gdrive.h"
#include "support/cloudsim/route.h"

namespace cloudsim {
namespace {

gdrive::Failure BadRequest(const std::string& message) {
    return {gdrive::Error(400, "badRequest", message)};
}

bool Has(const std::vector<Node*>& nodes, const Node& node) {
    return std::find(nodes.begin(), nodes.end(), &node) != nodes.end();
}

/** Which date a metadata update leaves behind. */
bool TakesDate(const Request& request) {
    return request.Query("setModifiedDate") == "true" ||
           BeginsWith(request.Query("modifiedDateBehavior"), "fromBody");
}

void SetModified(Node& node, const Moment& moment) {
    node.content_modified = moment.seconds;
    node.modified_millis = moment.millis;
}

}  // namespace

std::vector<Node*> GDrive::ParentsOf(const GDriveCall& call, const gdrive::Changes& changes) {
    if (!changes.parents || changes.parents->empty()) {
        return {&tree_.Root(call.account)};
    }
    std::vector<Node*> parents;
    for (const std::string& id : *changes.parents) {
        Node& parent = Folder(call, id);
        if (!Has(parents, parent)) {
            parents.push_back(&parent);
        }
    }
    return parents;
}

/** Throws what keeps a content from being stored; nothing has changed then. */
void GDrive::CheckTarget(const GDriveCall& call, const gdrive::Changes& changes) {
    if (call.id.empty()) {
        ParentsOf(call, changes);
        return;
    }
    Node& node = Own(call);
    if (node.folder) {
        throw BadRequest("Bad Request");
    }
    NewParents(call, node, changes);
}

Node& GDrive::Create(const GDriveCall& call, const gdrive::Changes& changes, ContentPtr content,
                     const std::string& type) {
    const std::vector<Node*> parents = ParentsOf(call, changes);
    const std::string title = changes.title.value_or("");
    const std::string name = title.empty() ? "Untitled" : title;
    const std::string mime_type = changes.mime_type.value_or(type);
    const bool folder = mime_type == gdrive::kFolderType;
    Node& node = folder ? tree_.AddFolder(*parents.front(), name)
                        : tree_.AddFile(*parents.front(), name, std::move(content));
    if (parents.size() > 1) {
        tree_.Place(node, parents, name);
    }
    node.mime_type = folder ? "" : mime_type.empty() ? gdrive::MimeTypeOfTitle(name) : mime_type;
    node.weightless = gdrive::IsDocument(node);
    node.description = changes.description.value_or("");
    node.starred = changes.starred.value_or(false);
    if (changes.modified) {
        SetModified(node, *changes.modified);
    }
    return node;
}

Reply GDrive::Insert(const GDriveCall& call) {
    const gdrive::Changes changes = gdrive::ReadChanges(call.body);
    return JsonReply(200, Show(call, Create(call, changes, MakeBytes(""), "")));
}

/** Parents named both as new and as old stay as they are. */
std::vector<Node*> GDrive::NewParents(const GDriveCall& call, Node& node,
                                      const gdrive::Changes& changes) {
    std::vector<Node*> parents = changes.parents ? ParentsOf(call, changes) : node.Parents();
    std::vector<Node*> added, removed;
    for (const std::string& id : gdrive::SplitList(call.request.Query("addParents"))) {
        added.push_back(&Folder(call, id));
    }
    for (const std::string& id : gdrive::SplitList(call.request.Query("removeParents"))) {
        removed.push_back(&Find(call, id));
    }
    for (Node* parent : added) {
        if (Has(removed, *parent)) {
            continue;
        }
        if (Has(parents, *parent)) {
            throw BadRequest("The parent is one already: " + parent->id);
        }
        parents.push_back(parent);
    }
    for (Node* parent : removed) {
        if (!Has(added, *parent)) {
            parents.erase(std::remove(parents.begin(), parents.end(), parent), parents.end());
        }
    }
    for (const Node* parent : parents) {
        if (parent->IsInside(node)) {
            throw BadRequest("The requested parent would create a cycle in the directory graph.");
        }
    }
    return parents;
}

void GDrive::SetDate(const GDriveCall& call, Node& node, const gdrive::Changes& changes) const {
    if (TakesDate(call.request) && changes.modified) {
        SetModified(node, *changes.modified);
    } else if ((changes.title || changes.description) &&
               call.request.Query("modifiedDateBehavior") != "noChange") {
        SetModified(node, {Now(), 0});
    }
}

void GDrive::Apply(const GDriveCall& call, Node& node, const gdrive::Changes& changes) {
    const bool changes_file =
        changes.title || changes.description || changes.trashed || TakesDate(call.request);
    if (changes_file && !node.sharer.empty()) {
        throw gdrive::NoPermission(node);
    }
    const std::vector<Node*> parents = NewParents(call, node, changes);
    const std::string name = changes.title && !changes.title->empty() ? *changes.title : node.name;
    if (parents != node.Parents() || name != node.name) {
        node.mime_type =
            node.folder ? "" : gdrive::MimeType(node);  // a new title doesn't change it
        tree_.Place(node, parents, name);
    }
    node.description = changes.description.value_or(node.description);
    node.starred = changes.starred.value_or(node.starred);
    if (changes.trashed && *changes.trashed != node.trashed) {
        tree_.SetTrashed(node, *changes.trashed);
    }
    SetDate(call, node, changes);
    tree_.Touch(node);
}

Reply GDrive::Update(const GDriveCall& call) {
    Node& node = Find(call, call.id);
    if (&node == &tree_.Root(call.account)) {
        throw gdrive::NoPermission(node);
    }
    Apply(call, node, gdrive::ReadChanges(call.body));
    return JsonReply(200, Show(call, node));
}

/** The copy of what lies nowhere lies in the topmost folder. */
Reply GDrive::Copy(const GDriveCall& call) {
    const Node& node = Find(call, call.id);
    gdrive::Changes changes = gdrive::ReadChanges(call.body);
    if (node.folder) {
        return gdrive::Error(403, "cannotCopyFile", "This file cannot be copied by the user.");
    }
    CheckSize(call.account, gdrive::IsDocument(node) ? 0 : node.content->Size(), 0);
    if (!changes.parents) {
        changes.parents.emplace();
        for (const Node* parent : node.Parents()) {
            changes.parents->push_back(parent->id);
        }
    }
    changes.title = changes.title.value_or("Copy of " + node.name);
    changes.description = changes.description.value_or(node.description);
    changes.mime_type = node.mime_type;
    return JsonReply(200, Show(call, Create(call, changes, node.content, "")));
}

Reply GDrive::Trash(const GDriveCall& call) {
    Node& node = Own(call);
    tree_.SetTrashed(node, true);
    return JsonReply(200, Show(call, node));
}

Reply GDrive::Untrash(const GDriveCall& call) {
    Node& node = Own(call);
    tree_.SetTrashed(node, false);
    return JsonReply(200, Show(call, node));
}

Reply GDrive::TouchFile(const GDriveCall& call) {
    Node& node = Own(call);
    SetModified(node, {Now(), 0});
    tree_.Touch(node);
    return JsonReply(200, Show(call, node));
}

Reply GDrive::Delete(const GDriveCall& call) {
    tree_.Remove(Own(call));
    return Reply(204);
}

Reply GDrive::EmptyTrash(const GDriveCall& call) {
    std::vector<std::string> ids;
    for (const Node* node : tree_.All(call.account)) {
        ids.push_back(node->id);
    }
    for (const std::string& id : ids) {
        // What was in a trashed folder has gone with it.
        Node* node = tree_.Find(call.account, id);
        if (node != nullptr && node->trashed && node->sharer.empty()) {
            tree_.Remove(*node);
        }
    }
    return Reply(204);
}

}  // namespace cloudsim
