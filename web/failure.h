/** What ends a request early: thrown where it is found, shown by main. */
#ifndef ZYROVFS_WEB_FAILURE_H
#define ZYROVFS_WEB_FAILURE_H

#include <json/value.h>
#include <zyrovfs/error.h>

#include <stdexcept>
#include <string>
#include <utility>

namespace web {

class Failure : public std::runtime_error {
  public:
    /** `status` is HTTP's, `sentence` is for the person before the page. */
    Failure(int status, const std::string& sentence, ZYROVFS::__tag_vfs_err_ code = {})
        : std::runtime_error(sentence), status_(status), code_(code) {}

    /** What the person can do; replaces what the code alone would say. */
    Failure& Advise(std::string advice) {
        advice_ = std::move(advice);
        return *this;
    }
    /** What the person has to decide about, for the page's dialogue. */
    Failure& Ask(Json::Value trust) {
        trust_ = std::move(trust);
        return *this;
    }

    int Status() const { return status_; }
    ZYROVFS::__tag_vfs_err_ Code() const { return code_; }
    /** "status", "meaning", "advice" where there is any, "trust" where a decision is asked for and,
     * where the library gave a cause, its "name" and "code". */
    Json::Value Describe() const;

  private:
    int status_;
    ZYROVFS::__tag_vfs_err_ code_;
    std::string advice_;
    Json::Value trust_;
};

/** The failure of an operation of the library that left this code. */
Failure FailureOf(const std::string& what, ZYROVFS::__tag_vfs_err_ code);
/** The failure of a system call, by errno. */
Failure FailureOfErrno(const std::string& what);
/** The failure of one of the library's flat functions, by its value of GIOErrorEnum; -1 for one
 * that has left none. */
Failure FailureOfGio(const std::string& what, int error);

}  // namespace web

#endif
