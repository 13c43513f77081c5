/**
 * A driver without a service: its handler's outcomes are written down by the test, so that what
 * lies above a request can be tested without one.
 */
#ifndef ZYROVFS_TESTS_SCRIPTED_CLOUD_H
#define ZYROVFS_TESTS_SCRIPTED_CLOUD_H

#include <deque>
#include <string>

#include "http/api_handler.h"
#include "http/error_handler.h"
#include "support/bare_driver.h"
#include "zyrovfs/cloud.h"

/** How one request ends; VFS_ERR_NONE is a success. */
struct Outcome {
    ZYROVFS::__tag_vfs_err_ code = ZYROVFS::VFS_ERR_NONE;
    bool retryable = true;
    unsigned seconds = 3;
};

class ScriptedErrors : public ZYROCloud::ErrorHandler {
  public:
    using ErrorHandler::ParseError;
    bool ParseError(int /*status*/, ZYROVFS::__tag_vfs_err_* code) override {
        *code = now.code;
        return now.code == ZYROVFS::VFS_ERR_NONE;
    }
    bool IsNeedRetry() override { return now.retryable; }
    unsigned int GetRetrySleepTime() override { return now.seconds; }

    Outcome now;
};

class ScriptedCloud : public bare::Driver<ZYROCloud::Cloud> {
  public:
    explicit ScriptedCloud(std::deque<Outcome> script = {}) : script_(std::move(script)) {
        api->SetErrorHandler(errors_);
    }

    /** The handler's own request: its record changes, the driver's does not. */
    bool Process() {
        const Outcome next = script_.empty() ? Outcome{} : script_.front();
        if (!script_.empty()) {
            script_.pop_front();
        }
        return Meet(next);
    }

    /** The same with an outcome that the script does not have. */
    bool Meet(const Outcome& outcome) {
        errors_->now = outcome;
        Json::Value record;
        record["curl_code"] = 22;
        record["response_code"] = 500;
        return errors_->ParseError(record, true);
    }

    /** A request that copies a failure into the driver's record. */
    bool Request() {
        if (Process()) {
            return true;
        }
        SetError(api->GetError());
        return false;
    }

    bool Init() override { return true; }
    bool SetAPIErrorHandler(ZYROCloud::APIHandler*) override { return true; }

  private:
    std::deque<Outcome> script_;
    ScriptedErrors* errors_ = new ScriptedErrors;  // the handler's from the constructor on
};

#endif
