#include "identity.h"

#include <fcntl.h>
#include <grp.h>
#include <pwd.h>
#include <sys/prctl.h>
#include <unistd.h>
#include <zyrovfs/cfg.h>

#include <array>
#include <cstdlib>
#include <cstring>
#include <string>
#include <vector>

#include "failure.h"

namespace web {
namespace {

/** Group of all users of the box. */
constexpr gid_t kUsers = 100;
/** Below are the accounts of the system. */
constexpr uid_t kFirstUser = 1000;

constexpr const char* kName = "zyrovfs-web";

/** Set by the first start for the second; a request cannot, its headers have HTTP_ in front. */
constexpr const char* kClean = "ZYROVFS_WEB_CLEAN";

/** What CGI says of a request, as far as this program looks at it. */
constexpr const char* kFromTheServer[] = {
    "REMOTE_USER",
    "REQUEST_METHOD",
    "PATH_INFO",
    "QUERY_STRING",
    "CONTENT_TYPE",
    "CONTENT_LENGTH",
    "HTTP_HOST",
    "HTTP_ORIGIN",
    "HTTP_X_ZYROVFS_REQUEST",
    "HTTP_RANGE",
    "REQUEST_SCHEME",
    "HTTPS",
    "HTTP_ACCEPT_ENCODING",
};

bool IsRootThroughout() {
    uid_t real = 1;
    uid_t effective = 1;
    uid_t saved = 1;
    getresuid(&real, &effective, &saved);
    return real == 0 && effective == 0 && saved == 0;
}

std::vector<std::string> CleanEnvironment() {
    std::vector<std::string> environment = {"PATH=/usr/sbin:/usr/bin:/sbin:/bin", "LC_ALL=C.UTF-8",
                                            std::string(kClean) + "=1"};
    for (const char* name : kFromTheServer) {
        const char* value = getenv(name);
        if (value != nullptr) {
            environment.push_back(std::string(name) + "=" + value);
        }
    }
    return environment;
}

/** The first three are open, and nothing else is. */
void CleanDescriptors() {
    for (int fd = open("/dev/null", O_RDWR); fd >= 0 && fd <= STDERR_FILENO;) {
        fd = open("/dev/null", O_RDWR);
    }
    close_range(STDERR_FILENO + 1, ~0U, 0);
}

}  // namespace

void StartClean() {
    if (IsRootThroughout() && getenv(kClean) != nullptr) {
        unsetenv(kClean);
        // Started through a link, it would have that one's name where others look for it.
        prctl(PR_SET_NAME, kName);
        return;
    }
    std::vector<std::string> environment = CleanEnvironment();
    std::vector<char*> pointers;
    pointers.reserve(environment.size() + 1);
    for (std::string& variable : environment) {
        pointers.push_back(variable.data());
    }
    pointers.push_back(nullptr);
    std::array<char*, 2> arguments = {const_cast<char*>(kName), nullptr};
    CleanDescriptors();
    if (setresuid(0, 0, 0) == 0 && setresgid(0, 0, 0) == 0 && setgroups(0, nullptr) == 0) {
        execve("/proc/self/exe", arguments.data(), pointers.data());
    }
    throw Failure(500, "The program lacks the rights that it is installed with.");
}

User BecomeUser() {
    const char* name = getenv("REMOTE_USER");
    if (name == nullptr || *name == '\0') {
        throw Failure(403, "Nobody is logged in.");
    }
    std::array<char, 16384> room{};
    passwd entry{};
    passwd* found = nullptr;
    if (getpwnam_r(name, &entry, room.data(), room.size(), &found) != 0 || found == nullptr ||
        found->pw_uid < kFirstUser) {
        throw Failure(403, "There is no such user.");
    }
    User user{found->pw_name, found->pw_uid};
    if (initgroups(user.name.c_str(), kUsers) != 0 || setresgid(-1, kUsers, -1) != 0 ||
        setresuid(-1, user.uid, -1) != 0) {
        throw Failure(500, "The program cannot become the user.");
    }
    // Also while root's identity is taken up, the library's work is this user's.
    setenv("ZYROVFS_UID", std::to_string(user.uid).c_str(), 1);
    return user;
}

AsRoot::AsRoot() : before_(geteuid()) {
    if (seteuid(0) != 0) {
        throw Failure(500, "The program lacks the rights that it is installed with.");
    }
}

AsRoot::~AsRoot() {
    if (seteuid(before_) != 0) {
        std::abort();  // must not go on as root
    }
}

void CheckPolicy(const User& user) {
    using namespace ZYROVFS::Cfg;
    if (!CheckPermissionByUID(user.uid, {VFS_USER_CONFIG_CONSULT}, nullptr)) {
        throw Failure(403, "The administrator has not allowed you to use remote connections.");
    }
}

}  // namespace web
