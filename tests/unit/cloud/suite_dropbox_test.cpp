/** The suite of all drivers, for Dropbox. */
#include "cloud/dropbox/dropbox.h"
#include "support/cloudsim/dropbox.h"
#include "support/driver_suite/rig_of.h"

namespace driver_suite {
namespace {

Capabilities DropboxCan() {
    Capabilities can;
    can.protocol = "dropbox";
    can.renews_tokens = false;
    can.walks = false;
    can.hides_names = false;
    can.page_size = 2000;
    can.deletes_twice = true;
    can.renames_twice = can.moves_twice = false;
    can.move_renames = can.copy_renames = true;
    can.move_onto_file = Meeting::kReplaces;
    can.move_onto_folder = Meeting::kDirectory;
    can.upload_onto_file = Meeting::kBeside;
    can.largest_file = 10737418240;
    can.refused_file = 10737418241;
    can.largest_direct = 33554432;
    can.repeats_bad_answers = true;
    can.statuses = {
        {400, VFS_ERR_TOKEN_REVOKED, false},
        {409, VFS_ERR_BAD_REQUEST, false},
        {409, VFS_ERR_NOT_FOUND, false, R"({"error":{".tag":"path","path":{".tag":"not_found"}}})"},
        {409, VFS_ERR_PERMISSION_DENIED, false,
         R"({"error":{".tag":"path","path":{".tag":"no_write_permission"}}})"},
        {409, VFS_ERR_NO_SPACE, false,
         R"({"error":{".tag":"path","reason":{".tag":"insufficient_space"}}})"},
        {429, VFS_ERR_RATE_LIMITED, true},
        {503, VFS_ERR_RATE_LIMITED, true},
        {507, VFS_ERR_QUOTA_EXCEEDED, false}};
    return can;
}

class DropboxRig : public KnowingRigOf<Dropbox, cloudsim::Dropbox> {
  public:
    const Capabilities& Can() const override {
        static const Capabilities kCan = DropboxCan();
        return kCan;
    }
    Json::Value Hosts() override {
        Json::Value hosts;
        hosts["DropboxApiHost"] = sim_.ApiHost();
        hosts["DropboxContentHost"] = sim_.ContentHost();
        return hosts;
    }
    std::string IdOf(const std::string& path) override { return path; }
    std::string Address(const std::string& path) override {
        return Can().protocol + "://amy@example.com" + path;
    }
    bool Resolve(PublicCloud&, const std::string& path, std::string& id) override {
        id = path;
        return true;
    }
    bool MoveInto(PublicCloud& cloud, const std::string& path, const std::string& folder) override {
        return cloud.Move(path, folder + path.substr(path.rfind('/')));
    }

    // An item of a listing has no member that its description by path has.
    std::string ItemId(PublicCloud& cloud, const Json::Value& item) override {
        return item.isMember("path") ? KnowingRigOf::ItemId(cloud, item)
                                     : item["path_display"].asString();
    }
    bool IsFolder(PublicCloud& cloud, const Json::Value& item) override {
        return item.isMember("is_dir") ? KnowingRigOf::IsFolder(cloud, item)
                                       : item[".tag"] == "folder";
    }

    Endpoint At(Op op) override {
        switch (op) {
            case Op::kAccount:
                return {"POST", "/2/users/get_current_account"};
            case Op::kInfo:
                return {"GET", "/2/files/get_metadata"};
            case Op::kList:
                return {"POST", "/2/files/list_folder"};
            case Op::kCreate:
                return {"POST", "/2/files/create_folder"};
            case Op::kRename:
            case Op::kMove:
                return {"POST", "/2/files/move"};
            case Op::kCopy:
                return {"POST", "/2/files/copy"};
            case Op::kDelete:
                return {"POST", "/2/files/delete"};
            case Op::kUpload:
                return {"POST", "/2/files/upload", true};
            case Op::kToken:
                return {"POST", "/oauth2/token"};
            default:
                return {"POST", "/2/files/download"};
        }
    }
    std::string ContentOf(const std::string&) override { return "/2/files/download"; }
    Fault AnyListing() override { return Fault::On("POST", "/2/files/list_folder"); }
    Fault& Conflict(Fault&& fault) override {
        return fault.Answer(409, R"({"error":{".tag":"to","to":{".tag":"conflict"}}})");
    }
    std::vector<SessionStep> SessionSteps() override {
        // A piece, or the end, that arrived is refused when it comes again.
        return {{"start", {"POST", "/2/files/upload_session/start"}, 0, true, true},
                {"append", {"POST", "/2/files/upload_session/append_v2"}, 0, true, false},
                {"finish", {"POST", "/2/files/upload_session/finish"}, 0, true, false}};
    }
    bool SendInSession(PublicCloud& cloud, XferData& xfer, const Json::Value& meta) override {
        return Of(cloud).ChunkedUpload(&xfer, meta);
    }
    std::string ItemText(const std::string& name, const std::string& id, bool folder) override {
        return "{\".tag\":\"" + std::string(folder ? "folder" : "file") + "\",\"path\":\"/" + id +
               "\",\"name\":" + name + ",\"is_dir\":" + (folder ? "true" : "false") + "}";
    }
    std::string PageText(const std::string& items) override {
        return "{\"entries\":[" + items + "]}";
    }
    std::string CircularPage() override {
        return R"({"entries":[{"path":"/x1","name":"x1"}],"cursor":"again","has_more":true})";
    }
};

std::unique_ptr<Rig> MakeRig() {
    return std::make_unique<DropboxRig>();
}

}  // namespace
}  // namespace driver_suite

RUN_DRIVER_SUITE(Dropbox, MakeRig)
