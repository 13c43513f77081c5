/** What stands between drivers and the process-wide set-up of libcurl. */
#ifndef ZYROVFS_CLOUD_HANDLER_H
#define ZYROVFS_CLOUD_HANDLER_H

#include "http/api_handler.h"

namespace ZYROCloud {

/** A handler on the common store of names and TLS sessions; null when memory ran out. The caller
 * owns it. */
APIHandler* NewHandler() noexcept;

/** The store in `Cloud::_gShare_handle` while it may be used, else null. */
CURLSH* LiveShare() noexcept;

}  // namespace ZYROCloud

#endif
