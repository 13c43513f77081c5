/** How the Live REST API writes its items and its errors. */
#ifndef ZYROVFS_TESTS_CLOUDSIM_ONEDRIVE_JSON_H
#define ZYROVFS_TESTS_CLOUDSIM_ONEDRIVE_JSON_H

#include <string>

#include "support/cloudsim/http.h"
#include "support/cloudsim/tree.h"

namespace cloudsim::onedrive {

/** Thrown by what is deep inside an operation; the operation's caller answers with it. */
struct Failure {
    Reply reply;
};

Reply Error(int status, const std::string& code, const std::string& message);

/** An item's id: "file.CID.CID!NNN", "folder.CID" for the top folder. `number` is the tree's. */
std::string MakeId(const Node& node, uint64_t number);
/** "CID!NNN", the part by which the web pages know an item. */
std::string ResourceId(const Node& node);
/** "photo", "audio", "video", "file", by the end of the name. */
std::string FileType(const std::string& name);
/** Where and by which URLs an item is found. */
struct Places {
    std::string type;
    std::string api;     ///< "https://host/v5.0"
    std::string source;  ///< URL of the content
};
Json::Value Item(const Node& node, const Places& places);
Json::Value User(const Account& account);
/** "2011-10-12T23:18:23+0000"; null for 0. */
Json::Value Date(int64_t time);

}  // namespace cloudsim::onedrive

#endif
