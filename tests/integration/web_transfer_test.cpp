// Contents through the web layer: progress and cancel of uploads, parts of files, ZIP archives.
#include <gmock/gmock.h>

#include "support/vfs_cloud_remote.h"
#include "support/web_site.h"

namespace {

using namespace remote_side;
using namespace web_site;
using testing::AllOf;
using testing::HasSubstr;
using testing::Not;
namespace fs = std::filesystem;

std::string dav_id;

class Site : public testing::Environment {
    void SetUp() override {
        machine::AddUser("amy", kAmy);
        machine::AddUser("ben", kBen);
        machine::Remote(std::string("start ") + kPassword);
        Must(BuildDir() + "/tools/zyrovfs/zyrovfs policy set --type all");
        StartWebServer();
        Json::Value form;
        form["protocol"] = "dav";
        form["host"] = "127.0.0.1";
        form["port"] = 8080;
        form["user"] = "remo";
        form["password"] = kPassword;
        dav_id = Post("add", form).Json()["connection"].asString();
        ASSERT_EQ(dav_id, "dav://remo@127.0.0.1:8080");
    }
};

const auto* const kSetUp = testing::AddGlobalTestEnvironment(new Site);

std::string At(const std::string& action, const std::string& path) {
    return web_site::At(action, dav_id, path);
}

constexpr const char* kId = "0123456789abcdef-upload";

Answer Progress(const std::string& id, const char* who = kAmyIs) {
    return Ask(who, Api("progress?id=" + id));
}

/** An upload in the background, by curl, as slow as is wanted. */
class SlowUpload {
  public:
    SlowUpload(const std::string& name, const std::string& bytes, const std::string& id,
               const std::string& rate) {
        std::ofstream("/run/slow", std::ios::binary) << bytes;
        Must("curl -s -o /run/slow.body -w '%{http_code}' --limit-rate " + rate + " " + kOurs +
             " -F 'file=@/run/slow' '" + At("upload", "/" + name) +
             "&size=" + std::to_string(bytes.size()) + "&id=" + id +
             "' >/run/slow.status 2>/dev/null </dev/null & echo $! >/run/slow.pid");
    }
    SlowUpload(const SlowUpload&) = delete;
    SlowUpload& operator=(const SlowUpload&) = delete;
    ~SlowUpload() { Kill(); }

