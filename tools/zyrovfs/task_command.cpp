#include <zosplatform/process.h>
#include <zyrovfs/task.h>

#include <cstdlib>
#include <iostream>
#include <memory>

#include "command.h"
#include "report.h"
#include "task_queue.h"
#include "task_run.h"
#include "text.h"

namespace tool {
namespace {

using ZYROVFS::TaskMgr;

void ActFor(unsigned int uid) {
    setenv("ZYROVFS_UID", std::to_string(uid).c_str(), 1);
}

/** A type of job names files. */
std::string CheckName(const std::string& name) {
    constexpr size_t kLongest = 200;
    const bool fits = !name.empty() && name.size() <= kLongest && name != "." && name != ".." &&
                      name.find('/') == std::string::npos;
    return fits ? "" : "a queue is named like a file, without slashes";
}

/** A job's id is a word in a line. */
std::string CheckId(const std::string& id) {
    const bool fits = !id.empty() && id.find_first_of("\t\n") == std::string::npos;
    return fits ? "" : "an id is a text without tabs and newlines";
}

CLI::Option* AddName(CLI::App& command, std::string& name) {
    return command.add_option("NAME", name, "Queue: the type of job")->check(CheckName);
}

int ReportUnreadable(const std::string& name, bool json) {
    return ReportProblem("The queue " + name + " cannot be read.", json);
}

// --- add ----------------------------------------------------------------------------------------

struct AddOptions {
    std::string name;
    std::string id;
    int pid = 0;
};

int Add(unsigned int uid, const AddOptions& options, bool json) {
    ActFor(uid);
    if (YLIBCProcAlive(options.pid) == 0) {
        return ReportProblem("There is no process " + std::to_string(options.pid) + ".", json);
    }
    TaskMgr tasks(0);
    if (!tasks.Add(options.name.c_str(), options.id.c_str(), options.pid)) {
        return ReportProblem(
            "The queue " + options.name + " cannot be written; the system log tells why.", json);
    }
    if (json) {
        Json::Value document;
        document["name"] = options.name;
        document["id"] = options.id;
        document["pid"] = options.pid;
        PrintJson(document);
    } else {
        Say("Added " + Printable(options.id) + " to " + Printable(options.name) + ".");
    }
    return kSuccess;
}

void AddAddCommand(CLI::App& group, Session& session) {
    const auto options = std::make_shared<AddOptions>();
    CLI::App* command = AddUserCommand(
        group, session, "add", "Put a running process at the end of a queue",
        [=, &session](unsigned int uid) { return Add(uid, *options, session.json); });
    AddName(*command, options->name)->required();
    command->add_option("ID", options->id, "A name for the job")->required()->check(CheckId);
    command->add_option("--pid", options->pid, "The process that does the job")
        ->required()
        ->type_name("PID");
}

// --- list ---------------------------------------------------------------------------------------

Json::Value AsJson(const std::string& name, const TaskEntry& entry) {
    Json::Value value;
    value["name"] = name;
    value["id"] = entry.id;
    value["pid"] = entry.pid;
    value["alive"] = entry.alive;
    value["place"] = entry.place;
    return value;
}

void PrintTasks(const Json::Value& tasks) {
    Table table({"QUEUE", "PLACE", "ID", "PID"});
    for (const Json::Value& task : tasks) {
        table.Add({task["name"].asString(),
                   task["alive"].asBool() ? task["place"].asString() : "ended",
                   task["id"].asString(), task["pid"].asString()});
    }
    if (table.Rows() > 0) {
        std::cout << table.Format();
    } else {
        Say("There are no tasks to show.");
    }
}

int List(unsigned int uid, const std::string& name, bool json) {
    ActFor(uid);
    Json::Value document;
    Json::Value& tasks = document["tasks"] = Json::arrayValue;
    std::vector<std::string> names{name};
    if (name.empty() && !ZYROVFS::ListTaskQueues(names)) {
        return ReportProblem("The queues cannot be read.", json);
    }
    for (const std::string& queue : names) {
        std::vector<TaskEntry> entries;
        if (!ReadTasks(queue, entries)) {
            return ReportUnreadable(queue, json);
        }
        for (const TaskEntry& entry : entries) {
            tasks.append(AsJson(queue, entry));
        }
    }
    json ? PrintJson(document) : PrintTasks(tasks);
    return kSuccess;
}

void AddListCommand(CLI::App& group, Session& session) {
    const auto name = std::make_shared<std::string>();
    CLI::App* command =
        AddUserCommand(group, session, "list", "List the jobs of one queue or of all",
                       [=, &session](unsigned int uid) { return List(uid, *name, session.json); });
    AddName(*command, *name);
}

// --- run ----------------------------------------------------------------------------------------

void AddRunCommand(CLI::App& group, Session& session) {
    const auto run = std::make_shared<TaskRun>();
    CLI::App* command =
        AddUserCommand(group, session, "run", "Run a command when its turn in a queue has come",
                       [=, &session](unsigned int uid) {
                           ActFor(uid);
                           return RunTask(uid, *run, session.json);
                       });
    AddName(*command, run->name)->required();
    command->add_option("COMMAND", run->command, "After --: the command and its arguments")
        ->required();
    command->add_option("--id", run->id, "A name for the job")->type_name("ID")->check(CheckId);
    command->add_option("--limit", run->limit, "So many may run at once (3)")
        ->type_name("NUMBER")
        ->check(CLI::Range(1U, 1000000U));
}

// --- clean --------------------------------------------------------------------------------------

int Clean(unsigned int uid, const std::string& name, bool json) {
    ActFor(uid);
    TaskMgr tasks(0);
    std::vector<TaskEntry> left;
    if (!tasks.Clean(name.c_str(), nullptr, 0, nullptr, nullptr, false)) {
        return ReportProblem("The queue " + name + " cannot be cleaned; the system log tells why.",
                             json);
    }
    if (!ReadTasks(name, left)) {
        return ReportUnreadable(name, json);
    }
    if (json) {
        Json::Value document;
        document["name"] = name;
        document["left"] = static_cast<Json::UInt64>(left.size());
        PrintJson(document);
    } else {
        Say("Jobs left in " + Printable(name) + ": " + std::to_string(left.size()) + ".");
    }
    return kSuccess;
}

void AddCleanCommand(CLI::App& group, Session& session) {
    const auto name = std::make_shared<std::string>();
    CLI::App* command = AddUserCommand(
        group, session, "clean", "Take the jobs whose process has ended out of a queue",
        [=, &session](unsigned int uid) { return Clean(uid, *name, session.json); });
    AddName(*command, *name)->required();
}

}  // namespace

void AddTaskCommands(CLI::App& app, Session& session) {
    CLI::App* group = AddGroup(app, "task", "Background jobs of a user that take turns");
    AddAddCommand(*group, session);
    AddListCommand(*group, session);
    AddRunCommand(*group, session);
    AddCleanCommand(*group, session);
}

}  // namespace tool
