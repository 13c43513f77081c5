/** What changes the tree: create, rename, move, copy, delete. */
#include "support/cloudsim/box.h"
#include "support/cloudsim/box_json.h"

namespace cloudsim {
namespace {

void CheckUnchanged(const BoxCall& call, const Node& node) {
    const std::string wanted = call.request.Header("If-Match");
    if (!wanted.empty() && wanted != std::to_string(node.version)) {
        throw box::Failure{
            box::Error(412, "precondition_failed",
                       "The resource has been modified. Retrieve the resource again and retry")};
    }
}

void CheckNotRoot(const Node& node) {
    if (node.parent == nullptr) {
        throw box::Failure{box::Error(403, "access_denied_insufficient_permissions",
                                      "Access denied - insufficient permission")};
    }
}

void CheckNoCycle(const Node& node, const Node& parent) {
    if (parent.IsInside(node)) {
        throw box::Failure{box::Error(400, "cyclical_folder_structure",
                                      "Folder move creates cyclical folder structure")};
    }
}

}  // namespace

Reply BoxService::CreateFolder(const BoxCall& call) {
    const std::string name = call.body["name"].asString();
    Node& parent = ParentOf(call, call.body);
    CheckName(name);
    const Node* taken = tree_.Child(parent, name);
    if (taken != nullptr) {
        // Here alone the conflicts are a list.
        Json::Value context;
        context["conflicts"].append(box::Mini(*taken));
        return box::Error(409, "item_name_in_use", "Item with the same name already exists",
                          context);
    }
    return JsonReply(201, Answer(call, tree_.AddFolder(parent, name)));
}

Reply BoxService::Update(const BoxCall& call, Node& node) {
    CheckNotRoot(node);
    CheckUnchanged(call, node);
    const std::string name = call.body.isMember("name") ? call.body["name"].asString() : node.name;
    Node& parent = call.body.isMember("parent") ? ParentOf(call, call.body) : *node.parent;
    CheckName(name);
    CheckNoCycle(node, parent);
    CheckFree(parent, name, &node);
    if (call.body.isMember("description")) {
        node.description = call.body["description"].asString();
    }
    tree_.Move(node, parent, name);
    return JsonReply(200, Answer(call, node));
}

Reply BoxService::UpdateFolder(const BoxCall& call) {
    return Update(call, Folder(call));
}

Reply BoxService::UpdateFile(const BoxCall& call) {
    return Update(call, File(call));
}

Reply BoxService::Copy(const BoxCall& call, Node& node) {
    CheckNotRoot(node);
    const std::string name = call.body.isMember("name") ? call.body["name"].asString() : node.name;
    Node& parent = ParentOf(call, call.body);
    CheckName(name);
    CheckNoCycle(node, parent);
    CheckFree(parent, name, nullptr);
    if (tree_.Used(call.account) + node.Size() > call.account.Quota()) {
        return box::Error(403, "storage_limit_exceeded", "Account storage limit reached");
    }
    return JsonReply(201, Answer(call, tree_.Copy(node, parent, name)));
}

Reply BoxService::CopyFolder(const BoxCall& call) {
    return Copy(call, Folder(call));
}

Reply BoxService::CopyFile(const BoxCall& call) {
    return Copy(call, File(call));
}

Reply BoxService::DeleteFolder(const BoxCall& call) {
    Node& folder = Folder(call);
    CheckNotRoot(folder);
    CheckUnchanged(call, folder);
    if (!folder.children.empty() && call.request.Query("recursive") != "true") {
        return box::Error(400, "folder_not_empty", "Cannot delete - folder not empty");
    }
    tree_.Remove(folder);
    return Reply(204);
}

Reply BoxService::DeleteFile(const BoxCall& call) {
    Node& file = File(call);
    CheckUnchanged(call, file);
    tree_.Remove(file);
    return Reply(204);
}

}  // namespace cloudsim
