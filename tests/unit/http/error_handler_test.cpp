#include "http/error_handler.h"

#include "unit/http/http_fixture.h"

namespace ZYROCloud {
namespace {

Json::Value Record(int curl, int status, const std::string& body = "") {
    Json::Value record;
    record["curl_code"] = curl;
    record["response_code"] = status;
    record["msg"] = body;
    return record;
}

struct Outcome {
    bool success;
    int code;
    unsigned platform;
    bool operator==(const Outcome& o) const {
        return success == o.success && code == o.code && platform == o.platform;
    }
};
void PrintTo(const Outcome& o, std::ostream* out) {
    *out << o.success << " code " << o.code << " platform " << std::hex << o.platform;
}

constexpr unsigned kUntouched = 0x77;

template <typename Errors>
Outcome Judge(Errors& errors, int curl, int status, const std::string& body = "",
              bool return_on_error = true, unsigned platform = kUntouched) {
    YLIBCErrSetEx(platform, "test", 1);
    const bool success = errors.ParseError(Record(curl, status, body), return_on_error);
    return {success, errors.GetErrorCode(), YLIBCErrGet()};
}

TEST(ErrorHandler, EveryRowOfTheCurlTable) {
    struct Row {
        int curl;
        unsigned platform;
        int code;
        int result;
    };
    const Row rows[] = {
        {0, 0, VFS_ERR_NONE, 0},
        {2, 0xd100, VFS_ERR_NOT_SUPPORTED, 1},
        {5, 0x1100, VFS_ERR_CONNECT_FAILED, 1},
        {6, 0x1100, VFS_ERR_CONNECT_FAILED, 1},
        {7, 0x1100, VFS_ERR_CONNECT_FAILED, 1},
        {35, 0x1100, VFS_ERR_CONNECT_FAILED, 1},
        {9, 0x300, VFS_ERR_PERMISSION_DENIED, 1},
        {13, 0xd100, VFS_ERR_COMMAND_REFUSED, 1},
        {21, 0xd900, VFS_ERR_COMMAND_REFUSED, 1},
        {22, kUntouched, VFS_ERR_NONE, 2},
        {23, kUntouched, VFS_ERR_TRANSFER_ABORTED, 1},
        {42, kUntouched, VFS_ERR_TRANSFER_ABORTED, 1},
        {28, 0x1100, VFS_ERR_TIMEOUT, 1},
        {56, 0x8100, VFS_ERR_RECEIVE_FAILED, 1},
        {70, 0x2900, VFS_ERR_NO_SPACE, 1},
        {73, 0x800, VFS_ERR_FILE_EXISTS, 1},
        {78, 0x600, VFS_ERR_NOT_FOUND, 1},
        {1, 0x8100, VFS_ERR_UNKNOWN, 2},
        {18, 0x8100, VFS_ERR_UNKNOWN, 2},
        {60, 0x8100, VFS_ERR_UNKNOWN, 2},
    };
    for (const Row& row : rows) {
        ErrorHandler errors;
        YLIBCErrSetEx(kUntouched, "test", 1);
        __tag_vfs_err_ code = VFS_ERR_NONE;
        EXPECT_EQ(errors.ParseCurlError(row.curl, &code), row.result) << row.curl;
        EXPECT_EQ(code, row.code) << row.curl;
        EXPECT_EQ(YLIBCErrGet(), row.platform) << row.curl;
    }
    EXPECT_TRUE(seams::Logged("Non-handled curl error code=18"));
    EXPECT_FALSE(seams::LoggedPart("code=22"));
}

TEST(ErrorHandler, AWriteFailureAndAnAbortAreCancelledWhenTheUserWantedThat) {
    for (const int curl : {23, 42}) {
        ErrorHandler errors;
        EXPECT_EQ(Judge(errors, curl, 200, "", true, 0xa600),
                  (Outcome{false, VFS_ERR_CANCELLED, 0xa600}));
        EXPECT_EQ(Judge(errors, curl, 200), (Outcome{false, VFS_ERR_TRANSFER_ABORTED, kUntouched}));
    }
}

TEST(ErrorHandler, Curl42AfterACancelIsCancelledWithoutStatusMappingAndRetry) {
    BoxErrorHandler errors;
    EXPECT_EQ(Judge(errors, 42, 503, "", true, 0xa600),
              (Outcome{false, VFS_ERR_CANCELLED, 0xa600}));
    EXPECT_FALSE(errors.IsNeedRetry());
    EXPECT_FALSE(seams::LoggedPart("Box response error"));
}

TEST(ErrorHandler, Curl22WithStatus404AndReturnOnErrorIsNotFound) {
    BoxErrorHandler errors;
    EXPECT_EQ(Judge(errors, 22, 404), (Outcome{false, VFS_ERR_NOT_FOUND, 0x600}));
}

TEST(ErrorHandler, Curl28WithStatus200StaysATimeout) {
    BoxErrorHandler errors;
    EXPECT_EQ(Judge(errors, 28, 200), (Outcome{false, VFS_ERR_TIMEOUT, 0x1100}));
}

TEST(ErrorHandler, Curl18WithStatus200IsASuccess) {
    BoxErrorHandler errors;
    EXPECT_EQ(Judge(errors, 18, 200), (Outcome{true, VFS_ERR_NONE, 0}));
    EXPECT_EQ(Judge(errors, 18, 0), (Outcome{false, VFS_ERR_UNKNOWN, 0x8100}));
}

TEST(ErrorHandler, OnlyConnectTimeoutAbortAndCancelKeepTheirCodeBeforeAStatus) {
    BoxErrorHandler errors;
    EXPECT_EQ(Judge(errors, 7, 500).code, VFS_ERR_CONNECT_FAILED);
    EXPECT_EQ(Judge(errors, 28, 500).code, VFS_ERR_TIMEOUT);
    EXPECT_EQ(Judge(errors, 23, 500).code, VFS_ERR_TRANSFER_ABORTED);
    EXPECT_EQ(Judge(errors, 56, 500).code, VFS_ERR_SERVER_ERROR);
    EXPECT_EQ(Judge(errors, 56, 0).code, VFS_ERR_RECEIVE_FAILED);
    EXPECT_EQ(Judge(errors, 9, 404).code, VFS_ERR_NOT_FOUND);
}

TEST(ErrorHandler, ACurlFailureBehindARedirectionIsNoSuccess) {
    for (const int curl : {1, 18, 47, 52, 60}) {
        for (const int status : {301, 302, 307, 308}) {
            for (const bool return_on_error : {true, false}) {
                BoxErrorHandler box;
                EXPECT_EQ(Judge(box, curl, status, "", return_on_error),
                          (Outcome{false, VFS_ERR_UNKNOWN, 0x8100}))
                    << curl << " " << status;
            }
        }
        DavErrorHandler dav;
        EXPECT_EQ(Judge(dav, curl, 204), (Outcome{true, VFS_ERR_NONE, 0})) << curl;
    }
    GDriveErrorHandler drive;
    EXPECT_EQ(Judge(drive, 56, 308), (Outcome{false, VFS_ERR_RECEIVE_FAILED, 0x8100}));
    EXPECT_EQ(Judge(drive, 0, 308, "", false), (Outcome{true, VFS_ERR_NONE, 0}));
}

TEST(ErrorHandler, ACleanResultIsASuccessWhateverTheStatusWhenCurlFailsStatuses) {
    BoxErrorHandler errors;
    EXPECT_EQ(Judge(errors, 0, 500, "", true), (Outcome{true, VFS_ERR_NONE, 0}));
    EXPECT_EQ(Judge(errors, 0, 500, "", false), (Outcome{false, VFS_ERR_SERVER_ERROR, 0x8100}));
    EXPECT_EQ(Judge(errors, 0, 204, "", false), (Outcome{true, VFS_ERR_NONE, 0}));
    EXPECT_EQ(Judge(errors, 0, 0, "", false), (Outcome{false, VFS_ERR_NONE, 0}));
}

TEST(ErrorHandler, TheRecordHoldsWhatWasGivenAndTheCode) {
    BoxErrorHandler errors;
    EXPECT_EQ(errors.GetErrorCode() + errors.GetCurlErrorCode() + errors.GetRespErrorCode(), 0);
    Judge(errors, 22, 409, "some text");
    EXPECT_EQ(errors.GetError(),
              Parsed(R"({"curl_code":22,"response_code":409,"msg":"some text","code":47})"));
    EXPECT_EQ(errors.GetCurlErrorCode(), 22);
    EXPECT_EQ(errors.GetRespErrorCode(), 409);
    EXPECT_EQ(errors.GetErrorCode(), VFS_ERR_CONFLICT);
}

TEST(ErrorHandler, ARecordWithoutMembersOrWithWrongTypesCountsAsAPlain200) {
    for (const char* text :
         {"{}", "[]", "null", "7", R"({"curl_code":"7","response_code":[],"msg":null})",
          R"({"curl_code":1e300,"response_code":99999999999999999999})"}) {
        BoxErrorHandler errors;
        EXPECT_TRUE(errors.ParseError(Parsed(std::string("[") + text + "]")[0], true)) << text;
        EXPECT_EQ(errors.GetError(),
                  Parsed(R"({"curl_code":0,"response_code":200,"msg":"","code":0})"));
    }
}

TEST(ErrorHandler, TheBaseTakesEveryStatusForASuccess) {
    ErrorHandler errors;
    EXPECT_EQ(Judge(errors, 22, 500), (Outcome{true, VFS_ERR_NONE, kUntouched}));
}

template <typename Errors>
std::vector<int> RetriedCurlCodes() {
    std::vector<int> codes;
    for (int curl = 0; curl <= 100; ++curl) {
        Errors errors;
        Judge(errors, curl, 0);
        if (errors.IsNeedRetry()) {
            codes.push_back(curl);
            EXPECT_EQ(errors.GetRetrySleepTime(), 3U) << curl;
        }
    }
    return codes;
}

TEST(ErrorHandler, TheSameCurlCodesAreWorthARetryForAll) {
    const auto expected = ElementsAre(5, 6, 7, 13, 28, 35, 52, 56);
    EXPECT_THAT(RetriedCurlCodes<ErrorHandler>(), expected);
    EXPECT_THAT(RetriedCurlCodes<DavErrorHandler>(), expected);
    EXPECT_THAT(RetriedCurlCodes<FTPErrorHandler>(), expected);
    EXPECT_THAT(RetriedCurlCodes<GDriveErrorHandler>(), expected);
    EXPECT_THAT(RetriedCurlCodes<OneDriveErrorHandler>(), expected);
    EXPECT_THAT(RetriedCurlCodes<BoxErrorHandler>(), expected);
    EXPECT_THAT(RetriedCurlCodes<DropboxErrorHandler>(), expected);
}

template <typename Errors>
std::string RetriedStatuses() {
    std::string text;
    for (int status = 100; status < 600; ++status) {
        Errors errors;
        Judge(errors, 22, status);
        if (errors.IsNeedRetry()) {
            text += std::to_string(status) + ":" + std::to_string(errors.GetRetrySleepTime()) + " ";
        }
    }
    return text;
}

/** 500 and up as "S:5". */
std::string ServerErrors(int except = 0) {
    std::string text;
    for (int status = 500; status < 600; ++status) {
        if (status != except) {
            text += std::to_string(status) + ":5 ";
        }
    }
    return text;
}

TEST(ErrorHandler, RateLimitsAndServerErrorsAreRetriedAfterFiveSeconds) {
    EXPECT_EQ(RetriedStatuses<GDriveErrorHandler>(), "403:5 " + ServerErrors());
    EXPECT_EQ(RetriedStatuses<OneDriveErrorHandler>(), "420:5 " + ServerErrors(507));
    EXPECT_EQ(RetriedStatuses<BoxErrorHandler>(), "429:5 " + ServerErrors());
    EXPECT_EQ(RetriedStatuses<DropboxErrorHandler>(), "429:5 " + ServerErrors(507));
    EXPECT_EQ(RetriedStatuses<DavErrorHandler>(), "");
    EXPECT_EQ(RetriedStatuses<FTPErrorHandler>(), "");
}

TEST(ErrorHandler, ABox429RetriesAfterFiveSecondsAndAPlainTimeoutAfterThree) {
    BoxErrorHandler errors;
    Judge(errors, 0, 429, "", false);
    EXPECT_TRUE(errors.IsNeedRetry());
    EXPECT_EQ(errors.GetRetrySleepTime(), 5U);
    Judge(errors, 28, 0);
    EXPECT_TRUE(errors.IsNeedRetry());
    EXPECT_EQ(errors.GetRetrySleepTime(), 3U);
}

TEST(ErrorHandler, TheErrorOfARefusedTokenRequestIsItsTextMember) {
    struct Row {
        const char* body;
        const char* error;
        const char* left;  ///< "msg" afterwards
    };
    const Row rows[] = {
        {R"({"error":"invalid_grant"})", "invalid_grant", R"({"error":"invalid_grant"})"},
        {R"({"error":{"code":"x"}})", "", R"({"error":{"code":"x"}})"},
        {R"(["error"])", "", R"(["error"])"},
        {R"("error")", "", R"("error")"},
        {"{}", "", "{}"},
        {"<html>", "", "null"},
        {"", "", "null"},
    };
    for (const Row& row : rows) {
        BoxErrorHandler errors;
        errors.ParseError(Record(0, 200, row.body), true);
        EXPECT_EQ(errors.GetErrorCodeFromBadReq(), row.error) << row.body;
        EXPECT_EQ(json::toString(errors.GetError()["msg"]), row.left);
        EXPECT_EQ(errors.GetErrorCodeFromBadReq(), row.error) << "asked again";
    }
    EXPECT_TRUE(seams::Logged("Failed to parse <html>"));
}

TEST(ErrorHandler, WithoutARecordThereIsNoTokenError) {
    ErrorHandler errors;
    EXPECT_EQ(errors.GetErrorCodeFromBadReq(), "");
    EXPECT_TRUE(errors.GetError().isNull());
}

TEST(ErrorHandler, OneDriveSleepsAsLongAsItIsToldAndThirtySecondsMore) {
    struct Row {
        const char* body;
        unsigned sleep;
    };
    const Row rows[] = {
        {R"({"error":{"code":"request_throttled","message":"Busy. Wait 10 seconds."}})", 40},
        {R"({"error":{"code":"request_throttled","message":"Wait 7"}})", 37},
        {R"({"error":{"code":"request_throttled","message":"Wait 0 seconds"}})", 0},
        {R"({"error":{"code":"request_throttled","message":"Wait 010 seconds"}})", 38},
        {R"({"error":{"code":"request_throttled","message":"Wait 0x10 seconds"}})", 46},
        {R"({"error":{"code":"request_throttled","message":"Wait 3600 s"}})", 3630},
        {R"({"error":{"code":"request_throttled","message":"Wait 3601 s"}})", 3630},
        {R"({"error":{"code":"request_throttled","message":"Wait 99999999 s"}})", 3630},
        {R"({"error":{"code":"request_throttled","message":"Wait long"}})", 0},
        {R"({"error":{"code":"request_throttled","message":"Wait "}})", 0},
        {R"({"error":{"code":"request_throttled","message":"Wait 4294967295 s"}})", 5},
        {R"({"error":{"code":"request_throttled","message":"Wait 99999999999999999999 s"}})", 5},
        {R"({"error":{"code":"request_throttled","message":"Wait -1 s"}})", 5},
        {R"({"error":{"code":"request_throttled","message":"Waiting"}})", 5},
        {R"({"error":{"code":"request_throttled","message":""}})", 5},
        {R"({"error":{"code":"request_throttled","message":10}})", 5},
        {R"({"error":{"code":"other","message":"Wait 10 s"}})", 5},
        {R"({"error":{"code":["request_throttled"],"message":"Wait 10 s"}})", 5},
        {R"({"error":"request_throttled"})", 5},
        {R"({"error":[1]})", 5},
        {"[]", 5},
        {"Wait 10 s", 5},
        {"", 5},
    };
    for (const Row& row : rows) {
        OneDriveErrorHandler errors;
        EXPECT_EQ(Judge(errors, 0, 420, row.body, false).code, VFS_ERR_RATE_LIMITED);
        EXPECT_EQ(errors.GetRetrySleepTime(), row.sleep) << row.body;
    }
    EXPECT_TRUE(seams::Logged("Failed to parse to json, Wait 10 s"));
    EXPECT_TRUE(seams::Logged("Wait 10 s"));
}

TEST(ErrorHandler, FtpReply421WithCurl7IsNotRetried) {
    FTPErrorHandler errors;
    EXPECT_EQ(Judge(errors, 7, 421), (Outcome{false, VFS_ERR_CONNECT_FAILED, 0x1100}));
    EXPECT_FALSE(errors.IsNeedRetry());
    Judge(errors, 7, 425);
    EXPECT_TRUE(errors.IsNeedRetry());
}

}  // namespace
}  // namespace ZYROCloud
