/**
 * The folders below /tmp, /var/tmp and /usr/zyro stand where every user may write, and root works
 * in them. They are reached in this one way: component by component, no link followed, each folder
 * root's or the user's for whom it is there, and nobody else able to change what is in it.
 */
#ifndef ZYROVFS_CORE_OWNED_FOLDER_H
#define ZYROVFS_CORE_OWNED_FOLDER_H

#include <sys/stat.h>
#include <sys/types.h>

#include <string>

#include "core/handle.h"

namespace ZYROVFS {

/** Whom a written file belongs to; an id of -1 stays as it is. */
struct FileOwner {
    uid_t uid = static_cast<uid_t>(-1);
    gid_t gid = static_cast<gid_t>(-1);
};

/** Whether `path` is a folder of this system's own, all the way down: nothing of it is a link. */
bool IsOurFolder(const std::string& path);

/** The mode with which the folder `path` is made where `mode` is asked for: what all may write to
 * is sticky, and what all users share of the configuration is root's to change. */
mode_t SafeFolderMode(const std::string& path, mode_t mode);

/**
 * An open folder. Its operations take names of entries, never paths, and work by descriptor, so
 * that what was checked is what is used. What they find counts only when it belongs to root or to
 * the user; what a stranger has planted in a folder of ours that all may write to is moved aside,
 * under a name that begins with ".foreign.", and then counts as missing. Failures leave errno.
 */
class OwnedFolder {
  public:
    OwnedFolder() = default;

    /**
     * Reaches `path`, which has to be there. Below the folders that hold one for each user, it is
     * for the user whom the path names, and `user` counts elsewhere. On the way, what is ours and
     * open to the harm of others is repaired as far as this process may: a folder that all may
     * write to becomes sticky (one of the configuration is closed to them), a shared folder that a
     * stranger made becomes root's, a stranger's folder in a user's place is moved aside. A link or
     * a file on the way fails with ENOTDIR, a folder that cannot be trusted with EPERM.
     */
    static OwnedFolder Open(const std::string& path, uid_t user);

    explicit operator bool() const { return static_cast<bool>(fd_); }
    int Get() const { return fd_.Get(); }

    /** Describes an entry, links not followed. A stranger's fails with ENOENT when it could be
     * moved aside, with EPERM where that is not ours to do. */
    bool Stat(const std::string& name, struct stat& info) const;
    /** Moves aside what a stranger has under this name; also in a folder that is not our own. */
    bool MoveStrangerAside(const std::string& name) const;
    /** Opens a regular file that is there: no link, no FIFO, no device, no further name of a file
     * that stands elsewhere. */
    UniqueFd OpenFile(const std::string& name, int flags) const;
    /** The same for a file that is made, with `mode` under the umask, if it is missing. */
    UniqueFd OpenOrMake(const std::string& name, int flags, mode_t mode) const;
    /** A new file under a name that nothing has. */
    UniqueFd MakeFile(const std::string& name, int flags, mode_t mode) const;
    /** Opens or makes a file and takes its lock by flock, without waiting. */
    UniqueFd Lock(const std::string& name, int operation, mode_t mode) const;

    /** Reads a whole file; EFBIG for one of more than `limit` bytes, however long it says it is. */
    bool Read(const std::string& name, size_t limit, std::string& text) const;
    /**
     * New file beside the old one, written, flushed to disk, renamed over, the folder flushed too.
     * A crash, a kill or a full disk at any point leaves the old file; a link in its place is
     * replaced, not followed. With an owner the new file is given to it before it takes its place;
     * a caller that may not give files away keeps them. Does not throw.
     */
    bool Replace(const std::string& name, const std::string& text, mode_t mode,
                 FileOwner owner = {}) const noexcept;

    bool Remove(const std::string& name) const;
    bool Rename(const std::string& from, const std::string& to) const;
    bool MakeLink(const std::string& name, const char* target) const;
    bool ReadLink(const std::string& name, std::string& target) const;
    /** Makes a folder with just this mode and owner, or fails with EEXIST. */
    bool MakeFolder(const std::string& name, mode_t mode, FileOwner owner) const;
    /** The folder itself for reading, as fdopendir and fsync need it. */
    UniqueFd OpenForReading() const;

  private:
    OwnedFolder(UniqueFd fd, uid_t user, bool ours)
        : fd_(std::move(fd)), user_(user), ours_(ours) {}
    bool Enter(const std::string& name, const std::string& path);
    bool Trusts(const struct stat& info) const;
    bool MoveAside(const std::string& name) const;

    UniqueFd fd_;
    uid_t user_ = 0;
    bool ours_ = false;
};

}  // namespace ZYROVFS

#endif
