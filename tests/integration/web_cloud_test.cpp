// Four clouds through the web layer: browsed and changed by what their services say, files up and
// down through their drivers, and what a service refuses told in words.
#include <gmock/gmock.h>

#include "support/machine_clouds.h"
#include "support/vfs_cloud_remote.h"
#include "support/web_site.h"

namespace {

using namespace web_site;
using cloudsim::Fault;
using machine_clouds::Clouds;
using machine_clouds::kMiB;
using machine_clouds::Place;
using machine_clouds::TheClouds;
using remote_side::Noise;
using testing::AnyOf;
using testing::Contains;
using testing::HasSubstr;
using testing::IsSupersetOf;
using testing::Not;

class Site : public testing::Environment {
    void SetUp() override {
        TheClouds().google_top = "/My Drive";
        TheClouds().SetUp();
        machine::AddUser("ben", kBen);
        Must(BuildDir() + "/tools/zyrovfs/zyrovfs policy set --type all");
        StartWebServer();
    }
    void TearDown() override { TheClouds().TearDown(); }
};

const auto* const kSetUp = testing::AddGlobalTestEnvironment(new Site);

/** Where an item of the account's root is for the page. */
std::string Shown(const Place& place, const std::string& path) {
    return (place.protocol == "google" ? "/My Drive" : "") + path;
}

/** What the box's backend would know of it a moment later. */
void Settle(Place& place) {
    place.tree->Refresh();
}

Answer Upload(const Place& place, const std::string& path, const std::string& bytes,
              const std::string& more = "") {
    std::ofstream("/run/source", std::ios::binary) << bytes;
    return Ask(kOurs + " -F 'file=@/run/source'",
               At("upload", place.Id(), Shown(place, path)) + more);
}

std::string Size(const std::string& bytes) {
    return "&size=" + std::to_string(bytes.size());
}

Place& Cloud(const std::string& protocol) {
    for (Place& place : TheClouds().places) {
        if (place.protocol == protocol) {
            return place;
        }
    }
    throw std::logic_error(protocol);
}

TEST(WebCloud, EachConnectionIsListedAsACloudWithItsState) {
    const Json::Value connections = Ask(kAmyIs, Api("connections")).Json()["connections"];
    ASSERT_EQ(connections.size(), 4U) << connections;
    for (const Json::Value& connection : connections) {
        EXPECT_TRUE(connection["cloud"].asBool());
        EXPECT_EQ(connection["account"], "amy@example.com");
        EXPECT_EQ(connection["state"], "connected") << connection;
    }
    EXPECT_EQ(Ask("-u ben:b", Api("connections")).Json()["connections"].size(), 0U);
}

TEST(WebCloud, FoldersAreBrowsedByWhatTheServiceSays) {
    for (Place& place : TheClouds().places) {
        SCOPED_TRACE(place.protocol);
        place.account->AddPath("/shelf/deep/grüße & 100% ☺.txt", "greetings");
        const Answer shelf = Ask(kAmyIs, At("list", place.Id(), Shown(place, "/shelf")));
        ASSERT_EQ(shelf.status, 200) << shelf.body;
        EXPECT_EQ(shelf.Json()["entries"][0]["name"], "deep");
        EXPECT_TRUE(shelf.Json()["entries"][0]["folder"].asBool());
        const Json::Value file =
            Ask(kAmyIs, At("list", place.Id(), Shown(place, "/shelf/deep"))).Json()["entries"][0];
        EXPECT_EQ(file["name"], "grüße & 100% ☺.txt");
        EXPECT_EQ(file["size"], 9);
        EXPECT_GT(file["modified"].asInt64(), 1000000000);
        EXPECT_EQ(Ask(kAmyIs, At("list", place.Id(), Shown(place, "/nothing"))).status, 404);
        EXPECT_EQ(Ask("-u ben:b", At("list", place.Id(), "/")).status, 404);
    }
    EXPECT_THAT(NamesAt("google://amy@example.com", "/"), IsSupersetOf({"My Drive", "Starred"}));
}

TEST(WebCloud, FoldersAreMadeItemsRenamedMovedAndDeleted) {
    for (Place& place : TheClouds().places) {
        SCOPED_TRACE(place.protocol);
        place.account->AddPath("/desk/a.txt", "a");
        const auto change = [&](const char* action, const std::string& path,
                                const std::map<std::string, std::string>& more = {}) {
            Json::Value body = Item(place.Id(), Shown(place, path));
            for (const auto& [key, value] : more) {
                body[key] = key == "folder" ? Shown(place, value) : value;
            }
            return Post(action, body);
        };
        EXPECT_EQ(change("mkdir", "/desk/new").status, 200);
        EXPECT_TRUE(place.account->Exists("/desk/new"));
        EXPECT_EQ(change("mkdir", "/desk/new").status, 409);
        EXPECT_EQ(change("rename", "/desk/a.txt", {{"name", "b.txt"}}).status, 200);
        EXPECT_EQ(place.Bytes("/desk/b.txt"), "a");
        EXPECT_EQ(change("rename", "/desk/b.txt", {{"name", "new"}}).status, 409);
        EXPECT_EQ(change("move", "/desk/b.txt", {{"folder", "/desk/new"}}).status, 200);
        EXPECT_EQ(place.Bytes("/desk/new/b.txt"), "a");
        EXPECT_EQ(
            change("move", "/desk/new/b.txt", {{"folder", "/desk"}, {"name", "c.txt"}}).status,
            200);
        EXPECT_EQ(place.Bytes("/desk/c.txt"), "a");
        place.account->AddPath("/desk/new/c.txt", "other");
        EXPECT_EQ(change("move", "/desk/c.txt", {{"folder", "/desk/new"}}).status, 409);
        EXPECT_EQ(place.Bytes("/desk/new/c.txt"), "other");
        EXPECT_EQ(change("delete", "/desk").status, 409) << "it is not empty";
        Json::Value all = Item(place.Id(), Shown(place, "/desk"));
        all["recursive"] = true;
        EXPECT_EQ(Post("delete", all, kBens).status, 404);
        EXPECT_EQ(Post("delete", all).status, 200);
        EXPECT_FALSE(place.account->Exists("/desk"));
        EXPECT_EQ(Post("delete", all).status, 404);
    }
}

TEST(WebCloud, FilesGoUpAndComeDownAgain) {
    for (Place& place : TheClouds().places) {
        SCOPED_TRACE(place.protocol);
        Settle(place);
        for (const size_t size : {size_t{0}, size_t{1}, size_t{131072}, 5 * kMiB}) {
            const std::string bytes = Noise(size);
            const std::string name = "/up " + std::to_string(size) + ".bin";
            const Answer up = Upload(place, name, bytes, Size(bytes));
            EXPECT_EQ(up.status, 200) << size << up.body;
            EXPECT_TRUE(place.Bytes(name) == bytes) << size;
            Settle(place);
            const Answer down = Ask(kAmyIs, At("download", place.Id(), Shown(place, name)));
            EXPECT_EQ(down.status, 200) << size;
            EXPECT_TRUE(down.body == bytes) << size;
        }
        const Answer part = Ask(std::string(kAmyIs) + " -r 1000-1999",
                                At("download", place.Id(), Shown(place, "/up 131072.bin")));
        EXPECT_EQ(part.status, 206);
        EXPECT_TRUE(part.body == Noise(131072).substr(1000, 1000));
    }
}

TEST(WebCloud, AFileIsReplacedAndAFolderIsNot) {
    for (Place& place : TheClouds().places) {
        SCOPED_TRACE(place.protocol);
        place.account->AddPath("/taken/inner.txt", "kept");
        Settle(place);
        const Answer refused = Upload(place, "/taken", "file", "&size=4");
        EXPECT_EQ(refused.status, 409) << refused.body;
        EXPECT_EQ(place.Bytes("/taken/inner.txt"), "kept");
    }
}

TEST(WebCloud, AFileThatItsDriverWouldPutElsewhereIsRefusedWithASentence) {
    Place& onedrive = Cloud("onedrive");
    onedrive.account->AddPath("/small/kept.txt", "kept");
    Settle(onedrive);
    const Answer elsewhere = Upload(onedrive, "/small/small", "file", "&size=4");
    EXPECT_EQ(elsewhere.status, 422) << elsewhere.body;
    EXPECT_THAT(elsewhere.body, HasSubstr("another folder of OneDrive"));
    const Answer renamed = Upload(Cloud("box"), "/a\"b.txt", "file", "&size=4");
    EXPECT_EQ(renamed.status, 422) << renamed.body;
    EXPECT_THAT(renamed.body, HasSubstr("double quote"));
}

TEST(WebCloud, ACopyDeletesNoFolderInItsWay) {
    Place& from = Cloud("dropbox");
    Place& to = Cloud("box");
    from.account->AddPath("/name", "a file");
    to.account->AddPath("/in the way/name/inner.txt", "kept");
    Settle(from);
    Settle(to);
    Json::Value plan;
    plan["from"]["connection"] = from.Id();
    plan["from"]["paths"].append("/name");
    plan["to"]["connection"] = to.Id();
    plan["to"]["path"] = "/in the way";
    const Answer begun = Post("copy", plan);
    ASSERT_EQ(begun.status, 200) << begun.body;
    const std::string task = begun.Json()["task"].asString();
    Json::Value told;
    EXPECT_TRUE(machine::Eventually([&] {
        const Json::Value answer = Ask(kAmyIs, Api("tasks")).Json();
        for (const Json::Value& one : answer["tasks"]) {
            told = one["id"] == task ? one : told;
        }
        return told["state"] == "failed" || told["state"] == "done";
    }));
    EXPECT_EQ(told["state"], "failed") << told;
    EXPECT_THAT(told["error"]["meaning"].asString(), HasSubstr("A folder of that name")) << told;
    EXPECT_EQ(to.Bytes("/in the way/name/inner.txt"), "kept");
}

TEST(WebCloud, DocumentsAreExportedInTheFormatsThatAreOffered) {
    Place& place = Cloud("google");
    auto& google = dynamic_cast<cloudsim::GDrive&>(*place.service);
    google.AddDocument(*place.account, place.account->Root(), "Plan.gdoc", "document", "plan");
    Settle(place);
    const Json::Value entries = Ask(kAmyIs, At("list", place.Id(), "/My Drive")).Json()["entries"];
    Json::Value exports;
    for (const Json::Value& entry : entries) {
        EXPECT_EQ(entry.isMember("exports"), entry["name"] == "Plan.gdoc") << entry;
        exports = entry.isMember("exports") ? entry["exports"] : exports;
    }
    ASSERT_FALSE(exports.empty());
    for (const Json::Value& format : exports) {
        const Answer answer = Ask(kAmyIs, At("download", place.Id(), "/My Drive/Plan.gdoc") +
                                              "&export=" + Escaped(format["format"].asString()));
        EXPECT_EQ(answer.status, 200) << format << answer.body;
        EXPECT_THAT(answer.head,
                    HasSubstr("filename*=UTF-8''Plan" + format["extension"].asString() + "\r\n"));
        EXPECT_THAT(answer.head,
                    HasSubstr("Content-Length: " + std::to_string(answer.body.size())));
        EXPECT_FALSE(answer.body.empty());
    }
    EXPECT_EQ(Ask(kAmyIs,
                  At("download", place.Id(), "/My Drive/Plan.gdoc") + "&export=application/x-evil")
                  .status,
              422);
}

TEST(WebCloud, AFullAccountSaysSo) {
    for (Place& place : TheClouds().places) {
        SCOPED_TRACE(place.protocol);
        const uint64_t quota = place.account->Quota();
        place.account->SetQuota(place.account->Used() + 10);
        const std::string bytes = Noise(kMiB);
        const Answer full = Upload(place, "/full.bin", bytes, Size(bytes));
        place.account->SetQuota(quota);
        // Google's answer has the status of a refusal, and is told as one.
        EXPECT_THAT(full.status, AnyOf(507, 413, place.protocol == "google" ? 403 : 507))
            << full.body;
        EXPECT_FALSE(full.Json()["error"]["advice"].asString().empty());
        EXPECT_FALSE(place.account->Exists("/full.bin"));
    }
}

TEST(WebCloud, AFileThatIsTooLargeIsRefusedBeforeItsBytesCome) {
    for (const auto& [protocol, size] :
         {std::pair{"box", "5368709121"}, {"onedrive", "10737418241"}}) {
        const Answer large =
            Upload(Cloud(protocol), "/large.bin", "x", std::string("&size=") + size);
        EXPECT_EQ(large.status, 413) << large.body;
        EXPECT_EQ(large.Json()["error"]["name"], "VFS_ERR_FILE_TOO_LARGE");
    }
}

TEST(WebCloud, AServiceThatRefusesBeforeInAndAfterTheBodyIsHeardByTheBrowser) {
    const std::string bytes = Noise(20 * kMiB);
    Place& place = Cloud("box");
    const struct {
        Fault fault;
        const char* what;
    } rows[] = {
        {Fault::On("OPTIONS", "*files").Answer(403, "{}"), "before"},
        {Fault::On("POST", "*files").CutUpload(3 * kMiB).Forever(), "in"},
        {Fault::On("POST", "*files").Status(403), "after"},
    };
    for (const auto& row : rows) {
        place.service->AddFault(row.fault);
        const Answer answer = Upload(place, "/refused.bin", bytes, Size(bytes));
        place.service->ClearFaults();
        EXPECT_GE(answer.status, 400) << row.what;
        EXPECT_FALSE(answer.Json()["error"]["meaning"].asString().empty())
            << row.what << answer.body;
    }
}

TEST(WebCloud, AWithdrawnGrantIsShownAsAConnectionThatCanBeForgotten) {
    Place& place = Cloud("onedrive");
    place.account->ExpireAccessTokens();
    place.account->RevokeRefreshTokens();
    const Json::Value connections = Ask(kAmyIs, Api("connections")).Json()["connections"];
    ASSERT_EQ(connections.size(), 4U);
    int unavailable = 0;
    for (const Json::Value& connection : connections) {
        const bool lost = connection["id"] == place.Id();
        EXPECT_EQ(connection["state"] == "unavailable", lost) << connection;
        unavailable += lost ? 1 : 0;
    }
    EXPECT_EQ(unavailable, 1);
    const Answer refused = Ask(kAmyIs, At("list", place.Id(), "/"));
    EXPECT_GE(refused.status, 400) << refused.body;
    EXPECT_FALSE(refused.Json()["error"]["advice"].asString().empty()) << refused.body;
}

TEST(WebCloud, AnArchiveOfACloudFolderIsWholeOrBroken) {
    Place& place = Cloud("dropbox");
    place.account->AddPath("/bundle/a.bin", Noise(3 * kMiB));
    place.account->AddPath("/bundle/deep/b.txt", "b");
    Settle(place);
    const Answer zip = Ask(kAmyIs, At("zip", place.Id(), "/bundle"));
    ASSERT_EQ(zip.status, 200) << zip.body;
    EXPECT_EQ(machine::Run("unzip -t /run/body").status, 0);
    EXPECT_TRUE(Must("unzip -p /run/body bundle/a.bin") == Noise(3 * kMiB));
    place.service->AddFault(Fault::On("*", "*download").CutAnswer(kMiB).Forever());
    const machine::Outcome broken = machine::Run("curl -s -o /run/body " + std::string(kAmyIs) +
                                                 " '" + At("zip", place.Id(), "/bundle") + "'");
    place.service->ClearFaults();
    constexpr int kPartialFile = 18;
    EXPECT_EQ(broken.status, kPartialFile);
    EXPECT_NE(machine::Run("unzip -t /run/body").status, 0);
}

TEST(WebCloud, AFileIsCopiedFromOneCloudToTheOther) {
    Place& from = Cloud("dropbox");
    Place& to = Cloud("box");
    from.account->AddPath("/copied.bin", Noise(2 * kMiB));
    Settle(from);
    Json::Value plan;
    plan["from"]["connection"] = from.Id();
    plan["from"]["paths"].append("/copied.bin");
    plan["to"]["connection"] = to.Id();
    plan["to"]["path"] = "/";
    ASSERT_EQ(Post("copy", plan).status, 200);
    EXPECT_TRUE(Eventually([&] { return to.account->Exists("/copied.bin"); }))
        << Ask(kAmyIs, Api("tasks")).body;
    EXPECT_TRUE(
        Eventually([] { return Ask(kAmyIs, Api("tasks")).Json()["tasks"][0]["state"] == "done"; }));
    EXPECT_TRUE(to.Bytes("/copied.bin") == Noise(2 * kMiB));
}

}  // namespace
