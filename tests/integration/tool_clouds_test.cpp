// The tool with accounts at four clouds: profiles from tokens, copies from each to each, what an
// account is told, and what is said when its owner took the grant back.
#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <json/reader.h>
#include <json/value.h>
#include <sys/stat.h>

#include <fstream>
#include <memory>
#include <sstream>
#include <thread>

#include "support/cloudsim/cloudsim.h"
#include "support/cloudsim/mounted_account.h"
#include "support/locations.h"
#include "support/machine.h"

namespace {

using machine::Must;
using machine::Outcome;
using testing::AllOf;
using testing::HasSubstr;

const std::string kTool = BuildDir() + "/tools/zyrovfs/zyrovfs";
constexpr size_t kMiB = 1 << 20;

Outcome ForAmy(const std::string& arguments) {
    return machine::Run(kTool + " " + arguments + " --user amy");
}

/** A service with Amy's account, and what the box would have mounted of it. */
struct Place {
    std::string protocol;
    std::unique_ptr<cloudsim::Service> service;
    cloudsim::Account* account = nullptr;
    std::unique_ptr<cloudsim::MountedAccount> tree;

    std::string Id() const { return protocol + "://amy@example.com"; }
    std::string Folder() const { return "/tmp/clouds/" + protocol; }
    std::string Bytes(const std::string& path) const {
        const std::string id = account->Find(path);
        return id.empty() ? "nothing" : account->Bytes(id);
    }
};

template <typename Options>
Options AtLoopback(std::string Options::*a, std::string Options::*b) {
    Options options;
    options.api_name = options.*a = options.*b = "127.0.0.1";
    return options;
}

class Clouds : public testing::Environment {
  public:
    void SetUp() override {
        machine::AddUser("amy", 4001);
        using cloudsim::BoxOptions;
        using cloudsim::GDriveOptions;
        using cloudsim::OneDriveOptions;
        auto box = std::make_unique<cloudsim::BoxService>(
            AtLoopback(&BoxOptions::upload_name, &BoxOptions::download_name));
        auto google = std::make_unique<cloudsim::GDrive>(
            AtLoopback(&GDriveOptions::accounts_name, &GDriveOptions::content_name));
        // The storage host has a name of its own, so names it is.
        auto onedrive = std::make_unique<cloudsim::OneDrive>();
        auto dropbox = std::make_unique<cloudsim::Dropbox>();
        Json::Value hosts;
        hosts["BoxApiHost"] = box->ApiHost();
        hosts["BoxUploadHost"] = box->UploadHost();
        hosts["DropboxApiHost"] = dropbox->ApiHost();
        hosts["DropboxContentHost"] = dropbox->ContentHost();
        hosts["GoogleApiHost"] = google->ApiHost();
        hosts["GoogleAccountsHost"] = google->AccountsHost();
        hosts["LiveApiHost"] = onedrive->ApiHost();
        hosts["LiveLoginHost"] = onedrive->LoginHost();
        hosts["LiveStorageDomain"] = onedrive->StorageDomain();
        Configure(hosts);
        Add("box", std::move(box));
        Add("dropbox", std::move(dropbox));
        Add("google", std::move(google));
        Add("onedrive", std::move(onedrive));
        RecordConnections();
    }
    void TearDown() override { places.clear(); }

    /** New tokens in /tmp/access and /tmp/refresh, as the owner gets them by signing in. */
    static void SignIn(const Place& place) {
        const cloudsim::Tokens tokens = place.account->IssueTokens();
        std::ofstream("/tmp/access") << tokens.access_token << '\n';
        std::ofstream("/tmp/refresh") << tokens.refresh_token << '\n';
    }

    /** Stands for the mounts: the box's own backends serve the trees that drivers look at. */
    static void RecordConnections() {
        Must(
            "sed -E 's|\"path\":\"\",\"protocol\":\"([a-z]+)\"|"
            "\"path\":\"/tmp/clouds/\\1\",\"protocol\":\"\\1\"|g' "
            "/usr/zyro/etc/zyrovfs/4001/servers.conf >/var/tmp/zyrovfs/4001/connect.conf");
    }

    std::vector<Place> places;

  private:
    static void Configure(const Json::Value& hosts) {
        Must("mkdir -p /usr/zyro/etc/zyrovfs /var/tmp/zyrovfs/4001 /tmp/clouds");
        Json::Value document;
        document["hosts"] = hosts;
        std::ofstream("/usr/zyro/etc/zyrovfs/cloud.conf") << cloudsim::OneLine(document) << '\n';
        std::ofstream("/tmp/secret") << "secret\n";
    }

