#include <zosplatform/error.h>

#include <filesystem>

#include "core/json.h"
#include "core/paths.h"
#include "support/checked_driver.h"
#include "support/driver_suite.h"
#include "support/seams.h"
#include "support/token_profile.h"
#include "zyrovfs/cloud_utils.h"

namespace driver_suite {

std::ostream& operator<<(std::ostream& to, Op op) {
    static const char* const kNames[] = {"account", "info",     "list",  "create",
                                         "rename",  "move",     "copy",  "delete",
                                         "upload",  "download", "token", "content"};
    return to << kNames[static_cast<int>(op)];
}

void Rig::Show(XattrTree& tree, const std::string& path) {
    for (const auto& [name, value] : Sim().Attributes(*amy, amy->Get(amy->Find(path)))) {
        tree.Set(path, name, value);
    }
}

DriverTest::DriverTest()
    : rig(GetParam()()),
      can(rig->Can()),
      sim(rig->Sim()),
      amy(sim.AddAccount("amy@example.com", "Amy Doe")),
      server_id(can.protocol + "://amy@example.com") {
    rig->amy = &amy;
}

void DriverTest::SetUp() {
    ProfileTest::SetUp();
    sim.AddClient("mine", kSecret);
    Json::Value document;
    document["hosts"] = rig->Hosts();
    std::filesystem::create_directories(paths::kConfigRoot);
    ASSERT_TRUE(json::toFile(document, paths::kServiceConfig, 0640));
    ASSERT_TRUE(ZYROCloud::Utils::AddClient(can.protocol, "mine", kSecret));
    Restore();
}

void DriverTest::Restore() {
    for (const cloudsim::Item& item : amy.List(amy.Root())) {
        amy.Remove(item.id);
    }
    amy.AddPath("/docs/a.txt", kDigits);
    amy.AddFolder(amy.Root(), "target");
    for (const char* path : {"/docs", "/docs/a.txt", "/target"}) {
        Show(path);
    }
    tree.Remove("/up.txt");
    endpoints.clear();
    for (int op = 0; op <= static_cast<int>(Op::kContent); op++) {
        endpoints.push_back(rig->At(static_cast<Op>(op)));
    }
    Renew();
    Json::Value connections;
    connections[server_id] = Stored();
    profiles::Put(profiles::VFS_CONFIG_SERVER, connections);
    connections[server_id]["path"] = tree.Folder();
    profiles::Put(profiles::VFS_CONFIG_CONNECT, connections);
    sim.Journal().Clear();
    User::Reset();
    seams::Reset();
    YLIBCErrSetEx(0, "test", 1);
}

void DriverTest::TearDown() {
    EXPECT_THAT(sim.UnusedFaults(), testing::IsEmpty()) << sim.Journal().Text();
    const cloudsim::Tokens last = amy.LastTokens();
    for (const std::string& secret :
         {std::string(kSecret), granted.access_token, granted.refresh_token, last.access_token,
          last.refresh_token}) {
        EXPECT_FALSE(!secret.empty() && seams::LoggedPart(secret)) << seams::LogDump();
    }
}

void DriverTest::Renew(const std::string& expire_time) {
    granted = amy.IssueTokens(3600, "mine");
    Json::Value profile;
    profile["access_token"] = granted.access_token;
    profile["refresh_token"] = granted.refresh_token;
    profile["expire_time"] = expire_time;
    profile["client_id"] = "mine";
    profile["server_id"] = server_id;
    profile["account_info"] = rig->AccountInfo();
    cloud = rig->NewDriver(profiles::kUser, profile);
}

/** The profile as it stands in a file. */
Json::Value DriverTest::Stored() {
    Json::Value profile;
    profile["protocol"] = can.protocol;
    profile["alias"] = profile["email"] = "amy@example.com";
    profile["account_info"] = rig->AccountInfo();
    profile["client_id"] = "mine";
    profile["expire_time"] = "500";
    profile["path"] = "";
    profile["access_token"] = token_profile::Enciphered(granted.access_token);
    profile["refresh_token"] = token_profile::Enciphered(granted.refresh_token);
    return profile;
}

std::vector<std::string> DriverTest::NamesIn(const Json::Value& items) {
    std::vector<std::string> names;
    for (const Json::Value& item : items) {
        names.push_back(rig->ItemName(item));
    }
    return names;
}

bool DriverTest::Run(Op op) {
    Json::Value out;
    const Json::Value no_params(Json::objectValue);
    switch (op) {
        case Op::kAccount:
            return cloud->GetAccountInfo(no_params, out);
        case Op::kInfo:
            return cloud->GetFileInfo(Id("/docs/a.txt"), no_params, out);
        case Op::kList:
            return cloud->ListFolder(Id("/docs"), no_params, out);
        case Op::kCreate:
            return cloud->CreateFolder(Id("/docs"), "new", no_params);
        case Op::kRename:
            return cloud->Rename(Id("/docs/a.txt"), "b.txt");
        case Op::kMove: {
            const checked_driver::Transfer move(*cloud, "Move by ids");
            return move.End(rig->MoveInto(*cloud, "/docs/a.txt", "/target"));
        }
        case Op::kCopy:
            return cloud->Copy("/docs/a.txt", "/target/a.txt");
        case Op::kDelete:
            return cloud->Delete(Id("/docs/a.txt"));
        case Op::kUpload:
            return Upload("hello", "/up.txt");
        default:
            return Download("/docs/a.txt", 10);
    }
}

Fault DriverTest::On(Op op) const {
    const Endpoint& at = endpoints[static_cast<size_t>(op)];
    return Fault::On(at.method, at.path);
}

size_t DriverTest::Count(Op op) const {
    const Endpoint& at = endpoints[static_cast<size_t>(op)];
    size_t count = 0;
    for (const cloudsim::JournalEntry& entry : sim.Journal().Find(at.method, at.path)) {
        count += !at.exact || entry.Path() == at.path ? 1 : 0;
    }
    return count;
}

bool DriverTest::Upload(Source& source, const std::string& path) {
    const checked_driver::Transfer transfer(*cloud, "UploadFile");
    return transfer.End(Cloud::UploadFile(cloud.get(), Uri(path), source.file.Get(), source.size,
                                          User::Progress, User::Cancel, nullptr));
}

bool DriverTest::Upload(const std::string& text, const std::string& path) {
    Source source(text);
    return Upload(source, path);
}

bool DriverTest::Download(const std::string& path, long long size) {
    received.Clear();
    const checked_driver::Transfer transfer(*cloud, "DownloadFile");
    return transfer.End(Cloud::DownloadFile(cloud.get(), Uri(path), received.file.Get(), size,
                                            User::Progress, User::Cancel, nullptr));
}

std::string DriverTest::SumOf(const std::string& path) {
    const std::string id = amy.Find(path);
    return id.empty() ? "" : amy.Get(id).sha1;
}

std::string DriverTest::TextOf(const std::string& path) {
    const std::string id = amy.Find(path);
    return id.empty() ? "" : amy.Bytes(id);
}

}  // namespace driver_suite
