/** Answers, with the headers that keep a browser from running any of it. */
#ifndef ZYROVFS_WEB_RESPONSE_H
#define ZYROVFS_WEB_RESPONSE_H

#include <json/value.h>

#include <cstddef>
#include <string>

namespace web {

/** Writes all of it to the web server. False when that has gone away. */
bool Write(const char* data, size_t size);
inline bool Write(const std::string& bytes) {
    return Write(bytes.data(), bytes.size());
}
/** Whether an answer was begun: a failure shows only as an answer that is cut short then. */
bool HasAnswered();

/** Status line and headers of an answer; `headers` are lines of their own, "\r\n" at each end. */
std::string Head(int status, const std::string& type, const std::string& headers = "");

void AnswerJson(int status, const Json::Value& value);

/** For what was done and has nothing to tell. */
void AnswerDone();

/** Reads what a browser is still sending, up to a bound: it shows an answer only then. */
void DrainInput();

}  // namespace web

#endif
