/**
 * Remote locations by rules: URIs of the standard schemes mount and tell their local path as a test
 * says, and keep what was asked of them, by whichever process.
 */
#ifndef ZYROVFS_TESTS_FAKE_LOCATION_H
#define ZYROVFS_TESTS_FAKE_LOCATION_H

#include <fcntl.h>

#include <csignal>
#include <cstdlib>
#include <functional>
#include <string>
#include <vector>

#include "support/scripted_location.h"

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

/** A file without a name: children that have become somebody else still write to it. Its number is
 * none that a helper is given. */
inline int JournalFd() {
    static const int fd = [] {
        const int made = memfd_create("locations", MFD_CLOEXEC);
        const int high = fcntl(made, F_DUPFD_CLOEXEC, 100);
        close(made);
        return high;
    }();
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

inline std::string TellPath(const char* uri) {
    Note(std::string("path ") + uri);
    if (rules.deadly != 0) {
        raise(rules.deadly);
    }
    return rules.path ? rules.path(uri) : "";
}

inline void PlayMount(GMountOperation* operation) {
    const std::string uri = scripted::TheSeen().uri;
    Note("mount " + uri);
    if (!rules.mount_path.empty()) {
        scripted::AskPassword(operation, "mount_path", 0, rules.mount_path.c_str());
    }
    const int error = rules.mount ? rules.mount(uri) : -1;
    scripted::TheScript().mount_end =
        error < 0 ? scripted::End() : scripted::Failure(error, "as the test wants");
}

inline void TakeSchemes() {
    setenv("GIO_USE_VFS", "local", 1);
    for (const char* scheme : {"ftp", "sftp", "dav", "cifs", "sharing", "box"}) {
        scripted::Register(scheme);
    }
}

/** Forgets calls and rules. The first time, the schemes are taken over. */
inline void Reset() {
    static const bool taken = (TakeSchemes(), true);
    rules = taken ? Rules() : rules;
    scripted::Reset();
    scripted::TheScript().mounted = false;
    scripted::TheScript().on_find = [](const char* uri) { Note(std::string("find ") + uri); };
    scripted::TheScript().on_path = TellPath;
    scripted::TheScript().on_mount = PlayMount;
    if (ftruncate(JournalFd(), 0) != 0) {
        abort();
    }
    lseek(JournalFd(), 0, SEEK_SET);
}

}  // namespace fake_location

#endif
