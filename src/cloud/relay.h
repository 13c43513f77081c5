/** The relay's own state, beside that of the transfer engine. One relay per process at a time. */
#ifndef ZYROVFS_CLOUD_RELAY_H
#define ZYROVFS_CLOUD_RELAY_H

#include <json/value.h>

#include <string>

#include "cloud/relay_tail.h"
#include "zyrovfs/cloud.h"

namespace ZYROCloud {

/** A browser's file on its way up. */
struct RelayUpload {
    Cloud* cloud = nullptr;
    std::string uri;
    _tag_cgi_upload_progress_* progress = nullptr;
    RelayProgressCallback progress_cb = nullptr;
    RelaySpeedCallback speed_cb = nullptr;
    unsigned long long* transferred = nullptr;  ///< the caller's counter
    int stdin_fd = -1;
    std::string boundary;  ///< with the line break in front
    /** Place in the request from which on it is held back. */
    unsigned long long tail_start = 0;
    RelayTail tail;
    long long file_size = -1;          ///< as the caller knows it, -1 for not at all
    unsigned long long delivered = 0;  ///< bytes of the file that the driver has got
    int last_read = 0;
    bool failed = false;  ///< nothing more is read
};

/** A file on its way to a browser. */
struct RelayDownload {
    Cloud* cloud = nullptr;
    std::string path;
    std::string mime;
    SpeedCallback speed_cb = nullptr;
    Json::Value meta{Json::objectValue};
};

extern RelayUpload relay_upload;
extern RelayDownload relay_download;

/** Bytes of the browser's file, for libcurl; `context` is an XferContext. */
size_t RelayReadCallback(char* data, size_t size, size_t count, void* context);

}  // namespace ZYROCloud

#endif
