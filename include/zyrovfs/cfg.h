/**
 * Who may use remote connections: everybody, administrators, or a chosen set of users and groups.
 *
 * The policy is one file for the whole system. A VFSUser or a VFSGroup reads it when it is made,
 * is changed in memory, and writes it when it is destroyed, if anything was changed: only then does
 * a change land. Two objects that live at once do not see each other's changes, and the last
 * destructor wins. Callers run as root or with a saved root identity.
 *
 * A policy file that cannot be read leaves the object with an empty policy, the effective uid at
 * root, and VFS_ERR_CONFIG_READ in the cell.
 */
#ifndef ZYROVFS_CFG_H
#define ZYROVFS_CFG_H

#include <json/value.h>

#include <map>
#include <memory>
#include <string>

#include "zyrovfs/export.h"

namespace ZYROVFS::Cfg {

/** Where users and groups come from; the values are bits. */
enum AUTH_TYPE : unsigned int {
    AUTH_TYPE_LOCAL = 1,
    AUTH_TYPE_DOMAIN = 2,
    AUTH_TYPE_LDAP = 8,
    AUTH_TYPE_ALL = 11,
};

/** What differs between users and groups. The texts are literals. */
struct _VFS_ENTITY_FILE_SETTINGS {
    const char* key;           ///< member of the policy file that holds the settings
    const char* ldapListFile;  ///< missing while the machine's list of LDAP entries is made
    const char* domainPid;     ///< names the process that fetches the domain's entries
    const char* lockFile;      ///< held while entries are enumerated
};

class ZYROVFS_API VFSEntityCfg {
  public:
    static const _VFS_ENTITY_FILE_SETTINGS USER;
    static const _VFS_ENTITY_FILE_SETTINGS GROUP;

    explicit VFSEntityCfg(_VFS_ENTITY_FILE_SETTINGS settings);
    VFSEntityCfg(const VFSEntityCfg&) = delete;
    VFSEntityCfg& operator=(const VFSEntityCfg&) = delete;

    /** Writes what was changed. A failure is logged and leaves VFS_ERR_CONFIG_WRITE; the file then
     * is the old one. */
    virtual ~VFSEntityCfg();

    /**
     * One page of entries: fills "total" and appends to the array "usergrp_settings" of `out`.
     * List is the operation for callers; this one takes no lock. VFS_ERR_FAILED.
     */
    virtual bool SDKEnum(int start, int limit, Json::Value& out, const std::string& substr,
                         const std::string& domain, AUTH_TYPE type, bool prefix, bool noID) = 0;

    /** Takes down what the users with the value true have connected; their saved profiles stay.
     * Always true. */
    virtual bool DisableConnByMap(const std::map<std::string, bool>& ids);

    /**
     * Takes the settings of `conf` over in memory: under the key of this kind an array of objects
     * with "uid" (groups: "gid"), a number or text, and "enabled". Entries that are not mentioned
     * stay. VFS_ERR_BAD_PARAM, with nothing changed, for any other shape.
     */
    virtual bool ApplyConf(const Json::Value& conf) = 0;

    /** The stored type; "admin" when there is none. Always true. */
    bool GetUserEnabledType(std::string& type) const;

    /**
     * The settings of one uid or gid as they are in effect: "enabled" is forced to true by the type
     * "all" and to false by "admin". Null when nothing is stored or forced. Always true.
     */
    template <typename T>
    bool Get(T id, Json::Value& out) const;

    /**
     * Removes the settings of the ids in the array. VFS_ERR_BAD_PARAM for anything but an array of
     * texts and numbers: what stood before the bad element is gone from this object then, but is
     * not written.
     */
    bool Delete(Json::Value& ids);

    /**
     * Changes the policy and takes down what those who lost their right had connected, before this
     * object is destroyed and the file written.
     *
     * With "user_enabled_type" in `conf` that type is set. Settings in `conf` are applied only when
     * the type changes from "admin" or "all" to "custom": leave the type out to change settings.
     * A change to "admin" ends the connections of all but administrators and keeps their profiles.
     * A change from "all" to "custom", and settings without a type whatever the type is, remove
     * connections and saved profiles of all who are not enabled.
     *
     * VFS_ERR_BAD_PARAM for an unknown type or another shape, VFS_ERR_CONFIG_WRITE when the file's
     * folder cannot be made.
     */
    bool Set(Json::Value& conf);

    /**
     * One page of the machine's users or groups with their state, by name. `authType` is "local",
     * "domain", "ldap" or "all"; `limit` -1 gives all from `start` on. With `substr` only names
     * that begin with it (`prefix`) or contain it, without regard to case. `noID` leaves the ids
     * empty.
     *
     * `out` gets "offset", "total" (matching entries before the page was cut) and an array
     * "usergrp_settings" of objects with "name", "uid" or "gid" (text), "enabled" and
     * "is_modifiable". VFS_ERR_BAD_PARAM; VFS_ERR_BUSY while a domain or LDAP update runs or the
     * lock is held for more than a second; VFS_ERR_FAILED.
     */
    bool List(int start, int limit, std::string authType, std::string substr, std::string domain,
              bool prefix, bool noID, Json::Value& out);

