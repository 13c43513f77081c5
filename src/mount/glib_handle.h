/** Owners of what GLib, GIO and libsoup hand out. */
#ifndef ZYROVFS_MOUNT_GLIB_HANDLE_H
#define ZYROVFS_MOUNT_GLIB_HANDLE_H

#include <gio/gio.h>
#include <libsoup/soup.h>

#include <memory>

#include "core/handle.h"

namespace ZYROVFS {

using UniqueError = std::unique_ptr<GError, FreeWith<g_error_free>>;
using UniqueGText = std::unique_ptr<char, FreeWith<g_free>>;
using UniqueSoupUri = std::unique_ptr<SoupURI, FreeWith<soup_uri_free>>;
template <typename T>
using UniqueObject = std::unique_ptr<T, FreeWith<g_object_unref>>;

}  // namespace ZYROVFS

#endif
