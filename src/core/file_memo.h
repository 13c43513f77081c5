/** What a process has made of files, for as long as the files stay as they were. */
#ifndef ZYROVFS_CORE_FILE_MEMO_H
#define ZYROVFS_CORE_FILE_MEMO_H

#include <sys/types.h>
#include <unistd.h>

#include <ctime>
#include <map>
#include <string>
#include <tuple>
#include <utility>

namespace ZYROVFS {

/**
 * Which file stands at a path, and in what state. Whoever changes its contents, its mode or its
 * owner, or puts another one in its place, changes this. Plain data.
 */
struct FileIdentity {
    dev_t device = 0;
    ino_t inode = 0;
    off_t size = 0;
    timespec modified{};
    timespec changed{};

    bool operator==(const FileIdentity& other) const;
    bool operator!=(const FileIdentity& other) const { return !(*this == other); }
    /** Whether a change from now on gets another time than that of the last one. */
    bool IsSettled() const;
};

/** Looks at what `path` leads this process to, and opens nothing. False when that is nothing. */
bool Identify(const std::string& path, FileIdentity& identity);

/**
 * Values that were made of files. Each serves as long as its file stays the same, and only under
 * the effective user under which it was made. The file is looked at in every call, so that what
 * others write is seen at once.
 *
 * Each thread is to keep its own (thread_local): that takes no lock, and a fork no care.
 */
template <typename Value>
class FileMemo {
  public:
    /**
     * The value `name` of the file `path`. `make` fills it in and answers bool when there is none
     * of the file as it is now; null when that is false. Good until the next call.
     */
    template <typename Make>
    const Value* Get(const std::string& path, const std::string& name, Make make) {
        Key key(geteuid(), path, name);
        FileIdentity file;
        const bool there = Identify(path, file);
        const auto found = kept_.find(key);
        if (there && found != kept_.end() && found->second.file == file) {
            return &found->second.value;
        }
        Kept made;
        const bool settled = there && file.IsSettled();
        if (!make(made.value)) {
            kept_.erase(key);
            return nullptr;
        }
        FileIdentity after;
        if (settled && Identify(path, after) && after == file) {
            made.file = file;
        }
        if (kept_.size() >= kMost) {
            kept_.clear();
        }
        return &kept_.insert_or_assign(std::move(key), std::move(made)).first->second.value;
    }

  private:
    static constexpr size_t kMost = 8;

    using Key = std::tuple<uid_t, std::string, std::string>;
    struct Kept {
        FileIdentity file;  ///< that of no file when it was changing meanwhile
        Value value;
    };
    std::map<Key, Kept> kept_;
};

}  // namespace ZYROVFS

#endif
