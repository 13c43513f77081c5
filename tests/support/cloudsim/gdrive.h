/** Google Drive: REST API 2 with uploads, the hosts of contents, and the token endpoint. */
#ifndef ZYROVFS_TESTS_CLOUDSIM_GDRIVE_H
#define ZYROVFS_TESTS_CLOUDSIM_GDRIVE_H

#include <deque>
#include <functional>
#include <map>
#include <optional>
#include <string>
#include <vector>

#include "support/cloudsim/date.h"
#include "support/cloudsim/gdrive_changes.h"
#include "support/cloudsim/gdrive_json.h"
#include "support/cloudsim/service.h"

namespace cloudsim {

struct GDriveOptions : ServerOptions {
    /**
     * With names, API (and uploads), accounts and contents are told apart by host, and what belongs
     * to one is not found at another: these names, or any that begins with "www.", "accounts." or
     * "doc". At a bare address (127.0.0.1) everything is answered.
     */
    std::string api_name = "localhost";
    std::string accounts_name = "accounts.localhost";
    std::string content_name = "docs.localhost";
    /** Seconds that a download URL is good for, by the service's clock. */
    int64_t download_life = 8 * 3600;
    /** Seconds that an upload session is kept. */
    int64_t session_life = 7 * 24 * 3600;
    /** The first page of every list is empty and has a token, as documented to be possible. */
    bool empty_pages = false;
    /** Reason of a refused upload: today's word, or "quotaExceeded" of older days. */
    std::string quota_reason = "storageQuotaExceeded";
};

/** One request to the API: who asks, the id in its path, and its JSON body (null without one). */
struct GDriveCall {
    const Request& request;
    Account& account;
    std::string id;
    Json::Value body;
};

/** What a test can ask of an item beside what every service knows. */
struct GDriveFacts {
    std::vector<std::string> parents;
    std::string mime_type, description;
    bool trashed = false;             ///< also when it is in a trashed folder
    bool explicitly_trashed = false;  ///< itself
    bool starred = false;
    Moment modified;
};

class GDrive : public Service {
  public:
    explicit GDrive(const GDriveOptions& options = {});
    ~GDrive() override { Stop(); }

    /** "https://localhost:PORT" and so on, without a slash at the end. */
    std::string ApiHost() const { return Address(drive_options_.api_name); }
    std::string AccountsHost() const { return Address(drive_options_.accounts_name); }
    std::string ContentHost() const { return Address(drive_options_.content_name); }
    std::string TokenUrl() const { return AccountsHost() + "/o/oauth2/token"; }

    std::map<std::string, std::string> Attributes(const Account& account,
                                                  const Item& item) override;

    // What only this service's items can be. Accounts take several items of one name. Each answers
    // the new item's id; an empty `parent` means that it lies nowhere.
    /** `kind` is "document", "spreadsheet", "presentation", "drawing", "form" or "script". */
    std::string AddDocument(Account& account, const std::string& parent, const std::string& title,
                            const std::string& kind, std::string exported);
    /** Of somebody else, who shared it with the account: it may be read and starred. */
    std::string AddShared(Account& account, const std::string& title, std::string bytes,
                          const std::string& owner = "zoe@example.com");
    std::string AddSharedFolder(Account& account, const std::string& title,
                                const std::string& owner = "zoe@example.com");

    // Each throws std::invalid_argument when the account has no such item.
    GDriveFacts Facts(const Account& account, const std::string& id);
    void SetParents(const Account& account, const std::string& id,
                    const std::vector<std::string>& parents);
    void SetTrashed(const Account& account, const std::string& id, bool trashed);
    void SetStarred(const Account& account, const std::string& id, bool starred);
    void SetMimeType(const Account& account, const std::string& id, const std::string& type);

    /** Every download URL that was given until now answers 403. */
    void ExpireDownloadUrls();
    /** Every open upload session answers 404 from now on. */
    void DropUploadSessions();
    /** Sessions that are open and not complete. */
    size_t UploadSessions();

    /** Body of an answer with this reason ("userRateLimitExceeded"), as the service words it. */
    static std::string ErrorText(int status, const std::string& reason);

  private:
    friend class GDriveUpload;
    friend class GDriveResume;
    using Operation = Reply (GDrive::*)(const GDriveCall&);
    struct Route {
        const char* method;
        const char* path;  ///< '*' stands for an id
        Operation operation;
    };
    static const Route kRoutes[];

