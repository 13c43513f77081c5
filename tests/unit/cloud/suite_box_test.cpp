/** The suite of all drivers, for Box. */
#include "cloud/box/box.h"
#include "support/cloudsim/cloudsim.h"
#include "support/driver_suite/rig_of.h"

namespace driver_suite {
namespace {

Capabilities BoxCan() {
    Capabilities can;
    can.protocol = "box";
    can.page_size = 1000;
    can.largest_file = 262144000;
    can.refused_file = 5368709121;
    can.statuses = {{400, VFS_ERR_TOKEN_REVOKED, false},
                    {400, VFS_ERR_INVALID_NAME, false, R"({"code":"item_name_invalid"})"},
                    {403, VFS_ERR_FORBIDDEN, false},
                    {404, VFS_ERR_NOT_FOUND, false},
                    {405, VFS_ERR_NOT_SUPPORTED, false},
                    {412, VFS_ERR_BAD_REQUEST, false},
                    {429, VFS_ERR_RATE_LIMITED, true},
                    {500, VFS_ERR_SERVER_ERROR, true},
                    {503, VFS_ERR_SERVER_ERROR, true}};
    return can;
}

class BoxRig : public KnowingRigOf<Box, cloudsim::BoxService> {
  public:
    const Capabilities& Can() const override {
        static const Capabilities kCan = BoxCan();
        return kCan;
    }
    Json::Value Hosts() override {
        Json::Value hosts;
        hosts["BoxApiHost"] = sim_.ApiHost();
        hosts["BoxUploadHost"] = sim_.UploadHost();
        return hosts;
    }
    std::string IdOf(const std::string& path) override {
        const cloudsim::Item item = ItemAt(path);
        return (item.folder ? "folders/" : "files/") + item.id;
    }
    std::string Address(const std::string& path) override {
        return sim_.ApiHost() + "/2.0/" + IdOf(path) + "/content";
    }
    bool Resolve(PublicCloud& cloud, const std::string& path, std::string& id) override {
        return Of(cloud).GetFileIDByPathFromServer("", path, "", "", id);
    }
    bool MoveInto(PublicCloud& cloud, const std::string& path, const std::string& folder) override {
        return Of(cloud).Move("", IdOf(path), IdOf(folder));
    }

    Endpoint At(Op op) override {
        const std::string file = "/2.0/" + IdOf("/docs/a.txt");
        switch (op) {
            case Op::kAccount:
                return {"GET", "/2.0/users/me"};
            case Op::kInfo:
                return {"GET", file};
            case Op::kList:
                return {"GET", "/2.0/" + IdOf("/docs") + "/items"};
            case Op::kCreate:
                return {"POST", "/2.0/folders"};
            case Op::kRename:
            case Op::kMove:
                return {"PUT", file};
            case Op::kCopy:
                return {"POST", file + "/copy"};
            case Op::kDelete:
                return {"DELETE", file};
            case Op::kUpload:
                return {"POST", "/api/2.0/files/content"};
            case Op::kToken:
                return {"POST", "/oauth2/token"};
            case Op::kContent:
                return {"GET", "/d/"};
            default:
                return {"GET", file + "/content"};
        }
    }
    std::string ContentOf(const std::string&) override { return "/d/"; }
    Fault AnyListing() override { return Fault::On("GET", "/2.0/folders/"); }
    std::string ItemText(const std::string& name, const std::string& id, bool folder) override {
        return "{\"type\":\"" + std::string(folder ? "folder" : "file") + "\",\"id\":\"" + id +
               "\",\"name\":" + name + "}";
    }
    std::string PageText(const std::string& items) override {
        return "{\"total_count\":1,\"entries\":[" + items + "]}";
    }
};

std::unique_ptr<Rig> MakeRig() {
    return std::make_unique<BoxRig>();
}

}  // namespace
}  // namespace driver_suite

RUN_DRIVER_SUITE(Box, MakeRig)
