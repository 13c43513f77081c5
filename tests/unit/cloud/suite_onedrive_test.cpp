/** The suite of all drivers, for OneDrive. */
#include "cloud/onedrive/onedrive.h"
#include "support/cloudsim/onedrive.h"
#include "support/driver_suite/rig_of.h"

namespace driver_suite {
namespace {

Capabilities OneDriveCan() {
    Capabilities can;
    can.protocol = "onedrive";
    can.hides_names = false;
    can.largest_file = 10737418240;
    can.refused_file = 10737418241;
    can.takes_any_stream = false;
    can.largest_direct = 33554432;
    // The folder's id is asked for first, and a folder without one is not found.
    can.upload_without_token = VFS_ERR_NOT_FOUND;
    can.statuses = {
        {400, VFS_ERR_TOKEN_REVOKED, false},
        {400, VFS_ERR_INVALID_NAME, false, R"({"error":{"code":"request_parameter_invalid"}})"},
        {403, VFS_ERR_FORBIDDEN, false},
        {404, VFS_ERR_NOT_FOUND, false},
        {413, VFS_ERR_FILE_TOO_LARGE, false},
        {416, VFS_ERR_RANGE_FAILED, false},
        {420, VFS_ERR_RATE_LIMITED, true},
        {500, VFS_ERR_SERVER_ERROR, true},
        {503, VFS_ERR_SERVER_ERROR, true},
        {507, VFS_ERR_QUOTA_EXCEEDED, false}};
    return can;
}

/** The driver knows a conflict by its code in a 400. */
cloudsim::OneDriveOptions Options() {
    cloudsim::OneDriveOptions options;
    options.conflict_status = 400;
    return options;
}

class OneDriveRig : public KnowingRigOf<OneDrive, cloudsim::OneDrive> {
  public:
    OneDriveRig() : KnowingRigOf(Options()) {}

    const Capabilities& Can() const override {
        static const Capabilities kCan = OneDriveCan();
        return kCan;
    }
    Json::Value Hosts() override {
        Json::Value hosts;
        hosts["LiveApiHost"] = sim_.ApiHost();
        hosts["LiveLoginHost"] = sim_.LoginHost();
        hosts["LiveStorageDomain"] = sim_.StorageDomain();
        return hosts;
    }
    std::string AccountInfo() override { return "{\"id\":\"" + amy->Id() + "\"}"; }
    std::string IdOf(const std::string& path) override { return ItemAt(path).id; }
    std::string Address(const std::string& path) override {
        return sim_.ApiHost() + "/v5.0/" + IdOf(path) + "/content";
    }
    bool Resolve(PublicCloud& cloud, const std::string& path, std::string& id) override {
        return Of(cloud).GetFileIDByPathFromServer("", path, "", "", id);
    }
    bool MoveInto(PublicCloud& cloud, const std::string& path, const std::string& folder) override {
        return Of(cloud).Move("unused", IdOf(path), IdOf(folder));
    }

    Endpoint At(Op op) override {
        const std::string file = Sent("/docs/a.txt");
        switch (op) {
            case Op::kAccount:
                return {"GET", "/v5.0/me"};
            case Op::kInfo:
                return {"GET", file};
            case Op::kList:
                return {"GET", Sent("/docs") + "/files"};
            case Op::kCreate:
                return {"POST", Sent("/docs")};
            case Op::kRename:
                return {"PUT", file};
            case Op::kMove:
                return {"MOVE", file};
            case Op::kCopy:
                return {"COPY", file};
            case Op::kDelete:
                return {"DELETE", file};
            case Op::kUpload:
                return {"PUT", Sent("/") + "/files/"};
            case Op::kToken:
                return {"POST", "/oauth20_token.srf"};
            case Op::kContent:
                return {"GET", "/s1p/" + IdOf("/docs/a.txt")};
            default:
                return {"GET", file + "/content"};
        }
    }
    std::string ContentOf(const std::string& path) override { return "/s1p/" + IdOf(path); }
    Fault AnyListing() override { return Fault::On("GET", "/v5.0/"); }
    Fault& Conflict(Fault&& fault) override {
        return fault.Answer(400, R"({"error":{"code":"resource_already_exists"}})");
    }
    std::vector<SessionStep> SessionSteps() override {
        // Only the bytes are tried again, from where the service says.
        const Endpoint storage = {"BITS_POST", "/users/0x" + amy->Id() + "/LiveFolders/up.txt"};
        return {{"create", storage, 0, false, false},
                {"fragment", storage, 1, true, true},
                {"close", storage, 2, false, false}};
    }
    bool SendInSession(PublicCloud& cloud, XferData& xfer, const Json::Value& meta) override {
        return Of(cloud).ChunkedUpload(&xfer, meta);
    }
    std::string ItemText(const std::string& name, const std::string& id, bool folder) override {
        return "{\"type\":\"" + std::string(folder ? "folder" : "file") + "\",\"id\":\"" + id +
               "\",\"name\":" + name + "}";
    }
    std::string PageText(const std::string& items) override { return "{\"data\":[" + items + "]}"; }

  private:
    /** Address of an item as it is sent, with the mark in its id escaped. */
    std::string Sent(const std::string& path) const {
        std::string id = ItemAt(path).id;
        const size_t mark = id.find('!');
        return "/v5.0/" + (mark == std::string::npos ? id : id.replace(mark, 1, "%21"));
    }
};

std::unique_ptr<Rig> MakeRig() {
    return std::make_unique<OneDriveRig>();
}

}  // namespace
}  // namespace driver_suite

RUN_DRIVER_SUITE(OneDrive, MakeRig)
