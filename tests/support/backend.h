/**
 * The flat entry points of the clouds before their simulated services, as a backend calls them. A
 * rig says for one service what differs; tests of what all four have in common run with each.
 */
#ifndef ZYROVFS_TESTS_BACKEND_H
#define ZYROVFS_TESTS_BACKEND_H

#include <gmock/gmock.h>
#include <zosplatform/error.h>

#include <filesystem>
#include <memory>
#include <string>
#include <utility>
#include <vector>

#include "bridge/file_info.h"
#include "core/json.h"
#include "core/paths.h"
#include "support/catalogue.h"
#include "support/cloudsim/cloudsim.h"
#include "support/profiles.h"
#include "support/seams.h"
#include "support/token_profile.h"
#include "zyrovfs/cloud_utils.h"
#include "zyrovfs/zyrocloud.h"

namespace backend {

using namespace ZYROVFS;  // NOLINT(google-build-using-namespace)
using cloudsim::Fault;
using testing::ElementsAre;
using testing::HasSubstr;
using testing::IsEmpty;

inline constexpr long long kMiB = 1 << 20;
/** What `err` holds before each call. */
inline constexpr int kUntouched = -7;
/** For arguments that are required, and that nothing is done with. */
inline constexpr const char* kUnused = "unused";

inline Json::Value Object(const std::string& text) {
    Json::Value value;
    EXPECT_TRUE(json::fromString(value, text)) << text;
    return value;
}

/** A backend's view of one service. */
class Rig {
  public:
    virtual ~Rig() = default;

    virtual std::string Protocol() const = 0;
    virtual cloudsim::Service& Sim() = 0;
    virtual Json::Value Hosts() = 0;
    /** Whether a refused token is renewed. */
    virtual bool Renews() const { return true; }
    /** The folder that the account's root is shown as. */
    virtual std::string Top() const { return "/"; }

    virtual int List(const char* server_id, ZYROCloud_Cache* cache, const char* path,
                     ZYROCloud_ListCallback callback, void* user_data, int* err) = 0;
    virtual int Check(const char* server_id, const char* json, int* err) = 0;
    virtual long long Read(ZYROCloud_Handle* handle, char** dest, long long size, int* err) = 0;

    virtual Fault OnListing() = 0;
    /** The request that the bytes of a file come by. */
    virtual Fault OnContent() = 0;
    /** A listing of these items, and an item; the name is JSON text. */
    virtual std::string Page(const std::string& items) const = 0;
    virtual std::string ItemText(const std::string& name, const std::string& id) const = 0;
    /** The same as a page that another one follows; "" where a listing is one answer. */
    virtual std::string FirstPage(const std::string& items) const = 0;

    cloudsim::Account* amy = nullptr;
};

class BoxRig : public Rig {
  public:
    std::string Protocol() const override { return "box"; }
    cloudsim::BoxService& Sim() override { return sim; }
    Json::Value Hosts() override {
        Json::Value hosts;
        hosts["BoxApiHost"] = sim.ApiHost();
        hosts["BoxUploadHost"] = sim.UploadHost();
        return hosts;
    }
    int List(const char* server_id, ZYROCloud_Cache* cache, const char* path,
             ZYROCloud_ListCallback callback, void* user_data, int* err) override {
        return ZYROCloud_Cloud_Box_List(amy->Id().c_str(), server_id, cache, path, nullptr,
                                        callback, user_data, err);
    }
    int Check(const char* server_id, const char* json, int* err) override {
        char* id = nullptr;
        const int result = ZYROCloud_Cloud_Box_CheckAccount(server_id, json, &id, err);
        free(id);
        return result;
    }
    long long Read(ZYROCloud_Handle* handle, char** dest, long long size, int* err) override {
        return ZYROCloud_Cloud_Box_Download(handle, kUnused, kUnused, dest, size, err);
    }
    Fault OnListing() override { return Fault::On("GET", "/2.0/folders/"); }
    Fault OnContent() override { return Fault::On("GET", "/d/"); }
    std::string Page(const std::string& items) const override {
        return R"({"total_count":1,"entries":[)" + items + "]}";
    }
    std::string ItemText(const std::string& name, const std::string& id) const override {
        return R"({"type":"file","id":")" + id + R"(","name":)" + name + R"(,"size":5})";
    }
    std::string FirstPage(const std::string& items) const override {
        return R"({"total_count":1500,"entries":[)" + items + "]}";
    }

