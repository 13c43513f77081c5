/**
 * A remote location that lives inside of the test program: a GFile for the URI schemes that a test
 * names, which plays a script when it is mounted or unmounted. A forked mount child has its own
 * copy of the script and leaves what it saw in shared memory.
 */
#ifndef ZYROVFS_TESTS_SCRIPTED_LOCATION_H
#define ZYROVFS_TESTS_SCRIPTED_LOCATION_H

#include <gio/gio.h>
#include <sys/mman.h>
#include <unistd.h>

#include <cstdio>
#include <cstring>
#include <functional>
#include <string>

#include "support/helper_in_process.h"

namespace scripted {

/** How a mount or unmount ends: with success when `message` is null. */
struct End {
    GQuark domain = 0;
    int code = 0;
    const char* message = nullptr;
};

inline End Failure(int code, const char* message = "no", GQuark domain = G_IO_ERROR) {
    return {domain, code, message};
}

struct Script {
    std::function<void(GMountOperation*)> on_mount;  ///< may ask
    End mount_end;
    bool mounted = true;                                  ///< whether find_enclosing_mount finds it
    std::function<void(const char* uri)> on_find;         ///< its mount is looked for
    std::function<std::string(const char* uri)> on_path;  ///< local path, "" for none
    std::function<void(GMountOperation*)> on_unmount;
    End unmount_end;
};

/** What the child did and was; plain data in memory that parent and child share. */
struct Seen {
    int mounts;
    int unmounts;
    pid_t pid;
    uid_t uid, effective_uid;
    gid_t gid, effective_gid;
    int groups;
    char uri[8192];
    char user[256];
    char password[256];
    char domain[256];
    int anonymous;
    int choice;
    int replies[8];  ///< GMountOperationResult of each question, in order
    int questions;
    int mark;  ///< for a test's own use
};

inline Script& TheScript() {
    static Script script;
    return script;
}

inline Seen& TheSeen() {
    static Seen* const seen = static_cast<Seen*>(
        mmap(nullptr, sizeof(Seen), PROT_READ | PROT_WRITE, MAP_SHARED | MAP_ANONYMOUS, -1, 0));
    return *seen;
}

inline void Reset() {
    TheScript() = Script();
    TheSeen() = Seen();
}

template <size_t N>
void Keep(char (&to)[N], const char* text) {
    snprintf(to, N, "%s", text == nullptr ? "" : text);
}

inline void TakeReply(GMountOperation* operation, GMountOperationResult result, gpointer) {
    Seen& seen = TheSeen();
    if (seen.questions < 8) {
        seen.replies[seen.questions] = result;
    }
    ++seen.questions;
    Keep(seen.user, g_mount_operation_get_username(operation));
    Keep(seen.password, g_mount_operation_get_password(operation));
    Keep(seen.domain, g_mount_operation_get_domain(operation));
    seen.anonymous = g_mount_operation_get_anonymous(operation);
    seen.choice = g_mount_operation_get_choice(operation);
}

/** One question, asked as GIO asks it; the reply is kept. False when it was not handled. */
template <typename Emit>
bool Ask(GMountOperation* operation, Emit emit) {
    const gulong handler = g_signal_connect(operation, "reply", G_CALLBACK(TakeReply), nullptr);
    const int before = TheSeen().questions;
    emit();
    g_signal_handler_disconnect(operation, handler);
    return TheSeen().questions == before + 1 &&
           TheSeen().replies[before % 8] == G_MOUNT_OPERATION_HANDLED;
}

inline bool AskPassword(GMountOperation* operation, const char* message, int flags,
                        const char* default_user = "") {
    return Ask(operation, [&] {
        g_signal_emit_by_name(operation, "ask-password", message, default_user, "",
                              static_cast<GAskPasswordFlags>(flags));
    });
}

inline bool AskQuestion(GMountOperation* operation, const char* message) {
    const char* choices[] = {"Yes", "No", nullptr};
    return Ask(operation,
               [&] { g_signal_emit_by_name(operation, "ask-question", message, choices); });
}

inline void Finish(GTask* task, const End& end) {
    if (end.message == nullptr) {
        g_task_return_boolean(task, TRUE);
    } else {
        g_task_return_error(task, g_error_new_literal(end.domain, end.code, end.message));
    }
    g_object_unref(task);
}

inline void KeepIdentity() {
    Seen& seen = TheSeen();
    seen.pid = getpid();
    seen.uid = getuid();
    seen.effective_uid = geteuid();
    seen.gid = getgid();
    seen.effective_gid = getegid();
    seen.groups = getgroups(0, nullptr);
}

// --- the mount --------------------------------------------------------------------------------

struct Mount {
    GObject parent;
};
struct MountClass {
    GObjectClass parent;
};

inline void StartUnmount(GMount* mount, GMountUnmountFlags, GMountOperation* operation,
                         GCancellable*, GAsyncReadyCallback done, gpointer data) {
    ++TheSeen().unmounts;
    KeepIdentity();
    GTask* task = g_task_new(mount, nullptr, done, data);
    if (TheScript().on_unmount) {
        TheScript().on_unmount(operation);
    }
    Finish(task, TheScript().unmount_end);
}

inline gboolean FinishTask(GAsyncResult* result, GError** error) {
    return g_task_propagate_boolean(G_TASK(result), error);
}

inline GType MountType() {
    static const GType type = [] {
        const GType made = g_type_register_static_simple(G_TYPE_OBJECT, "ScriptedMount",
                                                         sizeof(MountClass), nullptr, sizeof(Mount),
                                                         nullptr, static_cast<GTypeFlags>(0));
        const GInterfaceInfo interface = {
            [](gpointer table, gpointer) {
                auto* face = static_cast<GMountIface*>(table);
                face->unmount_with_operation = StartUnmount;
                face->unmount_with_operation_finish = [](GMount*, GAsyncResult* r, GError** e) {
                    return FinishTask(r, e);
                };
            },
            nullptr, nullptr};
        g_type_add_interface_static(made, G_TYPE_MOUNT, &interface);
        return made;
    }();
    return type;
}

inline GMount* NewMount() {
    return G_MOUNT(g_object_new(MountType(), nullptr));
}

// --- the file ---------------------------------------------------------------------------------

struct File {
    GObject parent;
    char* uri;
};
struct FileClass {
    GObjectClass parent;
};

inline char* UriOf(GFile* file) {
    return reinterpret_cast<File*>(file)->uri;
}

inline void StartMount(GFile* file, GMountMountFlags, GMountOperation* operation, GCancellable*,
                       GAsyncReadyCallback done, gpointer data) {
    ++TheSeen().mounts;
    KeepIdentity();
    Keep(TheSeen().uri, UriOf(file));
    GTask* task = g_task_new(file, nullptr, done, data);
    if (TheScript().on_mount) {
        TheScript().on_mount(operation);
    }
    Finish(task, TheScript().mount_end);
}

inline GMount* FindMount(GFile* file, GCancellable*, GError** error) {
    Keep(TheSeen().uri, UriOf(file));
    if (TheScript().on_find) {
        TheScript().on_find(UriOf(file));
    }
    if (TheScript().mounted) {
        return NewMount();
    }
    g_set_error_literal(error, G_IO_ERROR, G_IO_ERROR_NOT_MOUNTED, "The location is not mounted");
    return nullptr;
}

inline char* LocalPath(GFile* file) {
    const std::string path = TheScript().on_path ? TheScript().on_path(UriOf(file)) : "";
    return path.empty() ? nullptr : g_strdup(path.c_str());
}

inline GFile* NewFile(GVfs*, const char* uri, gpointer);

inline GType FileType() {
    static const GType type = [] {
        const GType made =
            g_type_register_static_simple(G_TYPE_OBJECT, "ScriptedFile", sizeof(FileClass), nullptr,
                                          sizeof(File), nullptr, static_cast<GTypeFlags>(0));
        const GInterfaceInfo interface = {
            [](gpointer table, gpointer) {
                auto* face = static_cast<GFileIface*>(table);
                face->dup = [](GFile* file) { return NewFile(nullptr, UriOf(file), nullptr); };
                face->get_path = LocalPath;
                face->get_uri = [](GFile* file) { return g_strdup(UriOf(file)); };
                face->mount_enclosing_volume = StartMount;
                face->mount_enclosing_volume_finish = [](GFile*, GAsyncResult* r, GError** e) {
                    return FinishTask(r, e);
                };
                face->find_enclosing_mount = FindMount;
            },
            nullptr, nullptr};
        g_type_add_interface_static(made, G_TYPE_FILE, &interface);
        return made;
    }();
    return type;
}

/** The text of a file that is forgotten here ends with the process. */
inline GFile* NewFile(GVfs*, const char* uri, gpointer) {
    auto* file = static_cast<File*>(g_object_new(FileType(), nullptr));
    file->uri = const_cast<char*>(g_intern_string(uri));
    return G_FILE(file);
}

/** From now on URIs of this scheme are scripted locations, here and in forked children. */
inline void Register(const char* scheme) {
    g_vfs_register_uri_scheme(g_vfs_get_default(), scheme, NewFile, nullptr, nullptr, nullptr,
                              nullptr, nullptr);
}

}  // namespace scripted

#endif