    void Add(const std::string& protocol, std::unique_ptr<cloudsim::Service> service) {
        Place place{protocol, std::move(service), nullptr, nullptr};
        place.account = &place.service->AddAccount("amy@example.com", "Amy");
        place.account->SetQuota(50 * kMiB);
        place.tree = std::make_unique<cloudsim::MountedAccount>(*place.service, *place.account,
                                                                place.Folder());
        SignIn(place);
        Must(kTool + " cloud client add " + protocol + " client --password-file /tmp/secret");
        Must(kTool + " profile add --user amy --protocol " + protocol +
             " --client-id client --access-token-file /tmp/access --refresh-token-file "
             "/tmp/refresh --expires-in 3600");
        places.push_back(std::move(place));
    }
};

Clouds& TheClouds() {
    static auto* const clouds = new Clouds;
    return *clouds;
}
const auto* const kClouds = testing::AddGlobalTestEnvironment(&TheClouds());

std::string Pattern(size_t size, unsigned state) {
    std::string bytes(size, '\0');
    for (char& byte : bytes) {
        state = state * 1103515245 + 12345;
        byte = static_cast<char>(state >> 16);
    }
    return bytes;
}

TEST(ToolClouds, AFileGoesFromEachCloudToEachOther) {
    unsigned seed = 1;
    for (Place& from : TheClouds().places) {
        for (Place& to : TheClouds().places) {
            if (&from == &to) {
                continue;
            }
            const std::string name = "/to " + to.protocol + " & ü.bin";
            const std::string bytes = Pattern(100000 + seed, seed);
            ++seed;
            from.account->AddPath(name, bytes);
            from.tree->Refresh();
            const Outcome copy =
                ForAmy("cp '" + from.Id() + name + "' '" + to.Id() + "/" + from.protocol + ".bin'");
            EXPECT_EQ(copy.status, 0) << copy.output;
            EXPECT_TRUE(to.Bytes("/" + from.protocol + ".bin") == bytes)
                << from.protocol << " to " << to.protocol;
        }
    }
}

TEST(ToolClouds, AFileBeyondOneRequestGoesUpToEachCloudAndComesBack) {
    const std::string bytes = Pattern(33 * kMiB, 5);
    std::ofstream("/home/amy/large.bin", std::ios::binary) << bytes;
    Must("chown amy:100 /home/amy/large.bin");
    for (Place& place : TheClouds().places) {
        SCOPED_TRACE(place.protocol);
        const Outcome up = ForAmy("cp /home/amy/large.bin " + place.Id() + "/large.bin");
        EXPECT_EQ(up.status, 0) << up.output;
        EXPECT_TRUE(place.Bytes("/large.bin") == bytes);
        place.tree->Refresh();
        const Outcome down = ForAmy("cp " + place.Id() + "/large.bin /home/amy/back.bin");
        EXPECT_EQ(down.status, 0) << down.output;
        EXPECT_TRUE(machine::Read("/home/amy/back.bin") == bytes);
        place.account->Remove(place.account->Find("/large.bin"));
    }
}

TEST(ToolClouds, AnAccountIsShownWithItsNameAndSpace) {
    for (Place& place : TheClouds().places) {
        SCOPED_TRACE(place.protocol);
        const Outcome shown = ForAmy("account " + place.Id());
        EXPECT_EQ(shown.status, 0) << shown.output;
        EXPECT_THAT(shown.output,
                    AllOf(HasSubstr("Name:   Amy\n"), HasSubstr("E-mail: amy@example.com\n"),
                          HasSubstr(" of 50.0 MiB used\n")));
        Json::Value account;
        std::istringstream text(ForAmy("account --json " + place.Id()).output);
        text >> account;
        EXPECT_EQ(account["email"], "amy@example.com");
        EXPECT_EQ(account["total"].asUInt64(), 50 * kMiB);
        EXPECT_EQ(account["used"].asUInt64(), place.account->Used());
    }
}

TEST(ToolClouds, AnAccountThatIsNotThereIsToldInWords) {
    const Outcome shown = ForAmy("account google://zoe@example.com");
    EXPECT_EQ(shown.status, 1);
    EXPECT_THAT(shown.output, HasSubstr("neither a connection nor a profile"));
    EXPECT_EQ(ForAmy("account nonsense").status, 2);
}

TEST(ToolClouds, WhenAGrantWasTakenBackTheWayOutIsTold) {
    for (Place& place : TheClouds().places) {
        SCOPED_TRACE(place.protocol);
        place.account->ExpireAccessTokens();
        place.account->RevokeRefreshTokens();
        const Outcome refused = ForAmy("account " + place.Id());
        EXPECT_EQ(refused.status, 1);
        EXPECT_THAT(refused.output, HasSubstr("zyrovfs profile set")) << refused.output;
        Clouds::SignIn(place);
        const Outcome saved =
            ForAmy("profile set " + place.Id() +
                   " --access-token-file /tmp/access --refresh-token-file /tmp/refresh "
                   "--expires-in 3600");
        EXPECT_EQ(saved.status, 0) << saved.output;
        Clouds::RecordConnections();
        const Outcome again = ForAmy("account " + place.Id());
        EXPECT_EQ(again.status, 0) << again.output;
    }
}

}  // namespace
