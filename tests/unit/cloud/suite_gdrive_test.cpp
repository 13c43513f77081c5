/** The suite of all drivers, for Google Drive. */
#include "cloud/gdrive/gdrive.h"
#include "core/json.h"
#include "support/cloudsim/gdrive.h"
#include "support/driver_suite/rig_of.h"

namespace driver_suite {
namespace {

constexpr const char* kFiles = "/drive/v2/files";

std::string Refusal(const char* reason) {
    return cloudsim::GDrive::ErrorText(403, reason);
}

Capabilities GDriveCan() {
    Capabilities can;
    can.protocol = "google";
    can.folds_case = false;
    can.namesakes = true;
    can.page_size = 100;
    can.deletes_twice = true;
    can.moves_twice = false;
    can.copy_renames = true;
    can.create_refuses_namesake = false;
    can.rename_onto_file = Meeting::kBeside;
    can.move_onto_file = can.move_onto_folder = Meeting::kBeside;
    can.copy_onto_file = can.copy_onto_folder = Meeting::kBeside;
    can.largest_file = 5497558138880;
    can.refused_file = 5497558138881;
    can.streams_in_session = true;
    can.largest_direct = 33554432;
    can.statuses = {{400, VFS_ERR_TOKEN_REVOKED, false},
                    {403, VFS_ERR_FORBIDDEN, true},
                    {403, VFS_ERR_RATE_LIMITED, true, Refusal("userRateLimitExceeded")},
                    {403, VFS_ERR_QUOTA_EXCEEDED, false, Refusal("quotaExceeded")},
                    {404, VFS_ERR_NOT_FOUND, false},
                    {500, VFS_ERR_SERVER_ERROR, true},
                    {503, VFS_ERR_SERVER_ERROR, true}};
    return can;
}

class GDriveRig : public RigOf<GDrive, cloudsim::GDrive> {
  public:
    const Capabilities& Can() const override {
        static const Capabilities kCan = GDriveCan();
        return kCan;
    }
    Json::Value Hosts() override {
        Json::Value hosts;
        hosts["GoogleApiHost"] = sim_.ApiHost();
        hosts["GoogleAccountsHost"] = sim_.AccountsHost();
        return hosts;
    }
    std::string IdOf(const std::string& path) override {
        return path == "/" ? "root" : ItemAt(path).id;
    }
    std::string Address(const std::string& path) override {
        Json::Value item;
        json::fromString(item, sim_.Attributes(*amy, ItemAt(path))["standard::description"]);
        return item["downloadUrl"].asString();
    }
    std::string ItemName(const Json::Value& item) override { return item["title"].asString(); }
    bool Resolve(PublicCloud& cloud, const std::string& path, std::string& id) override {
        return Of(cloud).GetFileIDByPathFromServer("", path, "", "", id);
    }
    bool MoveInto(PublicCloud& cloud, const std::string& path, const std::string& folder) override {
        const std::string parent = path.substr(0, path.rfind('/'));
        return Of(cloud).Move(IdOf(parent.empty() ? "/" : parent), IdOf(path), IdOf(folder));
    }

    Endpoint At(Op op) override {
        const std::string file = std::string(kFiles) + "/" + IdOf("/docs/a.txt");
        switch (op) {
            case Op::kAccount:
                return {"GET", "/drive/v2/about"};
            case Op::kInfo:
                return {"GET", file};
            case Op::kList:
                return {"GET", std::string(kFiles) + "?"};
            case Op::kCreate:
                return {"POST", kFiles};
            case Op::kRename:
            case Op::kMove:
                return {"PUT", file};
            case Op::kCopy:
                return {"POST", file + "/copy"};
            case Op::kDelete:
                return {"POST", file + "/trash"};
            case Op::kUpload:
                return {"POST", "/upload/drive/v2/files?uploadType=multipart"};
            case Op::kToken:
                return {"POST", "/o/oauth2/token"};
            default:
                return {"GET", ContentOf("/docs/a.txt")};
        }
    }
    std::string ContentOf(const std::string& path) override {
        return Address(path).substr(sim_.ContentHost().size());
    }
    Fault AnyListing() override { return Fault::On("GET", std::string(kFiles) + "?"); }
    std::vector<SessionStep> SessionSteps() override {
        // Only the bytes are tried again, each time from where the service says. A question whose
        // answer is lost on a kept connection is repeated by libcurl itself.
        return {{"start", {"POST", "/upload/drive/v2/files?uploadType=resumable"}, 0, false, false},
                {"ask", {"PUT", "/upload/drive/v2/files?"}, 0, false, true},
                {"send", {"PUT", "/upload/drive/v2/files?"}, 1, true, true}};
    }
    bool SendInSession(PublicCloud& cloud, XferData& xfer, const Json::Value& meta) override {
        return Of(cloud).ResumableUpload(&xfer, meta);
    }
    std::string ItemText(const std::string& name, const std::string& id, bool folder) override {
        return R"({"kind":"drive#file","id":")" + id + R"(","title":)" + name +
               (folder ? R"(,"mimeType":"application/vnd.google-apps.folder"})" : "}");
    }
    std::string PageText(const std::string& items) override {
        return "{\"items\":[" + items + "]}";
    }
    std::string CircularPage() override {
        return R"({"items":[{"id":"x1","title":"one"}],"nextPageToken":"again"})";
    }

    std::string ItemId(PublicCloud&, const Json::Value& item) override {
        return item["id"].asString();
    }
    bool IsFolder(PublicCloud&, const Json::Value& item) override {
        return item["mimeType"] == "application/vnd.google-apps.folder";
    }
};

std::unique_ptr<Rig> MakeRig() {
    return std::make_unique<GDriveRig>();
}

}  // namespace
}  // namespace driver_suite

RUN_DRIVER_SUITE(GDrive, MakeRig)
