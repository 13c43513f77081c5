/** The content of an item whose description has a URL of its own. */
#ifndef ZYROVFS_CLOUD_ITEM_DOWNLOAD_H
#define ZYROVFS_CLOUD_ITEM_DOWNLOAD_H

#include <json/value.h>

#include <functional>
#include <string>

#include "cloud/request.h"
#include "core/source_line.h"

namespace ZYROCloud {

struct ItemDownload {
    const FrameRules& frame;
    /** Each part of the URL's path is escaped. */
    bool escape;
    /** Before each further attempt: may put another URL in place. False ends the transfer. May be
     * empty. */
    std::function<bool(std::string& url)> renew = nullptr;
};

/**
 * Fetches "url" of `meta`, or the range that "from_bytes" and "len" tell, into `xfer`. It is asked
 * for again as long as no byte has been written. The driver's handler stays set to fail on errors.
 * VFS_ERR_CLOUD_FAILED without a URL or a context. Log lines are those of the caller.
 */
bool DownloadByUrl(PublicCloud& cloud, XferData* xfer, const Json::Value& meta,
                   const ItemDownload& rules, ZYROVFS::SourceLine at = ZYROVFS::SourceLine::Here());

}  // namespace ZYROCloud

#endif
