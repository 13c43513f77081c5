/** What a listing shows of one profile. */
#ifndef ZYROVFS_SERVER_CONFIG_INFO_H
#define ZYROVFS_SERVER_CONFIG_INFO_H

#include <string>

namespace ZYROVFS::Server {

struct _tag_VFS_CONFIG_INFO_ {
    std::string id;  ///< key in the file; the list fills it in, not DumpToStruct
    std::string protocol;
    unsigned int port = 0;
    std::string hostname;
    std::string alias;
    std::string account;
    std::string codepage;
    std::string uri_path;
    std::string uri;
    int connect_status = 0;
    unsigned int max_connection = 0;
};

}  // namespace ZYROVFS::Server

#endif
