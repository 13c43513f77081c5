#include <zyrovfs/error.h>

#include <algorithm>
#include <charconv>
#include <csignal>

#include "action.h"
#include "connection.h"
#include "failure.h"
#include "form.h"
#include "job.h"
#include "name.h"
#include "response.h"
#include "stop.h"
#include "transfer_note.h"

namespace web {

using namespace ZYROVFS;
using ZYROCloud::Cloud;

namespace {

long long ReadSize(const std::string& text) {
    long long size = -1;
    const char* end = text.data() + text.size();
    const auto [stop, error] = std::from_chars(text.data(), end, size);
    if (error != std::errc() || stop != end || size < -1) {
        throw Failure(400, "The request tells no size that can be.");
    }
    return size;
}

void RefuseFolder(const Connection& connection, const std::string& path) {
    try {
        if (!connection.BeforeUpload()->Look(path).folder) {
            return;
        }
    } catch (const Failure& failure) {
        if (failure.Code() == VFS_ERR_NOT_FOUND) {
            return;
        }
        throw;
    }
    throw Failure(409, "\"" + SplitPath(path).name + "\" is a folder.", VFS_ERR_IS_DIRECTORY);
}

/** One upload, from its request to its end. */
class Relay {
  public:
    Relay(const User& user, const Request& request)
        : connection_(user, request.Parameter("connection")),
          path_(request.Parameter("path")),
          size_(ReadSize(request.Parameter("size", "-1"))) {
        SplitPath(path_);
        if (request.length < 0) {
            throw Failure(411, "The request has no length.");
        }
        const std::string id = request.Parameter("id", "");
        job_ = id.empty() ? nullptr : Job::Start(user, JobKind::kUpload, id, path_);
        record_.total = static_cast<unsigned long long>(request.length);
        record_.bytes = size_ < 0 ? record_.total : static_cast<unsigned long long>(size_);
        if (job_ != nullptr) {
            Shared().total = record_.total;
            Shared().bytes = record_.bytes;
            Shared().state = JobState::kRunning;
        }
    }

    void Run(const std::string& content_type) {
        try {
            RefuseFolder(connection_, path_);
            Send(content_type);
        } catch (const Failure& failure) {
            if (job_ != nullptr) {
                job_->Fail(failure);
            }
            throw;
        }
        if (job_ != nullptr) {
            job_->Succeed();
        }
    }

  private:
    /** What other requests see, or the same where nobody can. */
    JobRecord& Shared() { return job_ == nullptr ? record_ : job_->Record(); }

    void Send(const std::string& content_type) {
        const std::unique_ptr<Cloud> cloud = connection_.Driver();
        if (!cloud->CanFileUpload(static_cast<unsigned long long>(size_))) {
            throw FailureOf("The file was not uploaded", cloud->GetErrorCode());
        }
        connection_.CheckUpload(*cloud, path_, size_);
        const StopWatch watch(job_.get());
        const Form form = ReadForm(content_type);
        Shared().current = form.read;
        const std::string uri = connection_.Uri(path_);
        if (!Cloud::RelayUploadInit(cloud.get(), uri.c_str(), &Shared(), form.boundary.c_str(),
                                    nullptr, StopWatch::IsAsked, nullptr, &Shared().moved, size_) ||
            !Cloud::RelayUploadFile()) {
            throw FailureOf(Sentence(cloud->GetErrorCode()), cloud->GetErrorCode());
        }
    }

    std::string Sentence(__tag_vfs_err_ code) {
        constexpr int kSilent = -7;
        return Shared().error == kSilent   ? "Nothing came from the browser for too long"
               : code == VFS_ERR_CANCELLED ? "The upload was stopped"
                                           : "The file was not uploaded";
    }

    Connection connection_;
    std::string path_;
    long long size_;
    std::unique_ptr<Job> job_;
    JobRecord record_{};
};

}  // namespace

void Upload(const User& user, const Request& request) {
    Relay relay(user, request);
    const TransferNote note(user, {request.Parameter("connection")});
    relay.Run(request.content_type);
    AnswerDone();
}

void ShowProgress(const User& user, const Request& request) {
    const JobRecord job = ReadJob(user, JobKind::kUpload, request.Parameter("id"));
    Json::Value answer;
    answer["received"] = static_cast<Json::UInt64>(std::min(job.current, job.bytes));
    answer["sent"] = static_cast<Json::UInt64>(std::min(job.moved, job.bytes));
    answer["total"] = static_cast<Json::UInt64>(job.bytes);
    answer["state"] = NameOf(job.state);
    if (job.state == JobState::kFailed) {
        answer["error"] = DescribeFailure(job);
    }
    AnswerJson(200, answer);
}

}  // namespace web
