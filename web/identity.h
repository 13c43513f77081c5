/** Who is logged in, and what this process may therefore do. */
#ifndef ZYROVFS_WEB_IDENTITY_H
#define ZYROVFS_WEB_IDENTITY_H

#include <sys/types.h>

#include <string>

namespace web {

struct User {
    std::string name;
    uid_t uid;
};

/**
 * Begins the program once more with root's identity throughout, an environment of its own with only
 * what CGI says of the request, and no descriptor but the three. Returns when that has happened.
 * The program is installed with the set-user-id bit, and libraries distrust a process whose real
 * and effective ids differ: they would look for the user's bus nowhere. Failure when this process
 * cannot be root.
 */
void StartClean();

/**
 * Becomes the user whom the web server's own authentication names in REMOTE_USER, with root's
 * identity saved for the library. Nothing else of the request is looked at before. Failure with
 * status 403 for nobody, for root and the system's own accounts, and for names that there are not.
 */
User BecomeUser();

/** Root's identity for what the user must not reach, for as long as the object lives. */
class AsRoot {
  public:
    AsRoot();
    AsRoot(const AsRoot&) = delete;
    AsRoot& operator=(const AsRoot&) = delete;
    ~AsRoot();

  private:
    uid_t before_;
};

/** Failure with status 403 for a user whom the policy shuts out. */
void CheckPolicy(const User& user);

}  // namespace web

#endif
