/**
 * One conversation with a service over one libcurl handle: HTTP, WebDAV, FTP or SFTP.
 *
 * A driver owns one APIHandler and uses it for request after request. The handle is borrowed from
 * the pool of the process, so that connections stay open behind the driver, too, for one of the
 * same user that trusts the same servers (http/handle_pool.h). For each request: Init(), then the
 * description (URL, headers, parameters, method) and the direct options, then Process(), then
 * GetResponse() or GetError(). What a failure means and whether it is worth a retry is the
 * ErrorHandler's to say.
 *
 * Operations answer bool, true for success, unless stated otherwise. Values of the wrong type in a
 * description make Process fail; it never throws. One thread at a time.
 */
#ifndef ZYROVFS_HTTP_API_HANDLER_H
#define ZYROVFS_HTTP_API_HANDLER_H

#include <curl/curl.h>
#include <json/value.h>

#include <chrono>
#include <limits>
#include <string>
#include <vector>

#include "core/handle.h"
#include "core/source_line.h"
#include "http/error_handler.h"
#include "http/handle_pool.h"
#include "zyrovfs/cloud.h"

namespace ZYROVFS {
struct ServerTrust;
}

namespace ZYROCloud {

/** Bytes of an answer that is kept in memory. The longest that services give are pages of listings,
 * a thousand items with some thousand bytes each. Contents of files do not go this way. */
inline constexpr size_t kLongestAnswer = size_t{64} << 20;

/** What libcurl calls to go back in the bytes to send: CURL_SEEKFUNC_... */
using SeekCallback = int (*)(void* context, curl_off_t offset, int origin);

class APIHandler {
  public:
    /** `share`, not owned, gives handles a common store of names and TLS sessions; may be null. */
    explicit APIHandler(CURLSH* share = nullptr);
    APIHandler(const APIHandler&) = delete;
    APIHandler& operator=(const APIHandler&) = delete;
    ~APIHandler();

    /**
     * Forgets the last request and sets what all requests share. What SetReturnOnError said before
     * is in force from here on. On failure the error handler knows of it.
     */
    bool Init();
    /** Forgets the last request, its answer and all options. Open connections stay. */
    void Reset();
    /** The handle, null when there is none; this object's until it is destroyed, except in a forked
     * child, where it becomes another one. */
    CURL* GetCurlHandler();
    /**
     * Between two requests: the next ones go to this server of the user's own (as for SetVFSURL),
     * with this account. If a handle is kept that has connections for just that, it takes the place
     * of the present one. Nothing needs this, but without it connections end with the handler.
     */
    void ExpectVFSURL(const std::string& url, const std::string& user, const std::string& password);

    // --- description of the request ------------------------------------------------------------

    /** With `need_escape` each part of the path is escaped at Process. */
    bool SetURL(const std::string& url, bool need_escape);
    /**
     * For URLs of users' own servers: dav and davs become http and https, with the certificate that
     * the user trusts; sftp gets the user's known hosts; ftp, ftps and sftp go without a proxy.
     * The answer is always false and means nothing.
     */
    bool SetVFSURL(const std::string& url);

    /** All of a kind at once, in place of what was there. False when it is not an object. */
    bool AddHeader(const Json::Value& headers);
    bool AddGetParam(const Json::Value& params);
    /** The body as JSON text. It may also be null: services want the text "null" from calls without
     * arguments. */
    bool AddPostRawParam(const Json::Value& params);
    /** The body as a form; wins over AddPostRawParam. */
    bool AddPostParam(const Json::Value& params);

    /** One more. False for an empty name or value; to drop a header of libcurl's own (Expect), give
     * its empty value in the object form. */
    bool AddHeader(const std::string& name, const std::string& value);
    bool AddGetParam(const std::string& name, const std::string& value);
    bool AddGetParam(const std::string& name, const char* value);
    bool AddGetParam(const std::string& name, bool value);
    /** A number would turn into a bool. */
    template <typename T>
    bool AddGetParam(const std::string& name, T value) = delete;
    bool AddPostParam(const std::string& name, const std::string& value);

