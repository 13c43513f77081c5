/**
 * What the outcome of one libcurl transfer means: a failure code, the platform error, whether to
 * try again and how long to wait before that. One class per family of services; a driver gives its
 * own to its APIHandler. A handler belongs to one APIHandler and is used by one thread at a time.
 */
#ifndef ZYROVFS_HTTP_ERROR_HANDLER_H
#define ZYROVFS_HTTP_ERROR_HANDLER_H

#include <json/value.h>

#include <string>

#include "zyrovfs/error.h"

namespace ZYROCloud {

using ZYROVFS::__tag_vfs_err_;

/**
 * The rules that all services share, and the error record, an object with
 *   "curl_code"      int, libcurl's result
 *   "response_code"  int, HTTP status or FTP reply; 0 when there was none
 *   "msg"            the body of the answer as text; after GetErrorCodeFromBadReq() the JSON that
 *                    it held, after a 403 of Google the reason
 *   "code"           int, a __tag_vfs_err_
 * The record is empty before the first ParseError.
 */
class ErrorHandler {
  public:
    ErrorHandler() = default;
    ErrorHandler(const ErrorHandler&) = delete;
    ErrorHandler& operator=(const ErrorHandler&) = delete;
    virtual ~ErrorHandler() = default;

    /** Whether the transfer of the record may go through when it is repeated. */
    virtual bool IsNeedRetry();
    /** Seconds to wait before that. */
    virtual unsigned int GetRetrySleepTime();
    /**
     * The meaning of a status or reply: sets `*code` and the platform error; true when it is a
     * success. Here every status is one.
     */
    virtual bool ParseError(int response_code, __tag_vfs_err_* code);
    /**
     * The "error" text of a refused token request, "" when the body has none. Leaves the body in
     * the record as parsed JSON, null when it is none.
     */
    virtual std::string GetErrorCodeFromBadReq();

    /**
     * Takes a fresh record over ("curl_code", "response_code", "msg") and completes it with "code".
     * True when the transfer was a success. With `return_on_error` libcurl itself fails a status of
     * 400 or more, so a clean result needs no further look. A curl failure that no rule names is
     * judged by the status alone: cut short behind a status below 400, it counts as a success.
     */
    bool ParseError(const Json::Value& record, bool return_on_error);

    /** Meaning of a libcurl code: 0 success, 1 a failure that the rules name, 2 any other one. */
    int ParseCurlError(int curl_code, __tag_vfs_err_* code);

    /** A copy of the record. */
    Json::Value GetError() const;
    /** Members of the record, 0 when absent. */
    int GetCurlErrorCode() const;
    int GetRespErrorCode() const;
    int GetErrorCode() const;

  protected:
    /** The body as it came, "" once it has been replaced by something that is no text. */
    std::string Message() const;
    void SetMessage(const std::string& text);

  private:
    Json::Value record_;
};

class GDriveErrorHandler : public ErrorHandler {
  public:
    using ErrorHandler::ParseError;
    bool IsNeedRetry() override;
    unsigned int GetRetrySleepTime() override;
    bool ParseError(int response_code, __tag_vfs_err_* code) override;
};

class OneDriveErrorHandler : public ErrorHandler {
  public:
    using ErrorHandler::ParseError;
    bool IsNeedRetry() override;
    /** The service can tell how long it wants to be left alone; 30 seconds are added to that. */
    unsigned int GetRetrySleepTime() override;
    bool ParseError(int response_code, __tag_vfs_err_* code) override;
};

class BoxErrorHandler : public ErrorHandler {
  public:
    using ErrorHandler::ParseError;
    bool IsNeedRetry() override;
    unsigned int GetRetrySleepTime() override;
    bool ParseError(int response_code, __tag_vfs_err_* code) override;
};

class DropboxErrorHandler : public ErrorHandler {
  public:
    using ErrorHandler::ParseError;
    bool IsNeedRetry() override;
    unsigned int GetRetrySleepTime() override;
    bool ParseError(int response_code, __tag_vfs_err_* code) override;
};

/** Retries by the base's rules. */
class DavErrorHandler : public ErrorHandler {
  public:
    using ErrorHandler::ParseError;
    bool ParseError(int response_code, __tag_vfs_err_* code) override;
};

/** FTP, FTPS and SFTP. A reply of 421, a server that is closing, is never worth a retry. */
class FTPErrorHandler : public ErrorHandler {
  public:
    using ErrorHandler::ParseError;
    bool IsNeedRetry() override;
    bool ParseError(int response_code, __tag_vfs_err_* code) override;
};

}  // namespace ZYROCloud

#endif
