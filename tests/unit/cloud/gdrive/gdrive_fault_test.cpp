#include "unit/cloud/gdrive/gdrive_fixture.h"

namespace ZYROCloud {
namespace {

constexpr const char* kFiles = "/drive/v2/files";

/** A folder of two pages; the second one is what goes wrong. */
class GDriveFaults : public GDriveTest {
  protected:
    void SetUp() override {
        GDriveTest::SetUp();
        many = amy.AddFolder(root, "many");
        amy.AddMany(many, 150, 1);
    }
    static Fault Second() { return Fault::On("GET", kFiles).After(1); }
    bool List() {
        out = Json::Value();
        drive->SetError(VFS_ERR_NONE, "");
        service.Journal().Clear();
        return drive->ListFolder(many, Json::Value(), out);
    }

    std::string many;
    Json::Value out;
};

TEST_F(GDriveFaults, WhatPassesIsAskedAgainAndNoItemIsLostOrDoubled) {
    const std::string limit = cloudsim::GDrive::ErrorText(403, "userRateLimitExceeded");
    for (const Fault& fault :
         {Second().Answer(500), Second().Answer(503).Times(3), Second().Answer(403, limit).Times(6),
          Second().Close(cloudsim::Break::kBeforeBody), Second().LoseAnswer(),
          Second().Close(cloudsim::Break::kBeforeBody).Reset(), Second().CloseAfterAnswer(),
          Second().Delay(0.05), Fault::On("GET", kFiles).CloseAfterAnswer(),
          Second().ExpireToken()}) {
        service.AddFault(fault);
        EXPECT_TRUE(List()) << fault.Text() << seams::LogDump();
        EXPECT_EQ(out.size(), 150U) << fault.Text();
        EXPECT_EQ(out[0]["title"], "item-000000.bin") << fault.Text();
        EXPECT_EQ(out[149]["title"], "item-000149.bin") << fault.Text();
        EXPECT_THAT(service.UnusedFaults(), IsEmpty()) << fault.Text();
        service.ClearFaults();
    }
}

TEST_F(GDriveFaults, WhatDoesNotPassFailsTheListingWithItsCode) {
    const auto refusal = [](const char* reason) {
        return cloudsim::GDrive::ErrorText(403, reason);
    };
    const struct {
        Fault fault;
        __tag_vfs_err_ code;
    } rows[] = {
        {Second().Answer(404), VFS_ERR_NOT_FOUND},
        {Second().Answer(500).Times(7), VFS_ERR_SERVER_ERROR},
        {Second().Answer(403, refusal("rateLimitExceeded")).Times(7), VFS_ERR_RATE_LIMITED},
        {Second().Answer(403, refusal("quotaExceeded")), VFS_ERR_QUOTA_EXCEEDED},
        {Second().Answer(403, refusal("insufficientPermissions")).Times(7), VFS_ERR_FORBIDDEN},
        {Second().CutAnswer(100), VFS_ERR_CLOUD_FAILED},
        {Second().CutAnswer(0), VFS_ERR_CLOUD_FAILED},
        {Second().Body("{\"items\":[" + std::string(10000, '[')), VFS_ERR_CLOUD_FAILED},
        {Second().Body(R"({"items":[{"title":1e400}]})"), VFS_ERR_CLOUD_FAILED},
        {Second().HeaderLine("no colon"), VFS_ERR_CLOUD_FAILED},
        {Second().Raw("HTTP/1.1 200 OK\r\nContent-Encoding: gzip\r\n\r\nno gzip"),
         VFS_ERR_CLOUD_FAILED},
    };
    for (const auto& row : rows) {
        service.AddFault(row.fault);
        EXPECT_FALSE(List()) << row.fault.Text();
        EXPECT_EQ(drive->GetErrorCode(), row.code) << row.fault.Text() << seams::LogDump();
        EXPECT_EQ(out.size(), 100U) << row.fault.Text() << ": the first page stays";
        EXPECT_THAT(service.UnusedFaults(), IsEmpty()) << row.fault.Text();
        service.ClearFaults();
    }
}

TEST_F(GDriveFaults, ATokenThatIsRefusedTwiceFailsTheListing) {
    service.AddFault(Fault::On("GET", kFiles).Times(2).Answer(401));
    EXPECT_FALSE(List());
    EXPECT_EQ(drive->GetErrorCode(), VFS_ERR_UNAUTHORIZED);
    EXPECT_THAT(Requests(),
                ElementsAre("GET /drive/v2/files", "POST /o/oauth2/token", "GET /drive/v2/files"));
}

TEST_F(GDriveFaults, AGrantThatWasTakenBackFailsTheListing) {
    amy.ExpireAccessTokens();
    amy.RevokeRefreshTokens();
    EXPECT_FALSE(List());
    EXPECT_EQ(drive->GetErrorCode(), VFS_ERR_UNAUTHORIZED) << seams::LogDump();
    EXPECT_THAT(Requests(), ElementsAre("GET /drive/v2/files", "POST /o/oauth2/token"));
}

TEST_F(GDriveFaults, HeaderLinesOfAnyKindDoNotDisturb) {
    for (const std::string& line : {std::string("X-Empty:"), std::string("X-Binary: \xff\xfe\x01"),
                                    "X-Long: " + std::string(64 * 1024, 'x')}) {
        service.AddFault(Fault::On("GET", kFiles).HeaderLine(line));
        EXPECT_TRUE(List()) << line.substr(0, 20) << seams::LogDump();
        EXPECT_EQ(out.size(), 150U) << line.substr(0, 20);
    }
}

TEST_F(GDriveFaults, AServiceThatIsNotThereFailsEveryQuestion) {
    Json::Value document;
    ASSERT_TRUE(json::fromFile(document, paths::kServiceConfig));
    document["hosts"]["GoogleApiHost"] = "http://127.0.0.1:1";
    ASSERT_TRUE(json::toFile(document, paths::kServiceConfig, 0640));
    EXPECT_FALSE(List());
    EXPECT_EQ(drive->GetErrorCode(), VFS_ERR_CONNECT_FAILED);
    EXPECT_FALSE(drive->GetAccountInfo(Json::Value(), out));
    EXPECT_FALSE(drive->GetFileInfo("1", Object("{}"), out));
    std::string id;
    EXPECT_FALSE(drive->GetFileIDByPathFromServer("", "/a", "", "", id));
    EXPECT_EQ(drive->GetErrorCode(), VFS_ERR_NOT_FOUND) << "a walk has no other code";
}

}  // namespace
}  // namespace ZYROCloud
