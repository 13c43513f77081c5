/**
 * The frame of a request to a service: token, handler, headers, address, transfer, answer. A driver
 * has one FrameRules for its service; an operation says only what differs.
 *
 *     return Request(*this, kFrame).Put(BoxApiHost() + "/2.0/" + id).Body(body).Send();
 */
#ifndef ZYROVFS_CLOUD_REQUEST_H
#define ZYROVFS_CLOUD_REQUEST_H

#include <json/value.h>

#include <functional>
#include <string>

#include "cloud/public_cloud.h"
#include "core/source_line.h"

namespace ZYROCloud {

/** How a service wants its requests. */
struct FrameRules {
    bool renews_token;         ///< an expired token is renewed first, a refused one then
    const char* content_type;  ///< header of every request; null: only of those with a body
    bool pretty_off;           ///< the query says "pretty" = false
    bool repeats_bad_answer;   ///< an answer that is no JSON is asked for again, a second later
};

class Request {
  public:
    /** `cloud` and `rules` must outlive the request. Log lines carry the place of construction. */
    Request(PublicCloud& cloud, const FrameRules& rules,
            ZYROVFS::SourceLine at = ZYROVFS::SourceLine::Here());

    // --- description ---------------------------------------------------------------------------

    Request& Get(const std::string& url) { return To("", url); }
    Request& Post(const std::string& url) { return To("", url); }
    Request& Put(const std::string& url) { return To("PUT", url); }
    Request& Delete(const std::string& url) { return To("DELETE", url); }
    /** Any method; "" is the one that follows from the body. */
    Request& To(const std::string& method, const std::string& url);
    /** The URL goes out as it is; otherwise each part of its path is escaped. */
    Request& Unescaped();
    /** One header; an empty value takes the header away that libcurl would send. */
    Request& Header(const std::string& name, const Json::Value& value);
    /** Query fields; a value that is no object fails the request. */
    Request& Query(const Json::Value& fields);
    /** A JSON body, with its type and length as headers. */
    Request& Body(const Json::Value& body);
    /** A JSON body and no headers about it. */
    Request& RawBody(const Json::Value& body);
    Request& Retries(int count);
    /** A status of 400 or more comes without its body, from now on: the driver's handler keeps this
     * for later requests. */
    Request& FailOnError();
    /** The request that fails with `code` is not lost: `way_out` gives its result, and no line is
     * logged. The driver's record is that failure when it is called; behind a success it is gone,
     * but for VFS_ERR_NOT_FOUND. */
    Request& Unless(__tag_vfs_err_ code, std::function<bool()> way_out);
    /** The log line for an answer that is no JSON, in place of the usual one. */
    Request& BadAnswer(const char* text);

    // --- doing it ------------------------------------------------------------------------------

    /**
     * All steps before the transfer. False leaves VFS_ERR_UNAUTHORIZED for a token that could not
     * be renewed, VFS_ERR_CLOUD_FAILED for the rest. `xfer`, if given, supplies or takes the bytes.
     */
    bool Prepare(XferData* xfer = nullptr);
    /** The whole frame without a look at the answer's body. A failure is logged. */
    bool Send();
    /** The whole frame; `answer` is the body. VFS_ERR_CLOUD_FAILED when that is no JSON. */
    bool Send(Json::Value& answer);

  private:
    bool Start(APIHandler& api, XferData* xfer);
    bool Describe(APIHandler& api);
    bool Process();
    bool Refused();
    template <typename Steps>
    bool Conclude(Steps steps);
    bool TakeAnswer(Json::Value& answer);
    bool AskForAnswer(Json::Value& answer);

    PublicCloud& cloud_;
    const FrameRules& rules_;
    const ZYROVFS::SourceLine at_;
    std::string method_, url_;
    bool escape_ = true;
    bool fail_on_error_ = false;
    int retries_ = 6;
    Json::Value headers_, query_, body_;
    bool has_body_ = false;
    __tag_vfs_err_ spared_ = ZYROVFS::VFS_ERR_NONE;
    bool stays_ = false;  ///< the failure that was got round, in the driver's record
    std::function<bool()> way_out_;
    const char* bad_answer_ = nullptr;
};

}  // namespace ZYROCloud

#endif