    /** A method other than the one that follows from the body. False for "". */
    bool SetReqMethod(const std::string& method);
    /** A multipart body. Not owned, must outlive Process; null for none. */
    bool SetFormUploadData(FormUploadData* form);
    bool IsForm() const { return form_data_ != nullptr; }
    /** Behind Init: no other protocol than HTTP, whatever the URL says; one that came from a
     * service or from the mounted tree may name a file of this machine. */
    bool AllowOnlyHttp();
    /** Before Init: whether libcurl fails a status of 400 or more, without its body. Default true,
     * and stays set for later requests. */
    bool SetReturnOnError(bool return_on_error);
    /**
     * Behind the write function, for a download: the body of a status of 400 or more goes to the
     * error handler and not to that function, and fails the transfer. Without this call libcurl
     * throws such a body away, and with it the cause. For this request only.
     */
    bool KeepRefusal();
    /** For all requests: Process sleeps no longer at once than this, whatever the error handler
     * asks for. */
    void SetLongestSleep(unsigned int seconds) { longest_sleep_ = seconds; }
    /** Required before Process. Owned from here on; an earlier one is deleted. */
    bool SetErrorHandler(ErrorHandler* handler);

    // --- direct options: after Init. Failures are logged and known to the error handler ---------

    /** Null leaves the function or the data as it is, here and in the next three. */
    bool SetWriteFunAndData(CurlCallback function, void* data);
    bool SetReadFunAndData(CurlCallback function, void* data);
    bool SetHeaderFunAndData(CurlCallback function, void* data);
    /**
     * How to go back in what the read function gives: libcurl needs it when a kept connection dies
     * in the middle of a body, or the body is asked for again. For sources that can seek; offset 0
     * is the first byte of this body, also of the file part of a form.
     */
    bool SetSeekFunAndData(SeekCallback function, void* data);
    /** The body cannot be given again. */
    void ForgetSeek();

    /**
     * Behind Init: asked while nothing moves, about once a second, so that a person does not wait
     * for a server that is silent. True ends the request as a read function does that gives up.
     */
    bool SetStopCheck(bool (*is_stop_asked)());

    /** The body comes from the read function. `mute` throws the answer's body away. */
    bool SetUploadOpt(bool mute);
    bool SetUploadSize(long long size);
    /** Both empty: nobody, which at an FTP server is a guest. */
    bool SetUserPwOpt(const std::string& user, const std::string& password);
    /** FTP commands to send before the transfer; `*commands` stays the caller's and must outlive
     * Process. The text is not read. */
    bool SetCodePage(const std::string& code_page, curl_slist** commands);
    bool SetFTPEPSV(bool on);
    /** One CWD for the whole path, or one for each folder of it. */
    bool SetFTPCWD(bool single);
    /** "from-to" as in a Range header without its unit; "" does nothing. */
    bool SetRange(const std::string& range);
    bool SetNoBody(bool on);
    /** In force from the next Init on. False when there is no handle or no share. */
    bool SetShareCurlHandler(void* share);
    /** How to trust the server of a davs URL; the answer is true only for a failure. */
    bool SetSSLOpt(const std::string& url);

    // --- the transfer and its results -----------------------------------------------------------

    /**
     * Performs the request, up to `retries` + 1 times (a negative number counts as 0), with the
     * sleeps that the error handler asks for, also behind the last attempt. False leaves the cause
     * in GetError(); a request that could not be set up leaves the earlier record.
     */
    bool Process(int retries);

    /** The body of the last attempt's answer. */
    std::string GetResponse() const { return response_; }
    /** Name to text for each header line of the last attempt, redirects included. */
    Json::Value GetHeaderResponse() const { return response_header_; }
    /** The error handler's record, null without one. */
    Json::Value GetError() const;
    bool IsNeedRetry();
    unsigned int GetRetrySleepTime();
    void ResetRespString();
    void ResetRespHeader();
    /** Gives a libcurl result, with the status and body at hand, to the error handler. True when it
     * counts as a success; false without a handler. */
    bool ParseCurlError(CURLcode code);

    // --- callbacks for libcurl -------------------------------------------------------------------

    /** Stops the transfer when `out` would grow beyond kLongestAnswer. */
    static size_t WriteToStrBuf(char* data, size_t size, size_t count, std::string* out) noexcept;
    static size_t MutedWriteCallback(void* data, size_t size, size_t count, void*) noexcept;
    /** Stores one header line. std::out_of_range for a name and a colon with nothing behind. */
    static size_t WriteHeaderToJsonValue(char* line, size_t size, size_t count, Json::Value* out);
    static int WriteToDebugStr(CURL* curl, curl_infotype type, char* text, size_t size,
                               std::string* out);

