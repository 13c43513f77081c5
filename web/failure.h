/** What ends a request early: thrown where it is found, shown by main. */
#ifndef ZYROVFS_WEB_FAILURE_H
#define ZYROVFS_WEB_FAILURE_H

#include <json/value.h>
#include <zyrovfs/error.h>

#include <stdexcept>
#include <string>

namespace web {

class Failure : public std::runtime_error {
  public:
    /** `status` is HTTP's, `sentence` is for the person before the page. */
    Failure(int status, const std::string& sentence, ZYROVFS::__tag_vfs_err_ code = {})
        : std::runtime_error(sentence), status_(status), code_(code) {}

    int Status() const { return status_; }
    /** "status", "meaning" and, where the library gave a cause, its "name" and "code". */
    Json::Value Describe() const;

  private:
    int status_;
    ZYROVFS::__tag_vfs_err_ code_;
};

/** The failure of an operation of the library that left this code. */
Failure FailureOf(const std::string& what, ZYROVFS::__tag_vfs_err_ code);
/** The failure of a system call, by errno. */
Failure FailureOfErrno(const std::string& what);

}  // namespace web

#endif
