/**
 * What an upload or a background copy tells of itself while it runs, for other requests of the same
 * user: one small record in memory (/run), mapped by the process that does the work. The record is
 * locked for as long as that process lives, so that one that was killed counts as living nowhere.
 * Only root reaches the records; each user has a folder.
 */
#ifndef ZYROVFS_WEB_JOB_H
#define ZYROVFS_WEB_JOB_H

#include <json/value.h>
#include <zyrovfs/cloud.h>

#include <cstdint>
#include <memory>
#include <string>
#include <vector>

#include "descriptor.h"
#include "failure.h"
#include "identity.h"

namespace web {

enum class JobState : uint32_t { kWaiting, kRunning, kDone, kFailed, kCancelled };

/** Begins with what the library's relay fills in. Numbers are written by one process and read by
 * others while they change. */
struct JobRecord : ZYROCloud::_tag_cgi_upload_progress_ {
    unsigned long long moved;  ///< bytes that have reached the target
    unsigned long long bytes;  ///< to be moved, as far as is known
    unsigned long long files;  ///< that are whole at the target
    unsigned long long items;  ///< files to be moved, as far as is known
    int64_t started;           ///< epoch seconds
    int64_t ended;             ///< the same; 0 while it runs
    JobState state;
    uint32_t counting;      ///< 1 while `bytes` and `items` grow
    uint32_t cancel_asked;  ///< 1: by anybody
    int32_t status;         ///< HTTP's, of a failure
    int32_t code;           ///< the library's
    char meaning[512];
    char title[512];
};

/** What a job works at. */
enum class JobKind { kUpload, kCopy };

class Job {
  public:
    /**
     * A new record. Null where the box cannot keep one: the work goes on without. Failure with
     * status 409 for an id that is in use, 429 when the user has too many that live.
     */
    static std::unique_ptr<Job> Start(const User& user, JobKind kind, const std::string& id,
                                      const std::string& title);
    Job(Descriptor fd, JobRecord* record) : fd_(std::move(fd)), record_(record) {}
    Job(const Job&) = delete;
    Job& operator=(const Job&) = delete;
    ~Job();

    JobRecord& Record() { return *record_; }
    bool IsCancelAsked() const;
    void Succeed();
    void Fail(const Failure& failure);

  private:
    void End(JobState state);

    Descriptor fd_;  ///< holds the lock
    JobRecord* record_;
};

/** Failure with status 422 for a text that is no id: 16 to 64 letters, digits and dashes. */
const std::string& CheckJobId(const std::string& id);
/** An id that nobody can guess. */
std::string NewJobId();

/** A copy of a job's record, its state as it is in truth; Failure with status 404. */
JobRecord ReadJob(const User& user, JobKind kind, const std::string& id);
/** Ids of a user's jobs. */
std::vector<std::string> JobIds(const User& user, JobKind kind);
/** Asks a job to stop; Failure with status 404. */
void CancelJob(const User& user, JobKind kind, const std::string& id);
/** Forgets a job that has ended; Failure with status 404, or 409 for one that lives. */
void RemoveJob(const User& user, JobKind kind, const std::string& id);

/** "waiting", "running", "done", "failed" or "cancelled". */
const char* NameOf(JobState state);
/** The failure of a job as an answer shows it; null without one. */
Json::Value DescribeFailure(const JobRecord& record);

}  // namespace web

#endif
