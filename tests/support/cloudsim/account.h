/** One user of a simulated service, as a test sees and fills it. */
#ifndef ZYROVFS_TESTS_CLOUDSIM_ACCOUNT_H
#define ZYROVFS_TESTS_CLOUDSIM_ACCOUNT_H

#include <atomic>
#include <cstdint>
#include <memory>
#include <string>
#include <vector>

#include "support/cloudsim/content.h"

namespace cloudsim {

class Service;

struct Tokens {
    std::string access_token;
    std::string refresh_token;
    int64_t expires_in = 0;
};

struct Item {
    std::string id;
    std::string parent;
    std::string name;
    bool folder = false;
    uint64_t size = 0;
    std::string sha1;                   ///< hex; empty for a folder
    int64_t created = 0, modified = 0;  ///< seconds since 1970
    int version = 0;                    ///< counts changes
};

/**
 * Belongs to its service and lives as long. Paths look like "/folder/file", the root is "/".
 * A call that names what isn't there, or a name that is taken, throws std::invalid_argument: that
 * is a mistake of the test.
 */
class Account {
  public:
    Account(Service& service, std::string email, std::string name, std::string id);
    Account(const Account&) = delete;
    Account& operator=(const Account&) = delete;

    const std::string& Email() const { return email_; }
    const std::string& Name() const { return name_; }
    const std::string& Id() const { return id_; }
    /** Id of the folder that holds all. */
    std::string Root() const;

    /** A new pair, as if the user had just granted access to this client (default: the first). */
    Tokens IssueTokens(int64_t life = 3600, const std::string& client = "");
    /** Every access token of the account is refused from now on; refresh tokens stay. */
    void ExpireAccessTokens();
    /** Every refresh token of the account is refused from now on (invalid_grant). */
    void RevokeRefreshTokens();
    /** The pair that the token endpoint, or IssueTokens, gave last. */
    Tokens LastTokens() const;

    /** Each answers the new item's id. `parent` is an id; AddPath makes missing folders. */
    std::string AddFolder(const std::string& parent, const std::string& name);
    std::string AddFile(const std::string& parent, const std::string& name, std::string bytes);
    std::string AddContent(const std::string& parent, const std::string& name, ContentPtr content);
    std::string AddPattern(const std::string& parent, const std::string& name, uint64_t size,
                           unsigned seed = 0);
    std::string AddPath(const std::string& path, std::string bytes);
    /** "item-000000.bin" and so on, each a pattern of `size` bytes. */
    void AddMany(const std::string& parent, size_t count, uint64_t size);

    void Remove(const std::string& id);
    void SetTimes(const std::string& id, int64_t created, int64_t modified);

    /** Empty when there is no such path. Names without regard to case where the service does so. */
    std::string Find(const std::string& path) const;
    bool Exists(const std::string& path) const { return !Find(path).empty(); }
    Item Get(const std::string& id) const;
    std::string Bytes(const std::string& id) const;
    /** Without what is in the trash. */
    std::vector<Item> List(const std::string& folder) const;

    void SetQuota(uint64_t bytes) { quota_ = bytes; }
    uint64_t Quota() const { return quota_; }
    uint64_t Used() const;
    /** Largest file that the service takes from this account. */
    void SetMaxUpload(uint64_t bytes) { max_upload_ = bytes; }
    uint64_t MaxUpload() const { return max_upload_; }

    /**
     * Fills the account from a folder of the disk; what clients change from now on is changed there
     * as well. Uploads are kept in it. Throws std::runtime_error.
     */
    void Serve(const std::string& folder);

  private:
    struct Node& At(const std::string& id) const;
    struct Node& FreePlace(const std::string& parent, const std::string& name) const;

    Service& service_;
    const std::string email_, name_, id_;
    std::atomic<uint64_t> quota_{107374182400}, max_upload_{16106127360};
};

}  // namespace cloudsim

#endif