    /** Query or form text: "name=escaped&name=escaped". Names are not escaped. Json::Exception for
     * a value that has no text. */
    std::string BuildParamString(const Json::Value& params);
    /** Text up to the first NUL, escaped for a URL; "" on failure. */
    std::string EscapeURLString(const std::string& text);
    /** Appends a line per header of the description; the caller frees the list in any case.
     * Json::Exception for a value that has no text. */
    bool BuildHeaderParam(curl_slist** list);

  private:
    bool LacksHandle() const {
        return curl_ == nullptr || HandlePool::Instance().IsInherited(loan_);
    }
    HandleKey ServiceKey() const;
    void TakeHandle(HandleKey key);
    bool ChooseConnections();
    bool SetBasicOpt();
    /** Whether libcurl took an option; a refusal is logged in the name of `at`. */
    static bool Taken(CURLcode code, const char* what,
                      ZYROVFS::SourceLine at = ZYROVFS::SourceLine::Here());
    /** Taken, and the error handler knows of a refusal. */
    bool Accept(CURLcode code, const char* what,
                ZYROVFS::SourceLine at = ZYROVFS::SourceLine::Here());
    bool SetMember(const char* key, const Json::Value& object);
    bool AddMember(const char* key, const std::string& name, const Json::Value& value);
    char* KeepText(const std::string& text);
    void UsePinnedCertificate(const ZYROVFS::ServerTrust& trust);
    std::string ShownUrl() const;
    bool SetHeaders(curl_slist** list);
    bool SetTarget();
    bool SetBody();
    bool SetMethod();
    bool SetForm(curl_mime** form);
    bool SetUp(curl_slist** headers, curl_mime** form);
    bool Perform(int attempts);
    CURLcode Transfer();
    CURLcode Refused(CURLcode code);
    bool IsRefusal();
    bool CanSendAgain();
    bool CanStartOver();
    void AdaptTo(CURLcode code, int failed);

    CURL* curl_;  ///< null until it is needed for the first time
    std::string response_;
    std::string spare_text_;  // no longer used; keeps the layout
    Json::Value request_;
    Json::Value response_header_;
    Json::Value spare_value_;  // no longer used; keeps the layout
    CURLSH* share_;
    ErrorHandler* error_handler_ = nullptr;
    bool return_on_error_ = true;
    unsigned int longest_sleep_ = std::numeric_limits<unsigned int>::max();
    FormUploadData* form_data_ = nullptr;
    char* cert_data_ = nullptr;  ///< one of the loan's texts
    /** Where libcurl reads the file of a form. */
    struct FormFile {
        const XferData* source = nullptr;
        SeekCallback seek = nullptr;
        void* seek_data = nullptr;
    };
    static size_t WriteOrKeepRefusal(char* data, size_t size, size_t count, void* handler) noexcept;
    static size_t ReadFormFile(char* data, size_t size, size_t count, void* file);
    static int SeekFormFile(void* file, curl_off_t offset, int origin);
    CURLcode AddFormFile(curl_mime* form);

    /** Where a download goes, for the part of its answers that is none of the file. */
    struct Sink {
        CurlCallback function = nullptr;
        void* data = nullptr;
    };

    FormFile form_file_;
    Sink sink_;
    bool keeps_refusal_ = false;
    /** Progress of a request, for libcurl. */
    struct Movement {
        bool (*is_stop_asked)() = nullptr;
        curl_off_t bytes = 0;
        std::chrono::steady_clock::time_point since;
    };
    static int WatchMovement(void* movement, curl_off_t, curl_off_t received, curl_off_t,
                             curl_off_t sent);

    Movement movement_;
    SeekCallback seek_function_ = nullptr;
    void* seek_data_ = nullptr;
    bool body_is_read_ = false;  ///< from a function, which may not be able to give it again
    HandleLoan loan_;            ///< of curl_
    HandleKey wanted_;           ///< of the request that is being described
};

}  // namespace ZYROCloud

#endif
