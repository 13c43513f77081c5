/** How Box writes its items and its errors. */
#ifndef ZYROVFS_TESTS_CLOUDSIM_BOX_JSON_H
#define ZYROVFS_TESTS_CLOUDSIM_BOX_JSON_H

#include <string>
#include <vector>

#include "support/cloudsim/http.h"
#include "support/cloudsim/tree.h"

namespace cloudsim::box {

/** Thrown by what is deep inside an operation; the operation's caller answers with it. */
struct Failure {
    Reply reply;
};

Reply Error(int status, const std::string& code, const std::string& message,
            const Json::Value& context = Json::nullValue);

/** All that a request without `fields` gets. */
Json::Value Full(const Node& node);
/** What stands in lists and conflicts. */
Json::Value Mini(const Node& node);
/** type, id, etag and the fields asked for, by a comma-separated list. */
Json::Value Selected(const Node& node, const std::string& fields);
Json::Value User(const Account& account);
/** "2012-12-12T10:53:43-08:00": the service shows its own zone. */
std::string Date(int64_t time);

}  // namespace cloudsim::box

#endif
