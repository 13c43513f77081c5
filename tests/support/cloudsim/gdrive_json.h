/** How Google Drive writes its files and its errors. */
#ifndef ZYROVFS_TESTS_CLOUDSIM_GDRIVE_JSON_H
#define ZYROVFS_TESTS_CLOUDSIM_GDRIVE_JSON_H

#include <functional>
#include <string>

#include "support/cloudsim/gdrive_fields.h"
#include "support/cloudsim/gdrive_types.h"
#include "support/cloudsim/http.h"
#include "support/cloudsim/tree.h"

namespace cloudsim::gdrive {

/** Thrown by what is deep inside an operation; the operation's caller answers with it. */
struct Failure {
    Reply reply;
};

/** `parameter` is the one of the query that is to blame; a header is when the status is 401. */
Reply Error(int status, const std::string& reason, const std::string& message,
            const std::string& parameter = "");
std::string ErrorText(int status, const std::string& reason, const std::string& message,
                      const std::string& parameter = "");
Failure NotFound(const std::string& id);
Failure NoPermission(const Node& node);

/** What the service knows beside the item itself. */
struct View {
    const Account& account;
    std::string root;  ///< id of the account's topmost folder
    std::string api;   ///< addresses of the hosts
    std::string content;
    std::function<std::string(const Node&)> download_url, md5;
};

Json::Value File(const View& view, const Node& node, const Mask& mask);
Json::Value User(const Account& account);

}  // namespace cloudsim::gdrive

#endif
