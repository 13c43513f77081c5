/** OneDrive: Live REST API 5.0, the hosts of uploads by BITS and of contents, and Live login. */
#ifndef ZYROVFS_TESTS_CLOUDSIM_ONEDRIVE_H
#define ZYROVFS_TESTS_CLOUDSIM_ONEDRIVE_H

#include <map>
#include <set>
#include <string>
#include <vector>

#include "support/cloudsim/service.h"

namespace cloudsim {

struct OneDriveOptions : ServerOptions {
    /**
     * With names, API, login, storage and contents are told apart by host, and what belongs to one
     * is not found at another: these names, or any that begins with "apis.", "login.", "cid-",
     * "storage." or "public.". At a bare address (127.0.0.1) everything is answered.
     */
    std::string api_name = "localhost";
    std::string login_name = "login.localhost";
    std::string content_name = "public.localhost";
    /** Behind "cid-" and the account's id, the name of its storage host. */
    std::string storage_domain = ".localhost";
    /** Contents come from the host of contents; false: from the API itself. */
    bool redirects = true;
    /** Largest file that one PUT may bring; BITS takes what the account allows. */
    uint64_t put_limit = 100 * 1024 * 1024;
    uint64_t fragment_limit = 60 * 1024 * 1024;
    /**
     * [MC-BUP] to the letter, where the service's own description of BITS is milder: a fragment has
     * to begin at the next byte wanted, every packet has a Content-Length, the protocol's GUID
     * stands in braces, and a session that was made is told by 200, not 201.
     */
    bool strict_bits = false;
    /** The documentation says that folders can't be copied. */
    bool copies_folders = false;
    /** Documented are the code "resource_already_exists" and 409 for conflicts, not both as one. */
    int conflict_status = 409;
};

/** One request to the API: who asks, for which item, and what. */
struct OneDriveCall {
    const Request& request;
    Account& account;
    std::string id;    ///< of the item; the top folder's for "me/skydrive"
    Json::Value body;  ///< null without one
};

class OneDrive : public Service {
  public:
    explicit OneDrive(const OneDriveOptions& options = {});
    ~OneDrive() override { Stop(); }

    /** "https://localhost:PORT" and so on, without a slash at the end. */
    std::string ApiHost() const { return Address(drive_options_.api_name); }
    std::string LoginHost() const { return Address(drive_options_.login_name); }
    std::string ContentHost() const { return Address(drive_options_.content_name); }
    /** What follows "cid-" and an account's id: ".localhost:PORT". */
    std::string StorageDomain() const;
    std::string StorageHost(const Account& account) const;
    std::string TokenUrl() const { return LoginHost() + "/oauth20_token.srf"; }

    /** What the item shows as its type: "album", "notebook". A file's is told by its name. */
    void SetType(const std::string& id, const std::string& type);
    /** From now on so many requests of an account are answered in so many seconds; 420 beyond. */
    void LimitRate(unsigned requests, int64_t seconds);

    /** Uploads that were begun by BITS, and neither closed nor cancelled. */
    size_t UploadSessions() const;
    /** The service forgets them all. */
    void DropUploadSessions();

  private:
    friend class OneDriveUpload;
    friend class OneDriveBits;
    using Operation = Reply (OneDrive::*)(const OneDriveCall&);
    struct Route {
        const char* method;
        size_t parts;      ///< of the path, the item's id included
        const char* verb;  ///< the second part
        Operation operation;
    };
    static const Route kRoutes[];

    /** One upload by BITS. */
    struct Session {
        Account* account = nullptr;
        std::string folder;  ///< "CID!NNN" of the one that `path` begins in; "": the top one
        std::vector<std::string> path;
        uint64_t total = 0, next = 0;
        uint64_t replaced = 0;  ///< size of the file that was there
        std::unique_ptr<Sink> sink;
    };
    struct Window {
        int64_t began = 0;
        unsigned requests = 0;
    };

    std::unique_ptr<Handler> Begin(Request& request) override;
    std::string Role(const Request& request) const override;
    std::string AccountId(size_t index) const override;
    std::unique_ptr<Handler> BeginLogin(const Request& request);
    std::unique_ptr<Handler> BeginCall(Request& request);
    std::unique_ptr<Handler> Admit(Request& request);
    std::unique_ptr<Handler> BeginStorage(Request& request);
    std::unique_ptr<Handler> Answered(Request& request, Account& account,
                                      std::vector<std::string> path);
    std::unique_ptr<Handler> Routed(Request& request, Account& account,
                                    const std::vector<std::string>& path);
    Reply Call(OneDriveCall call, Operation operation, const std::string& body);
    Account* Authorize(Request& request);
    /** Seconds until the account may ask again; 0: it may. */
    int64_t TooSoon(const Account& account);

    // onedrive_token.cpp
    Reply Token(const std::string& form);
    Reply Refused(const Request& request) const;

    // onedrive_items.cpp: what reads
    Reply GetUser(const OneDriveCall& call) const;
    Reply GetQuota(const OneDriveCall& call);
    Reply GetItem(const OneDriveCall& call);
    Reply List(const OneDriveCall& call);
    Reply MakePage(const OneDriveCall& call);
    Reply ShowTypes(const OneDriveCall& call, const std::set<std::string>& types);
    Reply ShowPage(const OneDriveCall& call, const std::vector<const Node*>& nodes) const;
    Reply Search(const OneDriveCall& call);
    Reply ListAlbums(const OneDriveCall& call);

    // onedrive_change.cpp: what changes
    Reply CreateFolder(const OneDriveCall& call);
    Reply CreateAlbum(const OneDriveCall& call);
    Node& MakeFolder(const OneDriveCall& call);
    Reply Made(const OneDriveCall& call, const Node& node) const;
    Reply Update(const OneDriveCall& call);
    Reply Delete(const OneDriveCall& call);
    Reply Move(const OneDriveCall& call);
    Reply Copy(const OneDriveCall& call);

    // onedrive_transfer.cpp
    Reply GetContent(const OneDriveCall& call);
    Reply Download(const Request& request);

    /** Throws the reply when there is none. */
    Node& Find(const Account& account, const std::string& id);
    Node& Item(const OneDriveCall& call) { return Find(call.account, call.id); }
    Node& Folder(const Account& account, const std::string& id);
    Node& Destination(const OneDriveCall& call);
    void CheckName(const std::string& name) const;
    void CheckFree(const Node& parent, const std::string& name, const Node* except) const;
    void CheckSpace(const Account& account, uint64_t size, uint64_t replaced) const;
    std::string TypeOf(const Node& node) const;
    Json::Value Show(const Node& node) const;
    std::string ContentUrl(const Node& node) const;
    Reply Answer(const Request& request, int status, const Json::Value& document) const;

    const OneDriveOptions drive_options_;
    std::map<std::string, std::string> types_;
    std::map<std::string, Session> sessions_;
    std::map<std::pair<std::string, std::string>, Reply> pages_;
    uint64_t pages_version_ = 0;
    unsigned rate_requests_ = 0;
    int64_t rate_seconds_ = 0;
    std::map<const Account*, Window> windows_;
};

}  // namespace cloudsim

#endif