    cloudsim::BoxService sim;
};

class DropboxRig : public Rig {
  public:
    std::string Protocol() const override { return "dropbox"; }
    cloudsim::Dropbox& Sim() override { return sim; }
    Json::Value Hosts() override {
        Json::Value hosts;
        hosts["DropboxApiHost"] = sim.ApiHost();
        hosts["DropboxContentHost"] = sim.ContentHost();
        return hosts;
    }
    bool Renews() const override { return false; }
    int List(const char* server_id, ZYROCloud_Cache* cache, const char* path,
             ZYROCloud_ListCallback callback, void* user_data, int* err) override {
        return ZYROCloud_Cloud_Dropbox_List(server_id, cache, path, callback, user_data, err);
    }
    int Check(const char* server_id, const char* json, int* err) override {
        return ZYROCloud_Cloud_Dropbox_CheckAccount(server_id, json, err);
    }
    long long Read(ZYROCloud_Handle* handle, char** dest, long long size, int* err) override {
        return ZYROCloud_Cloud_Dropbox_Download(handle, "dropbox://amy@example.com", kUnused, dest,
                                                size, err);
    }
    Fault OnListing() override { return Fault::On("POST", "/2/files/list_folder"); }
    Fault OnContent() override { return Fault::On("POST", "/2/files/download"); }
    std::string Page(const std::string& items) const override {
        return R"({"has_more":false,"cursor":"c","entries":[)" + items + "]}";
    }
    std::string ItemText(const std::string& name, const std::string& id) const override {
        return R"({".tag":"file","path_display":")" + id + R"(","name":)" + name + R"(,"size":5})";
    }
    std::string FirstPage(const std::string& items) const override {
        return R"({"has_more":true,"cursor":"c","entries":[)" + items + "]}";
    }

    cloudsim::Dropbox sim;
};

class GoogleRig : public Rig {
  public:
    std::string Protocol() const override { return "google"; }
    cloudsim::GDrive& Sim() override { return sim; }
    Json::Value Hosts() override {
        Json::Value hosts;
        hosts["GoogleApiHost"] = sim.ApiHost();
        hosts["GoogleAccountsHost"] = sim.AccountsHost();
        return hosts;
    }
    std::string Top() const override { return "/My Drive"; }
    int List(const char* server_id, ZYROCloud_Cache* cache, const char* path,
             ZYROCloud_ListCallback callback, void* user_data, int* err) override {
        return ZYROCloud_Cloud_Google_List(server_id, cache, path, nullptr, callback, user_data,
                                           err);
    }
    int Check(const char* server_id, const char* json, int* err) override {
        return ZYROCloud_Cloud_Google_CheckAccount(server_id, json, err);
    }
    long long Read(ZYROCloud_Handle* handle, char** dest, long long size, int* err) override {
        return ZYROCloud_Cloud_Google_Download(handle, kUnused, kUnused, dest, size, err);
    }
    Fault OnListing() override { return Fault::On("GET", "/drive/v2/files?"); }
    Fault OnContent() override { return Fault::On("GET", "/docs/securesc/"); }
    std::string Page(const std::string& items) const override {
        return R"({"items":[)" + items + "]}";
    }
    std::string ItemText(const std::string& name, const std::string& id) const override {
        return R"({"id":")" + id + R"(","title":)" + name + R"(,"fileSize":"5"})";
    }
    std::string FirstPage(const std::string& items) const override {
        return R"({"nextPageToken":"t","items":[)" + items + "]}";
    }

    cloudsim::GDrive sim;
};

class OneDriveRig : public Rig {
  public:
    std::string Protocol() const override { return "onedrive"; }
    cloudsim::OneDrive& Sim() override { return sim; }
    Json::Value Hosts() override {
        Json::Value hosts;
        hosts["LiveApiHost"] = sim.ApiHost();
        hosts["LiveLoginHost"] = sim.LoginHost();
        hosts["LiveStorageDomain"] = sim.StorageDomain();
        return hosts;
    }
    int List(const char* server_id, ZYROCloud_Cache* cache, const char* path,
             ZYROCloud_ListCallback callback, void* user_data, int* err) override {
        return ZYROCloud_Cloud_OneDrive_List(server_id, cache, path, nullptr, callback, user_data,
                                             err);
    }
    int Check(const char* server_id, const char* json, int* err) override {
        return ZYROCloud_Cloud_OneDrive_CheckAccount(server_id, json, err);
    }
    long long Read(ZYROCloud_Handle* handle, char** dest, long long size, int* err) override {
        return ZYROCloud_Cloud_OneDrive_Download(handle, kUnused, kUnused, dest, size, err);
    }
    Fault OnListing() override { return Fault::On("GET", "*/files?"); }
    Fault OnContent() override { return Fault::On("GET", "/s1p/"); }
    std::string Page(const std::string& items) const override {
        return R"({"data":[)" + items + "]}";
    }
    std::string ItemText(const std::string& name, const std::string& id) const override {
        return R"({"type":"file","id":")" + id + R"(","name":)" + name + R"(,"size":5})";
    }
    std::string FirstPage(const std::string&) const override { return ""; }

