/** What the flat operations of all services stand on: a driver for one call, and its failure. */
#ifndef ZYROVFS_BRIDGE_GVFS_UTILS_H
#define ZYROVFS_BRIDGE_GVFS_UTILS_H

#include <gio/gio.h>

#include <memory>
#include <string>

#include "core/no_throw.h"
#include "core/source_line.h"
#include "zyrovfs/cloud.h"

namespace ZYROCloud {

using UniqueCloud = std::unique_ptr<Cloud>;

/** The driver of a connection of the acting user; null, logged, when there is no such connection.
 * Threads may call it side by side. */
UniqueCloud CreateCloud(const char* server_id);

/** Tells the caller of a flat operation a GIO error. `err` may be null. */
inline void StoreError(int gio_error, int* err) {
    if (err != nullptr) {
        *err = gio_error;
    }
}

/** The same with that of a driver's failure; operations on folders have their own word for
 * G_IO_ERROR_TOO_MANY_LINKS. */
void StoreError(const Cloud& cloud, int* err, int too_many_links = G_IO_ERROR_TOO_MANY_LINKS);

/** A driver's error record as log lines quote it. */
std::string ErrorText(const Cloud& cloud);

/** An argument that may be null, as text for a string or a log line. */
inline const char* TextOrEmpty(const char* text) {
    return text == nullptr ? "" : text;
}

/**
 * Runs `body`, which answers bool, on a driver of the connection that lives as long as the call. A
 * connection of another service than `Driver` is none; `no_driver` is logged, a format that may
 * quote the server id. 1 or 0.
 */
template <typename Driver = Cloud, typename Body>
int WithDriver(const char* server_id, Body body, const char* no_driver = "Failed to create cloud",
               ZYROVFS::SourceLine at = ZYROVFS::SourceLine::Here()) {
    return ZYROVFS::NoThrow(
               ZYROVFS::VFS_ERR_FAILED,
               [&] {
                   const UniqueCloud owner = CreateCloud(server_id);
                   auto* driver = dynamic_cast<Driver*>(owner.get());
                   if (driver == nullptr) {
                       LOG_ERROR_AT(at, no_driver, TextOrEmpty(server_id));
                       return false;
                   }
                   return body(*driver);
               },
               at)
               ? 1
               : 0;
}

/** Whether all arguments that an operation requires are there; logged when one is not. */
template <typename... Pointers>
bool AllGiven(ZYROVFS::SourceLine at, const Pointers*... pointers) {
    if (((pointers != nullptr) && ...)) {
        return true;
    }
    LOG_ERROR_AT(at, "Wrong parameters");
    return false;
}

}  // namespace ZYROCloud

#endif
