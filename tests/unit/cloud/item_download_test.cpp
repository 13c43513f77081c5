// What the tests of drivers leave: an address that changes between two attempts.
#include "cloud/item_download.h"

#include <gmock/gmock.h>

#include "support/bare_driver.h"
#include "support/seams.h"
#include "support/wire_server.h"

namespace ZYROCloud {
namespace {

using namespace ZYROVFS;  // NOLINT(google-build-using-namespace)
using testing::HasSubstr;
using testing::SizeIs;

constexpr FrameRules kFrame{true, nullptr, false, false};
std::string received;

size_t Keep(char* data, size_t size, size_t count, void*) {
    received.append(data, size * count);
    return size * count;
}

class Drive : public bare::Driver<PublicCloud> {
  public:
    Drive() { Init(); }
    bool SetRefreshTokenParam(APIHandler*) override { return false; }
};

class ItemDownloads : public testing::Test {
  protected:
    void SetUp() override {
        seams::Reset();
        received.clear();
        meta["url"] = server.Url("/a!b");
    }
    bool Download(const ItemDownload& rules) { return DownloadByUrl(drive, &xfer, meta, rules); }

    const wire::WireServer server{{{wire::ReadRequest(), wire::Send(wire::Answer(503))},
                                   {wire::ReadRequest(), wire::Send(wire::Answer(200, "x"))}}};
    Drive drive;
    XferContext context;
    XferData xfer{Keep, 0, &context};
    Json::Value meta;
};

TEST_F(ItemDownloads, AskAtAnotherAddressWhenTheDriverSaysSo) {
    const ItemDownload rules{kFrame, false, [](std::string& url) {
                                 url += "/anew";
                                 return true;
                             }};
    EXPECT_TRUE(Download(rules)) << seams::LogDump();
    EXPECT_EQ(received, "x");
    EXPECT_THAT(server.Received().front(), testing::StartsWith("GET /a!b HTTP/1.1\r\n"));
    EXPECT_THAT(server.Received().back(), testing::StartsWith("GET /a!b/anew HTTP/1.1\r\n"));
    EXPECT_TRUE(seams::LoggedPart("item_download_test.cpp:")) << seams::LogDump();
}

TEST_F(ItemDownloads, EndWhenThereIsNoOtherAddress) {
    EXPECT_FALSE(Download({kFrame, false, [](std::string&) { return false; }}));
    EXPECT_EQ(drive.GetErrorCode(), VFS_ERR_SERVER_ERROR);
    EXPECT_THAT(server.Received(), SizeIs(1));
    EXPECT_FALSE(seams::LoggedPart("Retry Download")) << seams::LogDump();
}

TEST_F(ItemDownloads, EscapeTheAddressOfAServiceThatWantsIt) {
    EXPECT_TRUE(Download({kFrame, true}));
    EXPECT_THAT(server.Received().back(), HasSubstr("GET /a%21b HTTP/1.1\r\n"));
}

}  // namespace
}  // namespace ZYROCloud
