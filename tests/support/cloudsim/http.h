/** A request as services see it, and what they answer. */
#ifndef ZYROVFS_TESTS_CLOUDSIM_HTTP_H
#define ZYROVFS_TESTS_CLOUDSIM_HTTP_H

#include <json/value.h>

#include <cstdint>
#include <functional>
#include <memory>
#include <optional>
#include <string>
#include <vector>

#include "support/cloudsim/content.h"
#include "support/cloudsim/fault.h"

namespace cloudsim {

struct Request {
    std::string method;
    std::string target;  ///< path and query as sent
    std::string path;    ///< as sent, without query
    std::string version;
    std::string host;  ///< of the Host header, without port
    Headers headers;
    Headers query;        ///< decoded
    std::string account;  ///< set by the service: owner of the token

    std::string Header(const std::string& name) const;
    std::string Query(const std::string& name, const std::string& missing = "") const;
    bool HasQuery(const std::string& name) const;
    /** The part behind "Bearer "; empty when there is none. */
    std::string BearerToken() const;
    /** Non-empty parts of the path, decoded. */
    std::vector<std::string> Segments() const;
};

struct Reply {
    int status = 200;
    Headers headers;
    ContentPtr content;  ///< null: no body
    uint64_t offset = 0, length = 0;

    Reply() = default;
    explicit Reply(int code) : status(code) {}
    Reply(int code, std::string text, const std::string& type);
    Reply& With(const std::string& name, const std::string& value);
    void SetBody(std::string text);
};

Reply JsonReply(int status, const Json::Value& document);
/** All of `content`, or the part that the request's Range header asks for. */
Reply ContentReply(const Request& request, ContentPtr content, const std::string& type);

/** Takes one request's body and answers it, all on one thread. */
class Handler {
  public:
    virtual ~Handler() = default;
    virtual void Data(const char* data, size_t size) = 0;
    virtual Reply Finish() = 0;
};
/** Collects the body, up to `limit` bytes (413 beyond), for `answer`. */
std::unique_ptr<Handler> Collect(std::function<Reply(const std::string& body)> answer,
                                 size_t limit = 1024 * 1024);
/** Lets the body go by. */
std::unique_ptr<Handler> Ready(Reply reply);

bool SameText(const std::string& a, const std::string& b);  ///< ASCII, without regard to case
std::string FindHeader(const Headers& headers, const std::string& name);
std::string PercentDecode(const std::string& text, bool plus_is_blank);
Headers ParseForm(const std::string& text);
std::optional<uint64_t> ParseNumber(const std::string& text);
/** So many random letters and digits. */
std::string RandomText(size_t length);
std::string OneLine(const Json::Value& document);
/** A null value when it isn't one JSON object. */
Json::Value ParseObject(const std::string& text);

}  // namespace cloudsim

#endif
