/** What a test wants to go wrong: faults bound to requests, and the plan that hands them out. */
#ifndef ZYROVFS_TESTS_CLOUDSIM_FAULT_H
#define ZYROVFS_TESTS_CLOUDSIM_FAULT_H

#include <cstdint>
#include <limits>
#include <memory>
#include <mutex>
#include <optional>
#include <string>
#include <utility>
#include <vector>

namespace cloudsim {

/** Names and values in the order in which they stand on the wire. */
using Headers = std::vector<std::pair<std::string, std::string>>;

enum class Break {
    kNone,
    kBeforeBody,  ///< closes as soon as the request's headers are read; nothing took place
    kAfterBody,   ///< reads all of the request, closes without an answer; nothing took place
    kAfterEffect  ///< the request takes effect, its answer is lost
};

enum class RangeFault {
    kNone,
    kIgnore,      ///< 200 and the whole body
    kWrongStart,  ///< 206, honestly announced, from another start
    kShort        ///< 206 as asked, but with fewer bytes than the length announced, then closed
};

/**
 * One fault, for the `times` requests that fit after the first `after` of those that fit. What is
 * declared together happens together, so that a delayed answer that is cut is one fault. Made by
 * steps: `Fault::On("GET", "/2.0/users/me").After(1).Times(2).Answer(503, "busy")`.
 */
struct Fault {
    static constexpr int kForever = std::numeric_limits<int>::max();

    /**
     * `method` may be "*". `path` is compared with the target as sent (path and query, still
     * escaped): its beginning, or, when `path` begins with '*', any place in it.
     */
    static Fault On(const std::string& method, const std::string& path);
    /** As On, but only for requests that reach this host ("api", "upload", "download"). */
    Fault& AtHost(const std::string& role);
    Fault& After(int count);
    Fault& Times(int count);  ///< 1 unless set; kForever is consumed by its first use
    Fault& Forever() { return Times(kForever); }

    /** This answer instead of the service's; nothing takes place. */
    Fault& Answer(int status, const std::string& text = "", const Headers& lines = {});
    /** This body in place of the one that the service gives; status and effect stay. */
    Fault& Body(const std::string& text);
    /** This status in place of the one that the service gives; the effect stays. */
    Fault& Status(int status);
    /** One more header of the service's (or the given) answer. */
    Fault& Header(const std::string& name, const std::string& value);
    /**
     * Lines put in front of the answer's headers as they are: empty names or values, no colon,
     * binary, any length. The connection is closed after the answer.
     */
    Fault& HeaderLine(const std::string& line);
    /** These bytes are the whole answer, status line included; then the connection is closed. */
    Fault& Raw(const std::string& bytes);

    Fault& Delay(double seconds);              ///< before the answer
    Fault& Throttle(uint64_t bytes_a_second);  ///< body of the answer
    Fault& ThrottleUpload(uint64_t bytes_a_second);
    /** Nothing moves for so long when so many bytes of the answer's (the request's) body went. */
    Fault& Pause(uint64_t body_bytes, double seconds);
    Fault& PauseUpload(uint64_t body_bytes, double seconds);
    Fault& CutAnswer(uint64_t body_bytes);  ///< closes behind so many bytes of the answer's body
    Fault& CutUpload(uint64_t body_bytes);  ///< closes when so many bytes of the request's came
    /** Only the first bytes of the request's body reach the service, which takes them for all. */
    Fault& ShortUpload(uint64_t body_bytes);
    Fault& Reset();  ///< what closes or cuts sends a reset
    Fault& Close(Break when);
    Fault& LoseAnswer() { return Close(Break::kAfterEffect); }
    /** Answers in full and closes the kept connection without having announced it. */
    Fault& CloseAfterAnswer();
    Fault& Range(RangeFault kind);
    /** The access token that came with the request is refused from this request on. */
    Fault& ExpireToken();

    std::string method, path, host;
    int after = 0, times = 1;

    int status = 0;
    bool without_effect = false;
    std::optional<std::string> body;
    Headers headers;
    std::vector<std::string> header_lines;
    std::optional<std::string> raw;
    double delay = 0;
    uint64_t answer_rate = 0, upload_rate = 0;
    std::optional<uint64_t> pause_answer, pause_upload;
    double pause = 0;
    std::optional<uint64_t> cut_answer, cut_upload, short_upload;
    bool reset = false;
    Break close = Break::kNone;
    bool close_after_answer = false;
    RangeFault range = RangeFault::kNone;
    bool expire_token = false;

    /** The form of the command line, which ParseFault reads. */
    std::string Text() const;
};

/**
 * "GET /2.0/users/me after=1 times=2 status=503 header=Retry-After:1 body=... delay=0.5". The
 * words: host= after= times= (a number or "forever") answer=STATUS status=STATUS body=TEXT
 * header=NAME:VALUE line=TEXT raw=TEXT delay= rate= upload-rate= pause=BYTES:SECONDS
 * pause-upload=BYTES:SECONDS cut= cut-upload= short-upload= close=(before|after|effect)
 * close-after-answer reset range=(ignore|start|short) expire-token. In TEXT "\r", "\n", "\s"
 * (blank), "\\" and "\xHH" stand for themselves. Throws std::invalid_argument.
 */
Fault ParseFault(const std::string& text);

}  // namespace cloudsim

#endif