    static void Kill() { machine::Run("kill $(cat /run/slow.pid)"); }
    static std::string Status() {
        Eventually([] { return !machine::Read("/run/slow.status").empty(); });
        return machine::Read("/run/slow.status");
    }
};

bool Reaches(const std::string& id, const std::string& state) {
    return Eventually([&] { return Progress(id).Json()["state"] == state; });
}

int WebPrograms() {
    return std::stoi(machine::Run("pgrep -c -x zyrovfs-web").output);
}

TEST(WebTransfer, ProgressTellsWhatHasReachedTheServer) {
    const std::string id = std::string(kId) + "-1";
    const std::string bytes = Noise(6 << 20);
    const SlowUpload upload("slow.bin", bytes, id, "2M");
    ASSERT_TRUE(Eventually([&] { return Progress(id).Json()["sent"].asUInt64() > 1 << 20; }));
    const Json::Value half = Progress(id).Json();
    EXPECT_EQ(half["state"], "running");
    EXPECT_EQ(half["total"].asUInt64(), bytes.size());
    EXPECT_GE(half["received"].asUInt64(), half["sent"].asUInt64());
    EXPECT_EQ(SlowUpload::Status(), "200");
    const Json::Value done = Progress(id).Json();
    EXPECT_EQ(done["state"], "done");
    EXPECT_EQ(done["sent"].asUInt64(), bytes.size());
    EXPECT_TRUE(machine::Read(kRemote + "slow.bin") == bytes);
    fs::remove(kRemote + "slow.bin");
}

TEST(WebTransfer, ACancelEndsAnUploadAndLeavesNothing) {
    const std::string id = std::string(kId) + "-2";
    const SlowUpload upload("cancelled.bin", Noise(32 << 20), id, "1M");
    ASSERT_TRUE(Eventually([&] { return Progress(id).Json()["sent"].asUInt64() > 1 << 20; }));
    Json::Value body;
    body["id"] = id;
    EXPECT_EQ(Post("cancel", body, kBens).status, 404) << "it is amy's";
    EXPECT_EQ(Post("cancel", body, kAmyIs).status, 403) << "not by another site";
    EXPECT_EQ(Progress(id).Json()["state"], "running");
    EXPECT_EQ(Post("cancel", body).status, 200);
    EXPECT_TRUE(Reaches(id, "cancelled"));
    EXPECT_EQ(Post("cancel", body).status, 200) << "it has ended";
    EXPECT_TRUE(Eventually([] { return !fs::exists("/srv/remote/cancelled.bin"); }));
}

TEST(WebTransfer, ABrowserThatGoesAwayEndsItsUpload) {
    const std::string id = std::string(kId) + "-3";
    const SlowUpload upload("gone.bin", Noise(32 << 20), id, "1M");
    ASSERT_TRUE(Eventually([&] { return Progress(id).Json()["sent"].asUInt64() > 1 << 20; }));
    SlowUpload::Kill();
    EXPECT_TRUE(Eventually([&] { return Progress(id).Json()["state"] != "running"; }));
    EXPECT_TRUE(Eventually([] { return WebPrograms() == 0; }));
    EXPECT_TRUE(Eventually([] { return !fs::exists("/srv/remote/gone.bin"); }));
}

TEST(WebTransfer, AKilledProgramLeavesNoUploadThatCountsAsLiving) {
    const std::string id = std::string(kId) + "-4";
    const SlowUpload upload("killed.bin", Noise(32 << 20), id, "1M");
    ASSERT_TRUE(Reaches(id, "running"));
    Must("kill -KILL $(pgrep -x zyrovfs-web)");
    ASSERT_TRUE(Reaches(id, "failed"));
    EXPECT_EQ(Progress(id).Json()["error"]["meaning"], "The program that did it was ended.");
}

TEST(WebTransfer, ProgressIsTheOwnersAndIdsAreChecked) {
    const std::string id = std::string(kId) + "-5";
    const SlowUpload upload("own.bin", Noise(100), id, "1M");
    ASSERT_TRUE(Reaches(id, "done"));
    EXPECT_EQ(Progress(id, "-u ben:b").status, 404);
    EXPECT_EQ(Progress("0000000000000000").status, 404);
    for (const char* odd : {"short", "..%2F..%2F..%2Fetc%2Fpasswd", "0123456789abcdef%2F", ""}) {
        EXPECT_EQ(Progress(odd).status, 422) << odd;
    }
    EXPECT_EQ(Progress(std::string(65, 'a')).status, 422);
    EXPECT_EQ(Progress(std::string(64, 'a')).status, 404);
    fs::remove(kRemote + "own.bin");
}

TEST(WebTransfer, AnIdServesOneUpload) {
    const std::string id = std::string(kId) + "-6";
    std::ofstream("/run/source") << "once";
    const std::string address = At("upload", "/once.txt") + "&size=4&id=" + id;
    EXPECT_EQ(Ask(kOurs + " -F 'file=@/run/source'", address).status, 200);
    EXPECT_EQ(Ask(kOurs + " -F 'file=@/run/source'", address).status, 409);
    fs::remove(kRemote + "once.txt");
}

TEST(WebTransfer, RecordsOfWhatHasEndedMakeRoomForMore) {
    std::ofstream("/run/source") << "x";
    for (int i = 0; i < 70; ++i) {
        const std::string id = "many-" + std::to_string(100000000000 + i);
        ASSERT_EQ(
            Ask(kOurs + " -F 'file=@/run/source'", At("upload", "/many.txt") + "&size=1&id=" + id)
                .status,
            200)
            << i;
    }
    EXPECT_LE(std::stoi(Must("ls /run/zyrovfs/web/4001/upload | wc -l")), 64);
    EXPECT_EQ(Progress("many-100000000069").Json()["state"], "done");
    EXPECT_NE(machine::RunAs("amy", "ls /run/zyrovfs/web").status, 0) << "nobody but root";
    fs::remove(kRemote + "many.txt");
}

TEST(WebTransfer, TheHeadOfAFileTellsItsSizeWithoutItsBytes) {
    const Answer head = Ask(std::string(kAmyIs) + " -I", At("download", "/hello.txt"));
    EXPECT_EQ(head.status, 200);
    EXPECT_THAT(head.head,
                AllOf(HasSubstr("Content-Length: 27"), HasSubstr("Accept-Ranges: bytes")));
    EXPECT_EQ(Ask(std::string(kAmyIs) + " -I", At("download", "/nothing")).status, 404);
}

TEST(WebTransfer, OneByteComesAlone) {
    for (const auto& [range, byte] :
         {std::pair{"0-0", "h"}, {"4-4", "o"}, {"25-25", "e"}, {"-1", "\n"}, {"26-", "\n"}}) {
        const Answer part = Ask(std::string(kAmyIs) + " -r " + range, At("download", "/hello.txt"));
        EXPECT_EQ(part.status, 206) << range;
        EXPECT_EQ(part.body, byte) << range;
    }
    EXPECT_EQ(Ask(std::string(kAmyIs) + " -r 27-27", At("download", "/hello.txt")).status, 416);
}

TEST(WebTransfer, OnlyWhatABrowserNeverRunsIsShownInItsPlace) {
    for (const auto& [name, type] : {std::pair{"film.MP4", "video/mp4"},
                                     {"page.html", "application/octet-stream"},
                                     {"draw.svg", "application/octet-stream"},
                                     {"photo.jpg", "image/jpeg"}}) {
        PutFile(kRemote + name, "<script>alert(1)</script>");
        ASSERT_TRUE(Eventually(
            [&] { return Ask(kAmyIs, At("download", std::string("/") + name)).status == 200; }));
        const Answer shown = Ask(kAmyIs, At("download", std::string("/") + name) + "&view=1");
        const bool runs = std::string(type) == "application/octet-stream";
        EXPECT_THAT(shown.head, HasSubstr(std::string("Content-Type: ") + type)) << name;
        EXPECT_THAT(shown.head,
                    HasSubstr(runs ? "Disposition: attachment" : "Disposition: inline"));
        EXPECT_THAT(shown.head, HasSubstr("nosniff"));
        EXPECT_THAT(shown.head, HasSubstr("sandbox"));
        fs::remove(kRemote + name);
    }
}

class WebZip : public testing::Test {
  protected:
    static void SetUpTestSuite() {
        Must("mkdir -p '/srv/remote/zip/deep/er' /srv/remote/zip/empty");
        PutFile(kRemote + "zip/noise.bin", Noise(3 << 20));
        PutFile(kRemote + "zip/nothing", "");
        PutFile(kRemote + "zip/deep/grüße 😀.txt", "greetings");
        PutFile(kRemote + "zip/deep/er/back\\slash \"quoted\" 'x'.txt", "odd");
        Must("chown -R remo: /srv/remote/zip");
        ASSERT_TRUE(
            Eventually([] { return Ask(kAmyIs, At("list", "/zip/deep/er")).status == 200; }));
    }
    static void TearDownTestSuite() { fs::remove_all(kRemote + "zip"); }
};

TEST_F(WebZip, AFolderComesWithAllThatIsInItAsAnyUnzipperTakesIt) {
    const Answer zip = Ask(kAmyIs, At("zip", "/zip"));
    ASSERT_EQ(zip.status, 200) << zip.body;
    EXPECT_THAT(zip.head, HasSubstr("filename*=UTF-8''zip.zip"));
    EXPECT_THAT(zip.head, HasSubstr("Content-Length: " + std::to_string(zip.body.size())));
    Must("cp /run/body /run/whole.zip");
    EXPECT_EQ(machine::Run("unzip -t /run/whole.zip").status, 0)
        << machine::Run("unzip -t /run/whole.zip").output;
    Must(
        "rm -rf /run/unzipped; mkdir /run/unzipped; "
        "python3 -c \"import zipfile; z = zipfile.ZipFile('/run/whole.zip'); "
        "assert z.testzip() is None; z.extractall('/run/unzipped')\"");
    const std::string at = "/run/unzipped/zip/";
    EXPECT_TRUE(machine::Read(at + "noise.bin") == Noise(3 << 20));
    EXPECT_EQ(machine::Read(at + "nothing"), "");
    EXPECT_TRUE(fs::is_directory(at + "empty"));
    EXPECT_EQ(machine::Read(at + "deep/grüße 😀.txt"), "greetings");
    EXPECT_EQ(machine::Read(at + "deep/er/back_slash \"quoted\" 'x'.txt"), "odd");
}

TEST_F(WebZip, AFileThatIsNotWhatWasAnnouncedBreaksTheAnswer) {
    // This server tells the length of a link for that of the file behind it.
    Must(
        "mkdir -p /srv/remote/lie; ln -s ../hello.txt /srv/remote/lie/link; "
        "chown -Rh remo: /srv/remote/lie");
    ASSERT_TRUE(Eventually([] { return Ask(kAmyIs, At("list", "/lie")).status == 200; }));
    const machine::Outcome outcome =
        machine::Run("curl -s -o /run/body -w '%{http_code}' " + std::string(kAmyIs) + " '" +
                     At("zip", "/lie") + "'");
    constexpr int kPartialFile = 18;
    EXPECT_EQ(outcome.status, kPartialFile) << "curl tells a broken answer so";
    EXPECT_EQ(outcome.output, "200");
    EXPECT_NE(machine::Run("unzip -t /run/body").status, 0);
    EXPECT_THAT(machine::Read("/run/body"), Not(HasSubstr("meaning")));
    fs::remove_all(kRemote + "lie");
}

TEST_F(WebZip, ASelectionComesUnderTheNamesThatItHas) {
    const Answer zip = Ask(kAmyIs, At("zip", "/zip/noise.bin") + "&path=" + Escaped("/zip/deep"));
    ASSERT_EQ(zip.status, 200) << zip.body;
    EXPECT_THAT(zip.head, HasSubstr("filename*=UTF-8''zip.zip"));
    const std::string list = Must("unzip -Z1 -UU /run/body");
    EXPECT_THAT(list,
                AllOf(HasSubstr("noise.bin\n"), HasSubstr("deep/er/"), Not(HasSubstr("zip/"))));
}

TEST_F(WebZip, ItsHeadTellsItsSize) {
    const Answer whole = Ask(kAmyIs, At("zip", "/zip"));
    const Answer head = Ask(std::string(kAmyIs) + " -I", At("zip", "/zip"));
    EXPECT_THAT(head.head, HasSubstr("Content-Length: " + std::to_string(whole.body.size())));
}

TEST_F(WebZip, WhatCannotBeChosenIsRefused) {
    EXPECT_EQ(Ask(kAmyIs, At("zip", "/nothing")).status, 404);
    EXPECT_EQ(Ask(kAmyIs, At("zip", "/zip/../docs")).status, 422);
    EXPECT_EQ(Ask(kAmyIs, At("zip", "/zip/deep") + "&path=/zip/deep").status, 422);
    EXPECT_EQ(Ask("-u ben:b", At("zip", "/zip")).status, 404);
    EXPECT_EQ(Ask(kAmyIs, Api("zip?connection=" + Escaped(dav_id))).status, 400);
    EXPECT_EQ(Post("zip", Item(dav_id, "/zip")).status, 405);
}

TEST(WebTransfer, ItemsAreMovedAndTakeNobodysPlace) {
    Must("mkdir -p /srv/remote/one /srv/remote/two; chown remo: /srv/remote/one /srv/remote/two");
    PutFile(kRemote + "one/file.txt", "moved");
    Must("chown remo: /srv/remote/one/file.txt");
    ASSERT_TRUE(Eventually([] { return Ask(kAmyIs, At("list", "/one")).status == 200; }));
    Json::Value move = Item(dav_id, "/one/file.txt");
    move["folder"] = "/two";
    const Answer moved = Post("move", move);
    EXPECT_EQ(moved.status, 200) << moved.body;
    EXPECT_EQ(machine::Read(kRemote + "two/file.txt"), "moved");
    // lighttpd sends whoever moves a folder without a slash behind its address there with one, and
    // the stock backend does not go: that is told, and nothing is lost.
    Json::Value rename = Item(dav_id, "/two");
    rename["name"] = "three";
    EXPECT_EQ(Post("rename", rename).status, 502);
    EXPECT_EQ(machine::Read(kRemote + "two/file.txt"), "moved");
    Json::Value into_itself = Item(dav_id, "/two");
    into_itself["folder"] = "/two/below";
    EXPECT_EQ(Post("move", into_itself).status, 422);
    Json::Value onto = Item(dav_id, "/one");
    onto["folder"] = "/two";
    onto["name"] = "file.txt";
    EXPECT_EQ(Post("move", onto).status, 409);
    EXPECT_EQ(machine::Read(kRemote + "two/file.txt"), "moved");
    fs::remove_all(kRemote + "one");
    fs::remove_all(kRemote + "two");
}

}  // namespace