    /** Conflicts as the driver's table has them. */
    static cloudsim::OneDriveOptions Options() {
        cloudsim::OneDriveOptions options;
        options.conflict_status = 400;
        return options;
    }
    cloudsim::OneDrive sim{Options()};
};

using RigMaker = std::unique_ptr<Rig> (*)();

template <typename R>
std::unique_ptr<Rig> Make() {
    return std::make_unique<R>();
}

/** A stored connection of Amy's with good tokens, an empty cache, and what the callback is told. */
class BackendTest : public profiles::ProfileTest {
  protected:
    explicit BackendTest(std::unique_ptr<Rig> of)
        : rig(std::move(of)),
          sim(rig->Sim()),
          amy(sim.AddAccount("amy@example.com", "Amy Doe")),
          server_id(rig->Protocol() + "://amy@example.com") {
        rig->amy = &amy;
    }

    void SetUp() override {
        ProfileTest::SetUp();
        sim.AddClient("mine", kSecret);
        Json::Value document;
        document["hosts"] = rig->Hosts();
        std::filesystem::create_directories(paths::kConfigRoot);
        ASSERT_TRUE(json::toFile(document, paths::kServiceConfig, 0640));
        ASSERT_TRUE(ZYROCloud::Utils::AddClient(rig->Protocol(), "mine", kSecret));
        catalogue::Clear();
        catalogue::Add(rig->Protocol(), rig->Protocol(), "connect");
        Connect();
        ASSERT_EQ(ZYROCloud_Cache_Init(&cache), 1);
        seams::Reset();
        YLIBCErrSetEx(0, "test", 1);
    }

    void TearDown() override {
        seen.clear();
        ZYROCloud_Cache_Destroy(&cache);
        EXPECT_THAT(sim.UnusedFaults(), IsEmpty()) << sim.Journal().Text();
        const cloudsim::Tokens last = amy.LastTokens();
        for (const std::string& secret :
             {std::string(kSecret), granted.access_token, granted.refresh_token, last.access_token,
              last.refresh_token}) {
            EXPECT_FALSE(!secret.empty() && seams::LoggedPart(secret)) << seams::LogDump();
        }
    }

    /** The connection with fresh tokens, as a mount stores it. */
    void Connect() {
        granted = amy.IssueTokens(3600, "mine");
        Json::Value profile;
        profile["protocol"] = rig->Protocol();
        profile["alias"] = profile["email"] = "amy@example.com";
        profile["account_info"] = "{}";
        profile["client_id"] = "mine";
        profile["expire_time"] = std::to_string(time(nullptr) + 3600);
        profile["access_token"] = token_profile::Enciphered(granted.access_token);
        profile["refresh_token"] = token_profile::Enciphered(granted.refresh_token);
        Json::Value connections;
        profile["path"] = "";
        connections[server_id] = profile;
        profiles::Put(profiles::VFS_CONFIG_SERVER, connections);
        connections[server_id]["path"] = "/tmp";
        profiles::Put(profiles::VFS_CONFIG_CONNECT, connections);
    }
    void Disconnect() { profiles::Put(profiles::VFS_CONFIG_CONNECT, Json::objectValue); }

    /** The credentials as a mount hands them to the backend. */
    Json::Value Credentials() const {
        Json::Value credentials;
        credentials["access_token"] = granted.access_token;
        credentials["refresh_token"] = granted.refresh_token;
        credentials["expire_time"] = std::to_string(time(nullptr) + 3600);
        credentials["client_id"] = "mine";
        credentials["account_info"] = R"({"id":")" + amy.Id() + "\"}";
        return credentials;
    }
    int Check(const Json::Value& credentials) {
        return rig->Check(server_id.c_str(), json::toString(credentials).c_str(), &err);
    }

    // --- listings ------------------------------------------------------------------------------

