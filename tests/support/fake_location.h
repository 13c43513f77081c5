/**
 * Remote locations without bus or daemon: URIs of some schemes become files of this process that
 * mount and tell their local path as a test says. Forked children have them too. What was asked of
 * them is kept, whoever asked.
 */
#ifndef ZYROVFS_TESTS_FAKE_LOCATION_H
#define ZYROVFS_TESTS_FAKE_LOCATION_H

#include <gio/gio.h>
#include <sys/mman.h>
#include <unistd.h>

#include <csignal>
#include <cstdlib>
#include <functional>
#include <map>
#include <string>
#include <vector>

namespace fake_location {

struct Rules {
    /** Local path of a URI; "" for none. */
    std::function<std::string(const std::string& uri)> path;
    /** GIO error of a mount, -1 for success. */
    std::function<int(const std::string& uri)> mount;
    /** What the backend reports as the path of the mount inside the location; "" for no report. */
    std::string mount_path;
    /** Signal that ends the process which asks for a path. */
    int deadly = 0;
};

inline Rules rules;

inline int JournalFd() {
    static const int fd = memfd_create("locations", MFD_CLOEXEC);
    return fd;
}

inline void Note(const std::string& line) {
    const std::string text = line + "\n";
    if (write(JournalFd(), text.data(), text.size()) < 0) {
        abort();
    }
}

/** "mount URI", "path URI" and "find URI" (the mount of a URI, to unmount it), in order. */
inline std::vector<std::string> Calls() {
    std::vector<std::string> lines;
    std::string text(static_cast<size_t>(lseek(JournalFd(), 0, SEEK_END)), '\0');
    if (pread(JournalFd(), text.data(), text.size(), 0) < 0) {
        abort();
    }
    size_t from = 0;
    for (size_t to = 0; (to = text.find('\n', from)) != std::string::npos; from = to + 1) {
        lines.push_back(text.substr(from, to - from));
    }
    return lines;
}

struct Location {
    GObject parent;
    char* uri;
};
struct LocationClass {
    GObjectClass parent;
};

inline char* GetPath(GFile* file) {
    const char* uri = reinterpret_cast<Location*>(file)->uri;
    Note(std::string("path ") + uri);
    if (rules.deadly != 0) {
        raise(rules.deadly);
    }
    const std::string path = rules.path ? rules.path(uri) : "";
    return path.empty() ? nullptr : g_strdup(path.c_str());
}

inline char* GetUri(GFile* file) {
    return g_strdup(reinterpret_cast<Location*>(file)->uri);
}

inline void Mount(GFile* file, GMountMountFlags, GMountOperation* operation, GCancellable* cancel,
                  GAsyncReadyCallback done, gpointer data) {
    const char* uri = reinterpret_cast<Location*>(file)->uri;
    Note(std::string("mount ") + uri);
    GTask* task = g_task_new(file, cancel, done, data);
    if (!rules.mount_path.empty()) {
        g_signal_emit_by_name(operation, "ask-password", "mount_path", rules.mount_path.c_str(), "",
                              G_ASK_PASSWORD_NEED_USERNAME);
    }
    const int error = rules.mount ? rules.mount(uri) : -1;
    if (error < 0) {
        g_task_return_boolean(task, TRUE);
    } else {
        g_task_return_new_error(task, G_IO_ERROR, error, "as the test wants");
    }
    g_object_unref(task);
}

inline gboolean FinishMount(GFile*, GAsyncResult* result, GError** error) {
    return g_task_propagate_boolean(G_TASK(result), error);
}

inline GMount* FindMount(GFile* file, GCancellable*, GError** error) {
    Note(std::string("find ") + reinterpret_cast<Location*>(file)->uri);
    g_set_error_literal(error, G_IO_ERROR, G_IO_ERROR_NOT_FOUND, "nothing is mounted here");
    return nullptr;
}

inline void InitInterface(gpointer iface, gpointer) {
    auto* file = static_cast<GFileIface*>(iface);
    file->get_path = GetPath;
    file->get_uri = GetUri;
    file->mount_enclosing_volume = Mount;
    file->mount_enclosing_volume_finish = FinishMount;
    file->find_enclosing_mount = FindMount;
}

inline void Finalize(GObject* object) {
    g_free(reinterpret_cast<Location*>(object)->uri);
    static_cast<GObjectClass*>(g_type_class_peek(G_TYPE_OBJECT))->finalize(object);
}

inline void InitClass(gpointer klass, gpointer) {
    static_cast<GObjectClass*>(klass)->finalize = Finalize;
}

inline GType Type() {
    static const GType type = [] {
        const GType created =
            g_type_register_static_simple(G_TYPE_OBJECT, "FakeLocation", sizeof(LocationClass),
                                          InitClass, sizeof(Location), nullptr, G_TYPE_FLAG_NONE);
        const GInterfaceInfo info{InitInterface, nullptr, nullptr};
        g_type_add_interface_static(created, G_TYPE_FILE, &info);
        return created;
    }();
    return type;
}

inline GFile* New(GVfs*, const char* uri, gpointer) {
    auto* location = reinterpret_cast<Location*>(g_object_new(Type(), nullptr));
    location->uri = g_strdup(uri);
    return reinterpret_cast<GFile*>(location);
}

/** Forgets calls and rules, and takes the schemes over if that has not been done. */
inline void Reset() {
    static const bool taken = [] {
        setenv("GIO_USE_VFS", "local", 1);
        GVfs* vfs = g_vfs_get_default();
        for (const char* scheme : {"ftp", "sftp", "dav", "cifs", "sharing"}) {
            g_vfs_register_uri_scheme(vfs, scheme, New, nullptr, nullptr, New, nullptr, nullptr);
        }
        return true;
    }();
    rules = taken ? Rules() : rules;
    if (ftruncate(JournalFd(), 0) != 0) {
        abort();
    }
    lseek(JournalFd(), 0, SEEK_SET);
}

}  // namespace fake_location

#endif