    /** An upload that comes in pieces. Guarded by the service's lock. */
    struct Session {
        Account* account = nullptr;
        std::string id;  ///< of the file that gets the content; empty for a new one
        Json::Value metadata;
        std::string type;
        std::optional<uint64_t> total;
        std::unique_ptr<Sink> sink;
        uint64_t received = 0;
        uint64_t turn = 0;  ///< of the request that may write; older ones have lost the right
        int64_t expires = 0;
        std::optional<Reply> done;
    };
    using SessionPtr = std::shared_ptr<Session>;

    /** A list that is being read page by page. */
    struct Cursor {
        const Account* account;
        std::string query;
        std::shared_ptr<const std::vector<std::string>> ids;
        size_t next;
    };

    std::unique_ptr<Handler> Begin(Request& request) override;
    std::string Role(const Request& request) const override;
    std::unique_ptr<Handler> BeginCall(Request& request, const std::vector<std::string>& path);
    std::unique_ptr<Handler> BeginUpload(Request& request, const std::vector<std::string>& path);
    Reply Call(const Request& request, Account& account, const std::string& id,
               const std::string& body, const std::function<Reply(const GDriveCall&)>& operation);
    Account* Authorize(Request& request);
    static Reply Refused(const Request& request);

    // gdrive_token.cpp
    Reply Token(const std::string& form);

    // gdrive_read.cpp
    Reply About(const GDriveCall& call);
    Reply ListFiles(const GDriveCall& call);
    Reply MakePage(const GDriveCall& call);
    Cursor FindAll(const GDriveCall& call);
    std::string Remember(Cursor cursor);
    Reply GetFile(const GDriveCall& call);
    Reply Export(const GDriveCall& call);
    Reply Content(const Request& request);
    Reply Download(const Request& request, const Account& account,
                   const std::vector<std::string>& path);
    Reply Exported(const Request& request, const Node& node, const std::string& type) const;

    // gdrive_change.cpp
    Reply Insert(const GDriveCall& call);
    Reply Update(const GDriveCall& call);
    Reply Copy(const GDriveCall& call);
    Reply Trash(const GDriveCall& call);
    Reply Untrash(const GDriveCall& call);
    Reply TouchFile(const GDriveCall& call);
    Reply Delete(const GDriveCall& call);
    Reply EmptyTrash(const GDriveCall& call);
    void Apply(const GDriveCall& call, Node& node, const gdrive::Changes& changes);
    void SetDate(const GDriveCall& call, Node& node, const gdrive::Changes& changes) const;
    std::vector<Node*> ParentsOf(const GDriveCall& call, const gdrive::Changes& changes);
    std::vector<Node*> NewParents(const GDriveCall& call, Node& node,
                                  const gdrive::Changes& changes);
    Node& Create(const GDriveCall& call, const gdrive::Changes& changes, ContentPtr content,
                 const std::string& type);
    void CheckTarget(const GDriveCall& call, const gdrive::Changes& changes);

    // gdrive_upload.cpp and gdrive_resume.cpp
    Reply Store(const GDriveCall& call, ContentPtr content, const std::string& type);
    Reply OpenSession(const GDriveCall& call);
    SessionPtr FindSession(const std::string& key);

    /** Throws the reply when there is none. "root" is the account's topmost folder. */
    Node& Find(const GDriveCall& call, const std::string& id);
    Node& Folder(const GDriveCall& call, const std::string& id);
    /** For changes: neither the topmost folder nor somebody else's. */
    Node& Own(const GDriveCall& call);
    std::string Share(Node& node, const std::string& owner);
    Node& At(const Account& account, const std::string& id);
    void CheckSize(const Account& account, uint64_t size, uint64_t replaced) const;
    gdrive::View ViewOf(const Account& account);
    Json::Value Show(const GDriveCall& call, const Node& node);
    std::string Md5(const Node& node);

    const GDriveOptions drive_options_;
    uint64_t download_turn_ = 1, last_key_ = 0;
    std::map<std::string, SessionPtr> sessions_;
    std::map<std::string, Cursor> cursors_;
    std::deque<std::string> cursor_order_;
    std::map<std::pair<std::string, std::string>, Reply> pages_;
    uint64_t pages_version_ = 0;
    int64_t pages_made_ = 0;
    std::map<std::string, std::string> sums_;
};

}  // namespace cloudsim

#endif