    /** `user_data` is the test. */
    static void See(GFileInfo* info, void* user_data) {
        static_cast<BackendTest*>(user_data)->seen.emplace_back(
            static_cast<GFileInfo*>(g_object_ref(info)));
    }
    int List(const std::string& path) {
        seen.clear();
        return rig->List(server_id.c_str(), cache, path.c_str(), See, this, &err);
    }
    /** A path of the account as the tree shows it. */
    std::string Shown(const std::string& path) const {
        return rig->Top() == "/" ? path : rig->Top() + path;
    }
    std::vector<std::string> SeenNames() const {
        std::vector<std::string> names;
        for (const ZYROCloud::UniqueFileInfo& info : seen) {
            names.emplace_back(g_file_info_get_name(info.get()));
        }
        return names;
    }
    /** What the callback was told of that name; null for nothing. */
    GFileInfo* Seen(const std::string& name) const {
        for (const ZYROCloud::UniqueFileInfo& info : seen) {
            if (name == g_file_info_get_name(info.get())) {
                return info.get();
            }
        }
        return nullptr;
    }
    /** The record in the cache; null for none. */
    GFileInfo* Cached(const std::string& path) const {
        GFileInfo* info = nullptr;
        return ZYROCloud_Cache_Entry_Get(cache, path.c_str(), &info) == 1 ? info : nullptr;
    }
    static std::string Text(GFileInfo* info, const char* attribute) {
        return ZYROCloud::AttrText(info, attribute);
    }
    static std::string IdOf(GFileInfo* info) { return Text(info, "id::file"); }
    static bool IsFolder(GFileInfo* info) {
        return g_file_info_get_file_type(info) == G_FILE_TYPE_DIRECTORY;
    }
    /** A record as a listing would have left it in the cache. */
    void Remember(const std::string& dir, const std::string& name, const std::string& id,
                  bool folder) {
        const ZYROCloud::UniqueFileInfo info(g_file_info_new());
        GFileInfo* filled = info.get();
        const timeval none{};
        ZYROCloud::SetGFileInfo(&filled, id.c_str(), folder, name.c_str(), name.c_str(), 0, none,
                                none, none, none, nullptr);
        ASSERT_EQ(ZYROCloud_Cache_Entry_Add(cache, dir.c_str(), filled), 1);
        ASSERT_EQ(ZYROCloud_Cache_List_Add(cache, dir.c_str(), false, filled), 1);
    }

    // --- reads ---------------------------------------------------------------------------------

    struct FreeHandle {
        void operator()(ZYROCloud_Handle* handle) const {
            ZYROCloud_Cloud_Handle_Free(handle, nullptr);
        }
    };
    using UniqueHandle = std::unique_ptr<ZYROCloud_Handle, FreeHandle>;

    /** Lists the top and opens the file of that name in it. */
    UniqueHandle Open(const std::string& name) {
        EXPECT_EQ(List(rig->Top()), 1) << seams::LogDump();
        GFileInfo* const info = Seen(name);
        EXPECT_NE(info, nullptr) << name;
        return UniqueHandle(
            ZYROCloud_Cloud_Handle_New(server_id.c_str(), IdOf(info).c_str(), info));
    }
    /** Reads a piece into `bytes`, which becomes what came. */
    long long Read(const UniqueHandle& handle, long long size) {
        bytes.assign(static_cast<size_t>(size) + 1, '\0');
        char* dest = bytes.data();
        const long long got = rig->Read(handle.get(), &dest, size, &err);
        bytes.resize(static_cast<size_t>(std::max(got, 0LL)));
        return got;
    }
    /** All that pieces of this size give, or "failed". */
    std::string ReadAll(const UniqueHandle& handle, long long size) {
        std::string all;
        long long got = 0;
        while ((got = Read(handle, size)) > 0) {
            all += bytes;
        }
        return got == 0 ? all : "failed";
    }

    /** "GET /2.0/users/me" for each request so far. */
    std::vector<std::string> Requests() const {
        std::vector<std::string> lines;
        for (const cloudsim::JournalEntry& entry : sim.Journal().All()) {
            lines.push_back(entry.method + " " + entry.Path());
        }
        return lines;
    }
    cloudsim::JournalEntry Last() const { return sim.Journal().All().back(); }

    static constexpr const char* kSecret = "secret-of-mine";
    const std::unique_ptr<Rig> rig;
    cloudsim::Service& sim;
    cloudsim::Account& amy;
    const std::string server_id;
    cloudsim::Tokens granted;
    ZYROCloud_Cache* cache = nullptr;
    std::vector<ZYROCloud::UniqueFileInfo> seen;
    std::string bytes;
    int err = kUntouched;
};

/** A test that each service has to pass. */
class EachBackend : public BackendTest, public testing::WithParamInterface<RigMaker> {
  protected:
    EachBackend() : BackendTest(GetParam()()) {}
};

inline std::string NameOf(const testing::TestParamInfo<RigMaker>& info) {
    std::string name = info.param()->Protocol();
    name[0] = static_cast<char>(toupper(name[0]));
    return name;
}

}  // namespace backend

/** All tests of a suite that derives from EachBackend, for the four services. */
#define RUN_FOR_EACH_BACKEND(suite)                                                              \
    INSTANTIATE_TEST_SUITE_P(                                                                    \
        , suite,                                                                                 \
        testing::Values(backend::Make<backend::BoxRig>, backend::Make<backend::DropboxRig>,      \
                        backend::Make<backend::GoogleRig>, backend::Make<backend::OneDriveRig>), \
        backend::NameOf)

#endif
