/** The JSON object that a request brings. */
#ifndef ZYROVFS_WEB_BODY_H
#define ZYROVFS_WEB_BODY_H

#include <json/value.h>

#include <string>

#include "request.h"

namespace web {

class Body {
  public:
    /** Failure with status 400 or 413. */
    explicit Body(const Request& request) : value_(ReadJson(request)) {}
    explicit Body(Json::Value value) : value_(std::move(value)) {}

    /** Failure with status 400 for a member that is missing or no text. */
    std::string Text(const char* key) const;
    std::string Text(const char* key, const std::string& otherwise) const;
    /** False for a member that is missing or no truth value. */
    bool Flag(const char* key) const;
    /** Failure with status 400 for a member that is no object. */
    Body Object(const char* key) const;
    /** Any member, null when it is missing. */
    const Json::Value& operator[](const char* key) const { return value_[key]; }

  private:
    Json::Value value_;
};

/** An object; null for any other text. */
Json::Value ParseObject(const std::string& text);

}  // namespace web

#endif
