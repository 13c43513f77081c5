// The tables of all services, each row over a real connection, with the body that it needs.
#include "http/error_handler_table.h"

#include "unit/http/http_fixture.h"

namespace ZYROCloud {
namespace {

struct Row {
    int status;
    std::string body;
    unsigned platform;
    int code;
};

/** Sends each row's answer over one connection and compares what the handler makes of it. */
template <typename Errors>
void CheckRows(const std::vector<Row>& rows, const std::string& log) {
    wire::Script script;
    for (const Row& row : rows) {
        script.push_back(wire::ReadRequest());
        script.push_back(wire::Send(wire::Answer(row.status, row.body)));
    }
    const wire::WireServer server({script});
    Conversation<Errors> talk(false);
    for (const Row& row : rows) {
        YLIBCErrSetEx(0x77, "test", 1);
        const bool failure = row.code != VFS_ERR_NONE;
        EXPECT_EQ(talk.Get(server.Url()), !failure) << row.status << row.body;
        EXPECT_EQ(talk.Code(), row.code) << row.status << row.body;
        EXPECT_EQ(YLIBCErrGet(), row.platform) << row.status << row.body;
        EXPECT_EQ(talk.Status(), row.status);
        EXPECT_EQ(talk.Curl(), 0);
        EXPECT_EQ(seams::Logged(log + std::to_string(row.status)), failure) << seams::LogDump();
        seams::Reset();
    }
    EXPECT_TRUE(server.Finished());
    EXPECT_EQ(server.Connections(), 1U);
}

std::string GoogleReason(const std::string& reason) {
    return R"({"error":{"code":403,"errors":[{"domain":"x","reason":")" + reason + R"("}]}})";
}

TEST(GDriveErrorHandler, EveryRowOfTheTable) {
    CheckRows<GDriveErrorHandler>(
        {
            {200, "ok", 0, VFS_ERR_NONE},
            {304, "", 0, VFS_ERR_NONE},
            {308, "", 0, VFS_ERR_NONE},
            {400, R"({"error":"invalid_grant"})", 0x300, VFS_ERR_UNAUTHORIZED},
            {400, R"({"error":"invalid_client"})", 0xd100, VFS_ERR_TOKEN_REVOKED},
            {400, "no json", 0xd100, VFS_ERR_TOKEN_REVOKED},
            {401, "", 0x300, VFS_ERR_UNAUTHORIZED},
            {403, GoogleReason("quotaExceeded"), 0x2400, VFS_ERR_QUOTA_EXCEEDED},
            {403, GoogleReason("userRateLimitExceeded"), 0xd100, VFS_ERR_RATE_LIMITED},
            {403, GoogleReason("rateLimitExceeded"), 0xd100, VFS_ERR_RATE_LIMITED},
            {403, GoogleReason("dailyLimitExceeded"), 0xd100, VFS_ERR_UNAUTHORIZED},
            {403, GoogleReason("appNotInstalled"), 0xd100, VFS_ERR_UNAUTHORIZED},
            {403, GoogleReason("userAccess"), 0xd100, VFS_ERR_UNAUTHORIZED},
            {403, GoogleReason("appNotConfigured"), 0xd100, VFS_ERR_UNAUTHORIZED},
            {403, GoogleReason("appBlacklisted"), 0xd100, VFS_ERR_UNAUTHORIZED},
            {403, GoogleReason("another"), 0x300, VFS_ERR_FORBIDDEN},
            {403, "", 0x300, VFS_ERR_FORBIDDEN},
            {404, "", 0x600, VFS_ERR_NOT_FOUND},
            {409, "", 0x8100, VFS_ERR_UNKNOWN},
            {499, "", 0x8100, VFS_ERR_UNKNOWN},
            {500, "", 0x8100, VFS_ERR_SERVER_ERROR},
            {502, "", 0xd100, VFS_ERR_SERVER_ERROR},
            {503, "", 0x8100, VFS_ERR_SERVER_ERROR},
        },
        "google-drive response error code=");
}

TEST(GDriveErrorHandler, TheReasonOfA403TakesThePlaceOfTheBody) {
    const wire::WireServer server({Once(wire::Answer(403, GoogleReason("quotaExceeded")))});
    Conversation<GDriveErrorHandler> talk(false);
    EXPECT_FALSE(talk.Get(server.Url()));
    EXPECT_EQ(talk.api.GetError()["msg"], "quotaExceeded");
}

TEST(OneDriveErrorHandler, EveryRowOfTheTable) {
    CheckRows<OneDriveErrorHandler>(
        {
            {206, "ok", 0, VFS_ERR_NONE},
            {400, R"({"error":"resource_already_exists"})", 0xa300, VFS_ERR_CONFLICT},
            {400, R"({"error":{"code":"resource_already_exists"}})", 0xa300, VFS_ERR_CONFLICT},
            {400, R"({"error":{"code":"request_parameter_too_large"}})", 0xc300,
             VFS_ERR_NAME_TOO_LONG},
            {400, R"({"error":{"code":"request_parameter_invalid"}})", 0xbe00,
             VFS_ERR_INVALID_NAME},
            {400, R"({"error":"invalid_grant"})", 0x300, VFS_ERR_UNAUTHORIZED},
            {400, R"({"error":{"code":"invalid_grant"}})", 0xd100, VFS_ERR_TOKEN_REVOKED},
            {400, "", 0xd100, VFS_ERR_TOKEN_REVOKED},
            {401, "", 0x300, VFS_ERR_UNAUTHORIZED},
            {403, "", 0x300, VFS_ERR_FORBIDDEN},
            {404, "", 0x600, VFS_ERR_NOT_FOUND},
            {409, "", 0x8100, VFS_ERR_UNKNOWN},
            {413, "", 0x8200, VFS_ERR_FILE_TOO_LARGE},
            {416, "", 0x8100, VFS_ERR_RANGE_FAILED},
            {420, "", 0xd100, VFS_ERR_RATE_LIMITED},
            {500, "", 0x8100, VFS_ERR_SERVER_ERROR},
            {501, "", 0xd100, VFS_ERR_SERVER_ERROR},
            {503, "", 0x8100, VFS_ERR_SERVER_ERROR},
            {507, "", 0x2400, VFS_ERR_QUOTA_EXCEEDED},
        },
        "OneDrive response error code=");
}

TEST(BoxErrorHandler, EveryRowOfTheTable) {
    CheckRows<BoxErrorHandler>(
        {
            {201, "ok", 0, VFS_ERR_NONE},
            {400, R"({"code":"item_name_invalid"})", 0xbe00, VFS_ERR_INVALID_NAME},
            {400, R"({"error":"invalid_grant"})", 0x300, VFS_ERR_UNAUTHORIZED},
            {400, R"({"code":"bad_request"})", 0xd100, VFS_ERR_TOKEN_REVOKED},
            {401, "", 0x300, VFS_ERR_UNAUTHORIZED},
            {403, R"({"code":"storage_limit_exceeded"})", 0x2400, VFS_ERR_QUOTA_EXCEEDED},
            {403, R"({"code":"file_size_limit_exceeded"})", 0x8200, VFS_ERR_FILE_TOO_LARGE},
            {403, R"({"code":"item_name_invalid"})", 0x300, VFS_ERR_FORBIDDEN},
            {403, "", 0x300, VFS_ERR_FORBIDDEN},
            {404, "", 0x600, VFS_ERR_NOT_FOUND},
            {405, "", 0xd100, VFS_ERR_NOT_SUPPORTED},
            {409, R"({"code":"storage_limit_exceeded"})", 0xa300, VFS_ERR_CONFLICT},
            {410, "", 0x8100, VFS_ERR_UNKNOWN},
            {412, "", 0x8100, VFS_ERR_BAD_REQUEST},
            {429, "", 0x8100, VFS_ERR_RATE_LIMITED},
            {500, "", 0x8100, VFS_ERR_SERVER_ERROR},
            {502, "", 0xd100, VFS_ERR_SERVER_ERROR},
            {503, "", 0x8100, VFS_ERR_SERVER_ERROR},
        },
        "Box response error code=");
}

std::string Tagged(const std::string& error) {
    return R"({"error_summary":"x","error":)" + error + "}";
}

TEST(DropboxErrorHandler, EveryRowOfTheTable) {
    const auto tag = [](const std::string& text) {
        return Tagged(R"({".tag":")" + text + R"("})");
    };
    CheckRows<DropboxErrorHandler>(
        {
            {200, "ok", 0, VFS_ERR_NONE},
            {400, R"({"error":"invalid_grant"})", 0x8100, VFS_ERR_TOKEN_REVOKED},
            {401, "", 0x300, VFS_ERR_UNAUTHORIZED},
            {403, "", 0x8100, VFS_ERR_UNKNOWN},
            {409, tag("no_permission"), 0x300, VFS_ERR_PERMISSION_DENIED},
            {409, tag("no_write_permission"), 0x300, VFS_ERR_PERMISSION_DENIED},
            {409, tag("not_found"), 0x600, VFS_ERR_NOT_FOUND},
            {409, tag("too_many_files"), 0x8100, VFS_ERR_TOO_MANY_FILES},
            {409, tag("conflict"), 0xa300, VFS_ERR_CONFLICT},
            {409, tag("insufficient_space"), 0x2900, VFS_ERR_NO_SPACE},
            {409, tag("other"), 0x8100, VFS_ERR_BAD_REQUEST},
            {429, "", 0x8100, VFS_ERR_RATE_LIMITED},
            {500, "", 0xd100, VFS_ERR_SERVER_ERROR},
            {503, "", 0x8100, VFS_ERR_RATE_LIMITED},
            {507, "", 0x2400, VFS_ERR_QUOTA_EXCEEDED},
        },
        "dropbox response error code=");
}

TEST(DropboxErrorHandler, TheDetailOfA409IsTheInnermostTag) {
    std::vector<Row> rows = {
        {409, Tagged(R"({".tag":"path","reason":{".tag":"conflict"}})"), 0xa300, VFS_ERR_CONFLICT},
        {409, Tagged(R"({".tag":"path","path":{".tag":"conflict"},"reason":{".tag":"not_found"}})"),
         0xa300, VFS_ERR_CONFLICT},
        {409, Tagged(R"({".tag":"path"})"), 0x8100, VFS_ERR_BAD_REQUEST},
        {409, Tagged(R"({".tag":"path","path":"not_found"})"), 0x8100, VFS_ERR_BAD_REQUEST},
        {409, Tagged(R"({".tag":"path","path":{".tag":["not_found"]}})"), 0x8100,
         VFS_ERR_BAD_REQUEST},
        {409, Tagged(R"({".tag":"cursor","cursor":{".tag":"not_found"}})"), 0x8100,
         VFS_ERR_BAD_REQUEST},
        {409, Tagged(R"("not_found")"), 0x8100, VFS_ERR_BAD_REQUEST},
        {409, Tagged("[]"), 0x8100, VFS_ERR_BAD_REQUEST},
        {409, "[]", 0x8100, VFS_ERR_BAD_REQUEST},
        {409, "Error in call", 0x8100, VFS_ERR_BAD_REQUEST},
        {409, "", 0x8100, VFS_ERR_BAD_REQUEST},
    };
    for (const std::string outer : {"path", "path_lookup", "from_lookup", "from_write", "to"}) {
        rows.push_back(
            {409, Tagged(R"({".tag":")" + outer + R"(",")" + outer + R"(":{".tag":"not_found"}})"),
             0x600, VFS_ERR_NOT_FOUND});
    }
    CheckRows<DropboxErrorHandler>(rows, "dropbox response error code=");
}

TEST(DropboxErrorHandler, TheAnswerOf409IsLogged) {
    const wire::WireServer server({Once(wire::Answer(409, Tagged(R"({".tag":"conflict"})")))});
    Conversation<DropboxErrorHandler> talk(false);
    EXPECT_FALSE(talk.Get(server.Url()));
    EXPECT_TRUE(seams::LoggedPart("Dropbox Error: {")) << seams::LogDump();
}

TEST(DavErrorHandler, EveryRowOfTheTable) {
    std::vector<Row> rows = {
        {207, "ok", 0, VFS_ERR_NONE},
        {405, "", 0xd900, VFS_ERR_COMMAND_REFUSED},
        {408, "", 0x6400, VFS_ERR_REQUEST_TIMEOUT},
        {504, "", 0x6400, VFS_ERR_REQUEST_TIMEOUT},
        {409, "", 0xa300, VFS_ERR_CONFLICT},
        {413, "", 0x8200, VFS_ERR_FILE_TOO_LARGE},
        {507, "", 0x2900, VFS_ERR_NO_SPACE},
    };
    for (const int status : {401, 402, 403, 407, 423}) {
        rows.push_back({status, "", 0x300, VFS_ERR_PERMISSION_DENIED});
    }
    for (const int status : {404, 410}) {
        rows.push_back({status, "", 0x600, VFS_ERR_NOT_FOUND});
    }
    for (const int status : {400, 411, 412, 414, 415, 424, 501}) {
        rows.push_back({status, "", 0x8100, VFS_ERR_BAD_REQUEST});
    }
    for (const int status : {406, 418, 500, 502, 503, 599}) {
        rows.push_back({status, "", 0x6c00, VFS_ERR_REMOTE_FAILED});
    }
    CheckRows<DavErrorHandler>(rows, "dav response error code=");
}

// Bodies that are no use at all never fail the mapping: the row without a detail counts.

std::vector<std::string> BadBodies() {
    std::string deep;
    for (int i = 0; i < 10000; ++i) {
        deep += "{\"error\":";
    }
    return {deep,
            std::string(10000, '['),
            R"({"error":{"errors":[{"reason":"quotaExce)",
            R"({"code":1e400,"error":99999999999999999999999})",
            R"({"code":{},"error":{"code":[],"errors":{},".tag":{}}})",
            R"({"error":{"errors":[]}})",
            R"({"error":{"errors":[[]]}})",
            R"({"error":{"errors":[{"reason":7}]}})",
            std::string("\0\xff\xfe{}", 5),
            "\x1f\x8b\x08\x00garbage that a gzip stream could be",
            std::string(1 << 20, 'x')};
}

template <typename Errors>
void CheckBadBodies(int status, int code) {
    std::vector<wire::Script> scripts;
    for (const std::string& body : BadBodies()) {
        scripts.push_back(Once(wire::Answer(status, body, "Content-Encoding: gzip\r\n")));
    }
    const wire::WireServer server(scripts);
    for (size_t i = 0; i < scripts.size(); ++i) {
        Conversation<Errors> talk(false);
        EXPECT_FALSE(talk.Get(server.Url()));
        EXPECT_EQ(talk.Code(), code) << status << " body " << i;
    }
    EXPECT_TRUE(server.Finished());
}

TEST(ErrorHandler, ABodyThatIsNoJsonGivesTheRowWithoutADetail) {
    CheckBadBodies<GDriveErrorHandler>(400, VFS_ERR_TOKEN_REVOKED);
    CheckBadBodies<GDriveErrorHandler>(403, VFS_ERR_FORBIDDEN);
    CheckBadBodies<OneDriveErrorHandler>(400, VFS_ERR_TOKEN_REVOKED);
    CheckBadBodies<OneDriveErrorHandler>(420, VFS_ERR_RATE_LIMITED);
    CheckBadBodies<BoxErrorHandler>(400, VFS_ERR_TOKEN_REVOKED);
    CheckBadBodies<BoxErrorHandler>(403, VFS_ERR_FORBIDDEN);
    CheckBadBodies<DropboxErrorHandler>(409, VFS_ERR_BAD_REQUEST);
}

// FTP: the reply comes to the user's name, where libcurl takes any code.

struct Reply {
    int reply;
    unsigned platform;
    int code;
};

TEST(FTPErrorHandler, EveryRowOfTheTable) {
    std::vector<Reply> rows = {{530, 0x300, VFS_ERR_PERMISSION_DENIED},
                               {553, 0x300, VFS_ERR_PERMISSION_DENIED},
                               {452, 0x2900, VFS_ERR_NO_SPACE},
                               {552, 0x2900, VFS_ERR_NO_SPACE}};
    for (const int reply : {332, 500, 501, 502, 503, 504, 522, 532}) {
        rows.push_back({reply, 0xd900, VFS_ERR_COMMAND_REFUSED});
    }
    for (const int reply : {425, 426, 450, 451, 550, 551, 454, 599}) {
        rows.push_back({reply, 0x600, VFS_ERR_NOT_FOUND});
    }
    std::vector<wire::Script> scripts;
    for (const Reply& row : rows) {
        scripts.push_back({wire::Send("220 hello\r\n"), wire::ReadLine(),
                           wire::Send(std::to_string(row.reply) + " no\r\n")});
    }
    const wire::WireServer server(scripts);
    for (const Reply& row : rows) {
        Conversation<FTPErrorHandler> talk;
        EXPECT_FALSE(talk.Get(server.Url("/file", "ftp")));
        EXPECT_EQ(talk.Status(), row.reply);
        EXPECT_EQ(talk.Code(), row.code) << row.reply;
        EXPECT_EQ(YLIBCErrGet(), row.platform) << row.reply;
        EXPECT_TRUE(seams::Logged("ftp response error code=" + std::to_string(row.reply)));
    }
    EXPECT_TRUE(server.Finished());
}

TEST(FTPErrorHandler, RepliesBelow300AreSuccessesAnd421SaysThatTheServiceGoes) {
    FTPErrorHandler errors;
    for (const int reply : {120, 226, 299}) {
        __tag_vfs_err_ code = VFS_ERR_UNKNOWN;
        YLIBCErrSetEx(0x77, "test", 1);
        EXPECT_TRUE(errors.ParseError(reply, &code));
        EXPECT_EQ(code, VFS_ERR_NONE);
        EXPECT_EQ(YLIBCErrGet(), 0U);
    }
    __tag_vfs_err_ code = VFS_ERR_NONE;
    EXPECT_FALSE(errors.ParseError(421, &code));
    EXPECT_EQ(code, VFS_ERR_SERVICE_UNAVAILABLE);
    EXPECT_EQ(YLIBCErrGet(), 0x6400U);
    EXPECT_FALSE(errors.ParseError(331, &code));
    EXPECT_EQ(code, VFS_ERR_NOT_FOUND);
}

TEST(FTPErrorHandler, AServerThatClosesWith421IsNotTriedAgain) {
    const wire::WireServer server({{wire::Send("421 too many users\r\n")}});
    Conversation<FTPErrorHandler> talk;
    EXPECT_FALSE(talk.Get(server.Url("/file", "ftp"), 6));
    EXPECT_EQ(talk.Status(), 421);
    EXPECT_EQ(server.Connections(), 1U);
    EXPECT_THAT(seams::Sleeps(), IsEmpty());
}

}  // namespace
}  // namespace ZYROCloud
