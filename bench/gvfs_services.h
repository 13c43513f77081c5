/** The services as gvfs backends reach them: stored connections and the flat functions. */
#ifndef ZYROVFS_BENCH_GVFS_SERVICES_H
#define ZYROVFS_BENCH_GVFS_SERVICES_H

#include <memory>
#include <string>

#include "cloud_replay.h"
#include "zyrovfs/zyrocloud.h"

namespace bench {

/** What the flat functions of one service are. */
struct Backend {
    const char* service;
    const char* top;  ///< the folder that the account's root is shown as
    int (*list)(const char* server_id, ZYROCloud_Cache* cache, const char* path,
                ZYROCloud_ListCallback callback, void* user_data);
    long long (*read)(const char* server_id, ZYROCloud_Handle* handle, char** dest, long long size);
};

const Backend& FindBackend(const std::string& service);

/** The service without its caller's wishes for pages: a backend has none. */
const Service& AsBackendsList(const std::string& name);

std::string ServerId(const Service& service);
/** Stores the connection that flat functions look for, and where its service is. */
void Connect(const Service& service, const Access& access);
/** The same for a recorded listing, where any token will do. */
void Connect(const Service& service, const RecordedListing& listing);

struct DestroyCache {
    void operator()(ZYROCloud_Cache* cache) const { ZYROCloud_Cache_Destroy(&cache); }
};
using UniqueCache = std::unique_ptr<ZYROCloud_Cache, DestroyCache>;
UniqueCache MakeCache();

/** Lists the top folder into `cache`; the number of items that the callback was told of, -1 for a
 * failure. */
long ListTop(const Service& service, ZYROCloud_Cache* cache);

}  // namespace bench

#endif
