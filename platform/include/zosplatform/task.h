/**
 * Background tasks of a user, so that others can find and end them. One JSON file per task below
 * /var/tmp/zos/task/USER/, replaced atomically. Tasks are kept by root: only root makes the folders
 * above, and what another than root or the reader wrote is no task.
 */
#ifndef ZOSPLATFORM_TASK_H
#define ZOSPLATFORM_TASK_H

#include <json/value.h>

#include <memory>
#include <string>
#include <vector>

namespace ZOS {

class Task {
  public:
    Task(std::string path, std::string id, Json::Value properties);

    const std::string& id() const { return id_; }
    /** Null value when the task has no such property. */
    Json::Value getProperty(const std::string& name) const;
    void setProperty(const std::string& name, const Json::Value& value);
    /** Writes the task to disk. */
    bool save() const;
    /** Takes the task off the disk. */
    bool remove() const;

  private:
    std::string path_;
    std::string id_;
    Json::Value properties_;
};

class TaskMgr {
  public:
    explicit TaskMgr(const std::string& user);

    /** Ids of all tasks of the user, sorted. */
    std::vector<std::string> getAllTaskId() const;
    /** Null when there is no such task or its file cannot be read. */
    std::unique_ptr<Task> getTask(const std::string& id) const;
    /** A new task with an id of its own; null when it cannot be written. */
    std::unique_ptr<Task> createTask(const Json::Value& properties) const;

  private:
    std::string directory_;  ///< empty when the user's name cannot name a folder
};

}  // namespace ZOS

#endif
