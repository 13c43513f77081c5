/** What the tests of the HTTP side share: a handler with its error handler, and what it left. */
#ifndef ZYROVFS_TESTS_HTTP_FIXTURE_H
#define ZYROVFS_TESTS_HTTP_FIXTURE_H

#include <gmock/gmock.h>
#include <zosplatform/error.h>

#include <memory>
#include <string>
#include <vector>

#include "core/json.h"
#include "http/api_handler.h"
#include "support/seams.h"
#include "support/tls_server.h"
#include "support/wire_server.h"

namespace ZYROCloud {

using namespace ZYROVFS;  // NOLINT(google-build-using-namespace)
using testing::ElementsAre;
using testing::HasSubstr;
using testing::IsEmpty;
using testing::Not;

inline Json::Value Parsed(const std::string& text) {
    Json::Value value;
    EXPECT_TRUE(json::fromString(value, text)) << text;
    return value;
}

/** A handler in the state behind Init, with an error handler of this class. */
template <typename Errors = BoxErrorHandler>
class Conversation {
  public:
    explicit Conversation(bool return_on_error = true) {
        api.SetErrorHandler(new Errors);
        api.SetReturnOnError(return_on_error);
        EXPECT_TRUE(api.Init()) << seams::LogDump();
        YLIBCErrSetEx(0, "test", 1);
    }

    /** One request for this URL, as it stands. */
    bool Get(const std::string& url, int retries = 0) {
        api.SetURL(url, false);
        return api.Process(retries);
    }

    int Code() const { return api.GetError()["code"].asInt(); }
    int Curl() const { return api.GetError()["curl_code"].asInt(); }
    int Status() const { return api.GetError()["response_code"].asInt(); }

    APIHandler api;
};

/** A server whose only connection answers this to its first request, and closes. */
inline wire::Script Once(const std::string& answer) {
    return {wire::ReadRequest(), wire::Send(answer)};
}

}  // namespace ZYROCloud

#endif
