/** What changes the tree: create, rename, delete, move, copy. */
#include "support/cloudsim/onedrive.h"
#include "support/cloudsim/onedrive_json.h"

namespace cloudsim {
namespace {

Reply BodyError(const std::string& why) {
    return onedrive::Error(400, "request_body_invalid", why);
}

void CheckNotRoot(const Node& node) {
    if (node.parent == nullptr) {
        throw onedrive::Failure{
            onedrive::Error(403, "access_denied", "The top folder can't be changed or removed.")};
    }
}

std::string Text(const Json::Value& body, const char* name) {
    return body[name].isString()
               ? body[name].asString()
               : throw onedrive::Failure{BodyError(std::string("The value for the property '") +
                                                   name + "' has to be a text.")};
}

}  // namespace

Node& OneDrive::MakeFolder(const OneDriveCall& call) {
    Node& parent = Folder(call.account, call.id);
    const std::string name = Text(call.body, "name");
    const bool described = call.body.isMember("description");
    const std::string description = described ? Text(call.body, "description") : "";
    CheckName(name);
    CheckFree(parent, name, nullptr);
    Node& made = tree_.AddFolder(parent, name);
    made.description = description;
    return made;
}

Reply OneDrive::Made(const OneDriveCall& call, const Node& node) const {
    return Answer(call.request, 201, Show(node))
        .With("Location", ApiHost() + "/v5.0/" + node.id + "/");
}

Reply OneDrive::CreateFolder(const OneDriveCall& call) {
    return Made(call, MakeFolder(call));
}

Reply OneDrive::CreateAlbum(const OneDriveCall& call) {
    const Node& made = MakeFolder(call);
    types_[made.id] = "album";
    return Made(call, made);
}

Reply OneDrive::Update(const OneDriveCall& call) {
    Node& node = Item(call);
    CheckNotRoot(node);
    if (!call.body.isMember("name") && !call.body.isMember("description")) {
        return BodyError("The request entity body has nothing that could be changed.");
    }
    const std::string name = call.body.isMember("name") ? Text(call.body, "name") : node.name;
    const std::string description =
        call.body.isMember("description") ? Text(call.body, "description") : node.description;
    CheckName(name);
    CheckFree(*node.parent, name, &node);
    tree_.Move(node, *node.parent, name);
    node.description = description;
    return Answer(call.request, 200, Show(node));
}

Reply OneDrive::Delete(const OneDriveCall& call) {
    Node& node = Item(call);
    CheckNotRoot(node);
    tree_.Remove(node);
    return Reply(204);
}

Node& OneDrive::Destination(const OneDriveCall& call) {
    return Folder(call.account, Text(call.body, "destination"));
}

Reply OneDrive::Move(const OneDriveCall& call) {
    Node& node = Item(call);
    CheckNotRoot(node);
    Node& parent = Destination(call);
    if (parent.IsInside(node)) {
        return BodyError("A folder can't be moved into itself.");
    }
    CheckFree(parent, node.name, &node);
    tree_.Move(node, parent, node.name);
    return Made(call, node);
}

Reply OneDrive::Copy(const OneDriveCall& call) {
    Node& node = Item(call);
    CheckNotRoot(node);
    Node& parent = Destination(call);
    if (node.folder && !drive_options_.copies_folders) {
        return BodyError("A folder can't be copied.");
    }
    if (parent.IsInside(node)) {
        return BodyError("A folder can't be copied into itself.");
    }
    CheckFree(parent, node.name, nullptr);
    CheckSpace(call.account, node.Size(), 0);
    return Made(call, tree_.Copy(node, parent, node.name));
}

}  // namespace cloudsim
