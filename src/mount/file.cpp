#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>

#include "core/entry_name.h"
#include "core/fd_io.h"
#include "core/handle.h"
#include "core/log.h"
#include "core/no_throw.h"
#include "mount/glib_handle.h"
#include "mount/mkdir.h"
#include "zyrovfs/global.h"
#include "zyrovfs/utils.h"

namespace ZYROVFS::Utils {
namespace {

/** Beyond any line of ours, and no burden. */
constexpr size_t kLongestLine = 4 << 20;

struct flock WholeFileForWriting() {
    struct flock range {};
    range.l_type = F_WRLCK;
    range.l_whence = SEEK_SET;
    return range;
}

bool Rewrite(int fd, const char* path, const std::string& line) {
    if (ftruncate(fd, 0) != 0) {
        LOG_ERROR("Could not truncate PID file [%s], %m", path);
        return false;
    }
    if (write(fd, line.data(), line.size()) != static_cast<ssize_t>(line.size())) {
        LOG_ERROR("Writing to file [%s], %m", path);
        return false;
    }
    return true;
}

bool WriteFile(const char* path, const char* text) {
    const uid_t actor = GetActorUID();
    const OwnedFolder folder = CreateParentFolder(path, actor);
    if (!folder) {
        return false;
    }
    const UniqueFd fd = folder.OpenOrMake(SplitPath(path).name, O_RDWR, 0600);
    if (!fd) {
        // What is no regular file is told as what it is: nothing to truncate.
        LOG_ERROR(
            errno == EINVAL ? "Could not truncate PID file [%s], %m" : "Can't open file %s, %m",
            path);
        return false;
    }
    struct flock range = WholeFileForWriting();
    if (fcntl(fd.Get(), F_SETLK, &range) != 0) {
        if (errno == EACCES || errno == EAGAIN) {
            return true;  // another writer is at it, and what it writes is as good as ours
        }
        LOG_ERROR("Unable to lock file [%s], %m", path);
        return false;
    }
    return Rewrite(fd.Get(), path, std::string(text) + "\n");
}

/** The first line of a text that may be cut off behind `kLongestLine` bytes. */
bool FirstLine(const std::string& text, std::string& out) {
    const size_t end = text.find('\n');
    if (end == 0 || text.empty()) {
        return false;
    }
    out = text.substr(0, end);
    return true;
}

bool ReadFirstLine(const char* path, std::string& out) {
    const EntryPath place = SplitPath(path);
    const OwnedFolder folder = OwnedFolder::Open(place.folder, GetActorUID());
    const UniqueFd fd = folder ? folder.OpenFile(place.name, O_RDONLY) : UniqueFd();
    std::string text;
    const bool whole = fd && ReadUpTo(fd.Get(), kLongestLine, text);
    if (!whole && (!fd || errno != EFBIG || text.find('\n') == std::string::npos)) {
        if (errno != ENOENT) {
            LOG_ERROR("Can't open file %s, %m", path);
        }
        return false;
    }
    return FirstLine(text, out);
}

UniqueObject<GFileInfo> Query(GFile* file, const char* path, const char* attributes) {
    GError* error = nullptr;
    UniqueObject<GFileInfo> info(
        g_file_query_info(file, attributes, G_FILE_QUERY_INFO_NONE, nullptr, &error));
    if (info == nullptr) {
        LOG_ERROR("Failed to get %s of %s, %s", attributes, path, error->message);
        g_error_free(error);
    }
    return info;
}

std::string TextOf(GFileInfo* info, const char* attribute) {
    const char* text = g_file_info_get_attribute_string(info, attribute);
    return text == nullptr ? "" : text;
}

/** Decimal hundreds, although a mode is octal: callers compare with 700, 600, 500, 400. */
unsigned ModeByAccess(GFileInfo* info) {
    unsigned access = 0;
    access += g_file_info_get_attribute_boolean(info, "access::can-read") ? 4 : 0;
    access += g_file_info_get_attribute_boolean(info, "access::can-write") ? 2 : 0;
    access += g_file_info_get_attribute_boolean(info, "access::can-execute") ? 1 : 0;
    return access * 100;
}

}  // namespace

bool CreateFile(const char* path, const char* text) {
    if (path == nullptr || text == nullptr) {
        LOG_ERROR("Wrong parameters");
        return false;
    }
    return NoThrow(VFS_ERR_FAILED, [=] { return WriteFile(path, text); });
}

bool CreatePidFile(const char* path, int pid) {
    return CreateFile(path, std::to_string(static_cast<unsigned>(pid)).c_str());
}

bool GetFileLine(const char* path, std::string& out) {
    if (path == nullptr) {
        LOG_ERROR("Wrong parameters");
        return false;
    }
    return NoThrow(VFS_ERR_FAILED, [&] { return ReadFirstLine(path, out); });
}

int GetFileInfo(const char* path, std::string& owner, std::string& group, unsigned int& mode) {
    if (path == nullptr) {
        LOG_ERROR("Wrong parameters");
        return 0;
    }
    const UniqueObject<GFile> file(g_file_new_for_commandline_arg(path));
    const auto info = Query(file.get(), path,
                            "owner::user,owner::group,access::can-read,access::can-write,"
                            "access::can-execute");
    if (info == nullptr) {
        return 0;
    }
    owner = TextOf(info.get(), "owner::user");
    group = TextOf(info.get(), "owner::group");
    const auto unix_info = Query(file.get(), path, "unix::mode");
    const bool has_mode =
        unix_info != nullptr && g_file_info_has_attribute(unix_info.get(), "unix::mode");
    mode = has_mode ? g_file_info_get_attribute_uint32(unix_info.get(), "unix::mode")
                    : ModeByAccess(info.get());
    return 0;
}

}  // namespace ZYROVFS::Utils
