/** The folders that hold one for each user, as root goes through them: no link is followed, and
 * nothing that a user has mounted is entered or asked. */
#ifndef ZYROVFS_TOOLS_HOST_FOLDER_H
#define ZYROVFS_TOOLS_HOST_FOLDER_H

#include <sys/types.h>

#include <string>
#include <vector>

namespace tool {

/** An open folder; it closes itself. */
class Folder {
  public:
    /** A shared folder of root's: `machine` is the machine's own, where root may have links. */
    static Folder Shared(const char* machine, const std::string& below);
    /** A folder below that is the user's or root's. */
    Folder Below(const std::string& path, uid_t user) const;

    Folder(Folder&& other) noexcept : fd_(other.fd_) { other.fd_ = -1; }
    Folder& operator=(Folder&&) = delete;
    ~Folder();

    explicit operator bool() const { return fd_ >= 0; }
    int Get() const { return fd_; }
    std::vector<std::string> Names() const;

  private:
    explicit Folder(int fd) : fd_(fd) {}
    int fd_ = -1;
};

/** True for the very text of a user id. */
bool ToUid(const std::string& text, uid_t& uid);

}  // namespace tool

#endif
