/** Uploads of large files by libcurl alone, in the protocols of the services. */
#ifndef ZYROVFS_BENCH_CLOUD_BARE_UPLOAD_H
#define ZYROVFS_BENCH_CLOUD_BARE_UPLOAD_H

#include <string>

#include "cloud_services.h"

namespace bench {

/** Whether the protocol of this service's large uploads is known here. */
bool HasBareUpload(const Service& service);
/** Sends the file's first bytes as "NAME" in the top folder. False when a request was refused. */
bool UploadBare(const Service& service, const Access& access, const std::string& name, int fd,
                long long size);

}  // namespace bench

#endif
