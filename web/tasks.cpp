// Copies in the background: begun, shown, stopped and forgotten.
#include <unistd.h>
#include <zyrovfs/cloud.h>
#include <zyrovfs/task.h>
#include <zyrovfs/task_queue.h>
#include <zyrovfs/task_turn.h>

#include <algorithm>
#include <cstring>
#include <ctime>
#include <string>

#include "action.h"
#include "body.h"
#include "copy.h"
#include "failure.h"
#include "job.h"
#include "name.h"
#include "response.h"
#include "stop.h"
#include "transfer_note.h"
#include "worker.h"

namespace web {

using ZYROCloud::Cloud;

namespace {

/** Where the box's copies take their turn. */
constexpr const char* kQueue = "copy";
constexpr unsigned kAtOnce = 3;
constexpr unsigned kMostPaths = 1000;

std::vector<std::string> PathsOf(const Body& from) {
    const Json::Value& given = from["paths"];
    if (!given.isArray() || given.empty() || given.size() > kMostPaths) {
        throw Failure(400, "The request lacks \"paths\".");
    }
    std::vector<std::string> paths;
    for (const Json::Value& path : given) {
        if (!path.isString()) {
            throw Failure(400, "The request lacks \"paths\".");
        }
        paths.push_back(CheckPath(path.asString()));
    }
    return paths;
}

CopyPlan ReadPlan(const User& user, const Body& body) {
    const Body from = body.Object("from");
    const Body to = body.Object("to");
    CopyPlan plan{Connection(user, from.Text("connection")), PathsOf(from),
                  Connection(user, to.Text("connection")), CheckPath(to.Text("path"))};
    const bool same = plan.from.Id() == plan.to.Id();
    for (const std::string& path : plan.paths) {
        if (same && (IsWithin(plan.folder, path) || SplitPath(path).folder == plan.folder)) {
            throw Failure(422, "What is copied cannot come to lie in or on itself.")
                .Advise("Choose another folder.");
        }
    }
    // Both have to be there now; what becomes of them later the copy will see.
    plan.from.Driver();
    plan.to.Driver();
    return plan;
}

std::string TitleOf(const CopyPlan& plan) {
    const std::string first =
        plan.paths[0] == "/" ? plan.from.Title() : SplitPath(plan.paths[0]).name;
    const std::string more =
        plan.paths.size() == 1 ? "" : " and " + std::to_string(plan.paths.size() - 1) + " more";
    return first + more + " to " + plan.to.Title();
}

void WaitForTurn(const std::string& id) {
    constexpr useconds_t kPause = 200000;
    const auto pause = [] {
        usleep(kPause);
        return StopWatch::IsAsked() != 0;
    };
    ZYROVFS::TaskMgr tasks(kAtOnce);
    if (!tasks.Add(kQueue, id.c_str(), getpid())) {
        throw Failure(500, "The box cannot keep its list of copies.");
    }
    switch (tool::WaitForTurn(
        kQueue, id, kAtOnce, [](int64_t) {}, pause)) {
        case tool::Turn::kCame:
            return;
        case tool::Turn::kStopped:
            throw FailureOf("The copy was stopped", ZYROVFS::VFS_ERR_CANCELLED);
        case tool::Turn::kQueueFailed:
            throw Failure(500, "The box cannot read its list of copies.");
    }
}

void Work(const User& user, const CopyPlan& plan, Job& job, const std::string& id) {
    const StopWatch watch(&job);
    const TransferNote note(user, {plan.from.Id(), plan.to.Id()});
    WaitForTurn(id);
    job.Record().started = time(nullptr);
    job.Record().state = JobState::kRunning;
    Cloud::InitCurlGlobal();
    RunCopy(plan, job);
    Cloud::CleanupCurlGlobal();
}

/** The worker's whole life. */
void WorkToTheEnd(const User& user, const CopyPlan& plan, Job& job, const std::string& id) {
    try {
        Work(user, plan, job, id);
        job.Succeed();
    } catch (const Failure& failure) {
        job.Fail(failure);
    } catch (const std::exception&) {
        job.Fail(Failure(500, "Something went wrong in the program."));
    }
    // Where that fails the entry counts no more once this process has ended.
    const AsRoot root;
    tool::RemoveTask(kQueue, id, getpid());
}

Json::Value Describe(const std::string& id, const JobRecord& job) {
    const int64_t end = job.ended != 0 ? job.ended : static_cast<int64_t>(time(nullptr));
    const auto seconds = static_cast<uint64_t>(std::max<int64_t>(end - job.started, 1));
    Json::Value task;
    task["id"] = id;
    task["title"] = std::string(job.title, strnlen(job.title, sizeof job.title));
    task["state"] = NameOf(job.state);
    task["done"] = static_cast<Json::UInt64>(job.moved);
    task["total"] = static_cast<Json::UInt64>(job.bytes);
    task["files_done"] = static_cast<Json::UInt64>(job.files);
    task["files_total"] = static_cast<Json::UInt64>(job.items);
    task["rate"] = static_cast<Json::UInt64>(job.moved / seconds);
    task["started"] = static_cast<Json::Int64>(job.started);
    task["counting"] = job.counting != 0;
    if (job.state == JobState::kFailed) {
        task["error"] = DescribeFailure(job);
    }
    return task;
}

}  // namespace

void StartCopy(const User& user, const Request& request) {
    const CopyPlan plan = ReadPlan(user, Body(request));
    const std::string id = NewJobId();
    const std::unique_ptr<Job> job = Job::Start(user, JobKind::kCopy, id, TitleOf(plan));
    if (job == nullptr) {
        throw Failure(507, "The box has no room to keep track of a copy.");
    }
    StartWorker([&] { WorkToTheEnd(user, plan, *job, id); });
    Json::Value answer;
    answer["task"] = id;
    AnswerJson(200, answer);
}

void ListTasks(const User& user, const Request&) {
    Json::Value answer;
    answer["tasks"] = Json::Value(Json::arrayValue);
    for (const std::string& id : JobIds(user, JobKind::kCopy)) {
        try {
            answer["tasks"].append(Describe(id, ReadJob(user, JobKind::kCopy, id)));
        } catch (const Failure&) {
            continue;  // forgotten meanwhile
        }
    }
    AnswerJson(200, answer);
}

void CancelTask(const User& user, const Request& request) {
    CancelJob(user, JobKind::kCopy, Body(request).Text("id"));
    AnswerDone();
}

void RemoveTask(const User& user, const Request& request) {
    RemoveJob(user, JobKind::kCopy, Body(request).Text("id"));
    AnswerDone();
}

void CancelUpload(const User& user, const Request& request) {
    CancelJob(user, JobKind::kUpload, Body(request).Text("id"));
    AnswerDone();
}

}  // namespace web