    /** VFS_ERR_BUSY while what is asked for is being updated, VFS_ERR_BAD_PARAM for other text. */
    bool ConvertStrToAuthType(AUTH_TYPE& type, const std::string& text);

    /** Removes connections and saved profiles of everyone who is neither an administrator, nor
     * enabled, nor in an enabled group. */
    bool DisConnDisabledConf();

    /** Takes down what all but administrators have connected. */
    bool FilterNonAdminEntities();

    /**
     * The whole document, read or written as root. When reading or writing fails the effective uid
     * stays root. False also when the switch back to the caller's identity fails.
     */
    bool JsonFromFile(Json::Value& value, const char* path);
    bool JsonToFile(const char* path);

  protected:
    _VFS_ENTITY_FILE_SETTINGS settings_;
    Json::Value value_;
    bool dirty_;

  private:
    bool ChangeType(const Json::Value& conf);
    bool KeepChange();
};

extern template bool VFSEntityCfg::Get(unsigned int id, Json::Value& out) const;
extern template bool VFSEntityCfg::Get(unsigned long id, Json::Value& out) const;

class ZYROVFS_API VFSUser : public VFSEntityCfg {
  public:
    VFSUser();
    bool SDKEnum(int start, int limit, Json::Value& out, const std::string& substr,
                 const std::string& domain, AUTH_TYPE type, bool prefix, bool noID) override;
    bool ApplyConf(const Json::Value& conf) override;
};

class ZYROVFS_API VFSGroup : public VFSEntityCfg {
  public:
    VFSGroup();
    bool SDKEnum(int start, int limit, Json::Value& out, const std::string& substr,
                 const std::string& domain, AUTH_TYPE type, bool prefix, bool noID) override;
    bool ApplyConf(const Json::Value& conf) override;
};

/** A VFSUser for "user_settings", a VFSGroup for "group_settings", else null. */
ZYROVFS_API std::unique_ptr<VFSEntityCfg> MakeCfgBySettings(const std::string& key);
/** The same by the name of the first member of `conf`. */
ZYROVFS_API std::unique_ptr<VFSEntityCfg> MakeCfgBySettings(const Json::Value& conf);
/** A literal could be either of the above. */
inline std::unique_ptr<VFSEntityCfg> MakeCfgBySettings(const char* key) {
    return key == nullptr ? nullptr : MakeCfgBySettings(std::string(key));
}

// ---------------------------------------------------------------------------------------------
// May this user use it?

/** Set in `flags`: the policy is consulted. Clear: everyone passes whom no rule before it refuses.
 */
inline constexpr unsigned int VFS_USER_CONFIG_CONSULT = 1;

struct _VFS_USER_CONFIG_ {
    unsigned int flags;
};

/** The rule that decided, in the order in which they are asked. */
enum PERMISSION_RULE : unsigned int {
    PERMISSION_ADMINISTRATOR,  ///< yes: administrators cannot be shut out
    PERMISSION_REFUSED_UID,    ///< no: the one uid that is always refused
    PERMISSION_SHARING,        ///< yes: shared links are open to everyone else
    PERMISSION_NOT_CONSULTED,  ///< yes: the caller does not ask for the policy
    PERMISSION_USER_ENABLED,   ///< yes: the user's settings, or the type "all"
    PERMISSION_NO_SUCH_USER,   ///< no
    PERMISSION_NO_GROUPS,      ///< no: the user's groups cannot be found out
    PERMISSION_GROUP_ENABLED,  ///< yes: the settings of one of the user's groups
    PERMISSION_NOT_ENABLED,    ///< no: neither the user nor one of the groups is enabled
};

struct PermissionDecision {
    bool allowed;
    PERMISSION_RULE rule;
    unsigned int gid;  ///< the enabled group with PERMISSION_GROUP_ENABLED, else 0
};

/**
 * These answer yes or no. A failure on the way is a no and is logged; the error cell stays as it
 * was. `protocol` (may be null) counts as shared links when it starts with "sharing".
 */
ZYROVFS_API bool CheckPermissionByUserName(const char* name, _VFS_USER_CONFIG_ config,
                                           const char* protocol);
ZYROVFS_API bool CheckPermissionByUID(unsigned int uid, _VFS_USER_CONFIG_ config,
                                      const char* protocol);
/** Asks the user's groups alone: without VFS_USER_CONFIG_CONSULT only administrators pass. */
ZYROVFS_API bool CheckPermissionByBelongingGID(unsigned int uid, _VFS_USER_CONFIG_ config,
                                               const char* protocol);

/** CheckPermissionByUID with the rule that decided. */
ZYROVFS_API PermissionDecision ExplainPermission(unsigned int uid, _VFS_USER_CONFIG_ config,
                                                 const char* protocol);

}  // namespace ZYROVFS::Cfg

#endif
