/** The mount engine: a user's private daemons, and one mount or unmount of one location. */
#ifndef ZYROVFS_VFS_H
#define ZYROVFS_VFS_H

#include <json/value.h>

#include <string>

#include "zyrovfs/export.h"

namespace ZYROVFS {

struct VFSPrivate;

/**
 * One mount or unmount. An object lives on its caller's stack for that one job. The process must
 * have been made ready for the user by InitGlobal or InitEnv.
 */
class ZYROVFS_API VFS {
  public:
    VFS();
    ~VFS();
    VFS(const VFS&) = delete;
    VFS& operator=(const VFS&) = delete;

    /** VFS_ERR_NO_PERMISSION when the feature may not be used. */
    bool Init();
    /** The same, then all properties. Null texts leave a property empty. */
    bool Init(const char* user, const char* pass, const char* uri, const char* path,
              const char* codepage, const Json::Value& data, bool force);
    bool CheckPermission();

    /**
     * Mounts the location as the user, waiting as long as the server does. True also when it was
     * mounted already. False leaves a code of the mount family; with VFS_ERR_IDENTITY_QUESTION the
     * detail has "host" and "fingerprint", with VFS_ERR_CERT_UNTRUSTED the certificate. A
     * helper that is killed gives false with the cell as it was. The calling process runs no GIO.
     */
    bool Mount();

    /** Ends the connection's transfers and unmounts; true also when nothing was mounted. */
    bool UnMount();

    std::string GetUser() const;
    std::string GetPass() const;
    std::string GetURI() const;
    std::string GetPath() const;
    std::string GetCodePage() const;
    std::string GetFullPath() const;
    Json::Value GetData() const;
    bool GetForce() const;
    /** The URI, "/" and the path. */
    std::string GetFullURI() const;

    void SetUser(const char* user);
    void SetPass(const char* pass);
    void SetURI(const char* uri);
    void SetFullPath(const char* path);
    /** With a code page other than UTF-8 the path is kept in that code page. Null path: no change.
     */
    void SetPath(const char* path, const char* codepage);
    void SetForce(bool force);
    void SetData(const Json::Value& data);

  private:
    VFSPrivate* private_;
};

/** The user's session bus. All three daemons: IsAlive compares name and owner of the process;
 * CheckDaemonDied is true for a missing pid file and false when the pid cannot be read. */
class ZYROVFS_API DBUS {
  public:
    static bool Init();
    static bool IsAlive(int pid);
    static bool CheckDaemonDied();
    /** Ends the bus, and with it the user's mounts; waits up to 30 seconds. */
    static bool DoKill();
};

class ZYROVFS_API GVFSD {
  public:
    static bool Init();
    static bool IsAlive(int pid);
    static bool CheckDaemonDied();
};

class ZYROVFS_API GVFSD_FUSE {
  public:
    static bool Init();
    static bool IsAlive(int pid);
    static bool CheckDaemonDied();
};

}  // namespace ZYROVFS

#endif
