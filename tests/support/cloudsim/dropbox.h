/** Dropbox: API version 2, its contents' host and its token endpoint. */
#ifndef ZYROVFS_TESTS_CLOUDSIM_DROPBOX_H
#define ZYROVFS_TESTS_CLOUDSIM_DROPBOX_H

#include <atomic>
#include <functional>
#include <map>
#include <memory>
#include <string>
#include <vector>

#include "support/cloudsim/dropbox_json.h"
#include "support/cloudsim/dropbox_listing.h"
#include "support/cloudsim/dropbox_session.h"
#include "support/cloudsim/service.h"

namespace cloudsim {

struct DropboxOptions : ServerOptions {
    /**
     * With names, API and contents are told apart by host, and a function of one is not known at
     * the other: these names, or any that begins with "api." or "content.". At a bare address
     * (127.0.0.1) everything is answered. Without `hash_uploads` nothing has a content_hash.
     */
    std::string api_name = "localhost";
    std::string content_name = "content.localhost";
    /** Most entries of one answer of a listing, also of those that ask for more. */
    uint64_t page_size = 2000;
    /** Largest body of one request; a file may be as large as the account allows. */
    uint64_t max_request = 150 * 1024 * 1024;
    /** Seconds that an upload session is kept. */
    int64_t session_life = 7 * 24 * 3600;
};

/** One request to a function. */
struct DropboxCall {
    const Request& request;
    Account& account;
    dropbox::Arguments args;
};

class Dropbox : public Service {
  public:
    explicit Dropbox(const DropboxOptions& options = {});
    ~Dropbox() override { Stop(); }

    /** "https://localhost:PORT" and so on, without a slash at the end. */
    std::string ApiHost() const { return Address(dropbox_options_.api_name); }
    std::string ContentHost() const { return Address(dropbox_options_.content_name); }
    /** Where a person logs in, at the service "www.dropbox.com". */
    std::string WebHost() const { return ApiHost(); }
    std::string TokenUrl() const { return ApiHost() + "/oauth2/token"; }

    /** For so long, by the service's clock, every function answers 429. */
    void Throttle(int64_t seconds) { throttled_until_ = Now() + seconds; }
    /** Every cursor that was given so far is answered with "reset". */
    void ResetCursors();

  private:
    friend class DropboxUpload;
    using Operation = Reply (Dropbox::*)(const DropboxCall&);
    struct Function {
        const char* role;
        const char* name;
        Operation operation;
        bool takes_null;  ///< instead of an object
    };
    static const Function kFunctions[];

    /** Where a path leads: names below a folder that is there. */
    struct Place {
        Node* base;
        std::vector<std::string> names;
    };
    /** How far one gets there. */
    struct Target {
        Node* folder;                     ///< the last one that is there
        std::vector<std::string> missing; /**< folders between it and the item */
        std::string name;
        Node* taken;  ///< what is there already
    };

    std::unique_ptr<Handler> Begin(Request& request) override;
    std::string Role(const Request& request) const override;
    std::unique_ptr<Handler> BeginFunction(Request& request, const std::string& role,
                                           const std::string& name);
    std::unique_ptr<Handler> BeginRead(Request& request, Account& account,
                                       const Function& function);
    Reply Call(const Request& request, Account& account, const Function& function,
               const std::string& body);
    Reply Answer(const std::function<Reply()>& operation);
    bool IsThrottled() const { return Now() < throttled_until_; }
    Reply TooMany() const;

    // dropbox_token.cpp
    Reply Token(const Request& request, const std::string& form);
    Account* Authorize(Request& request);
    Reply Refused(const Request& request, const std::string& function) const;

    // dropbox_read.cpp
    Reply GetAccount(const DropboxCall& call);
    Reply GetSpace(const DropboxCall& call);
    Reply GetMetadata(const DropboxCall& call);
    Reply GetOldMetadata(const Request& request, Account& account);
    Reply Download(const DropboxCall& call);
    std::string Hash(const Node& node);
    Json::Value Show(const Node& node, bool tag);

    // dropbox_list.cpp
    Reply ListFolder(const DropboxCall& call);
    Reply ListMore(const DropboxCall& call);
    Reply LatestCursor(const DropboxCall& call);
    std::shared_ptr<dropbox::Listing> Keep(std::shared_ptr<dropbox::Listing> listing);
    std::shared_ptr<dropbox::Listing> Listed(const DropboxCall& call);
    std::shared_ptr<dropbox::Listing> Changed(const dropbox::Listing& listing);
    void Gather(const Node& node, dropbox::Listing& listing);
    void GatherDeleted(const Node& folder, dropbox::Listing& listing);
    Reply Page(const std::shared_ptr<dropbox::Listing>& listing, size_t page);
    std::string Cursor(const std::shared_ptr<dropbox::Listing>& listing, size_t page);

    // dropbox_change.cpp
    Reply CreateFolder(const DropboxCall& call);
    Reply CreateFolder2(const DropboxCall& call);
    Reply Delete(const DropboxCall& call);
    Reply Delete2(const DropboxCall& call);
    Reply Copy(const DropboxCall& call);
    Reply Copy2(const DropboxCall& call);
    Reply Move(const DropboxCall& call);
    Reply Move2(const DropboxCall& call);
    Reply GetReference(const DropboxCall& call);
    Reply SaveReference(const DropboxCall& call);
    Json::Value MakeFolder(const DropboxCall& call);
    Json::Value Remove(const DropboxCall& call);
    Json::Value CopyItem(const DropboxCall& call);
    Json::Value MoveItem(const DropboxCall& call);
    void Remember(const Node& node);

    // dropbox_place.cpp
    Place Resolve(const DropboxCall& call, const std::string& path, const char* where);
    Node* Walk(const Place& place);
    /** Throws the error below `where` when there is none. */
    Node& Find(const DropboxCall& call, const std::string& path, const char* where);
    Target TargetOf(const DropboxCall& call, const std::string& path, const char* where);
    /** Makes what is missing of the way. */
    Node& MakeWay(const Target& target);
    std::string FreeName(const Target& target, bool folder) const;
    /** A name for what would be put there, or the conflict. */
    std::string NameFor(const Target& target, bool folder, bool rename, const char* where) const;

    // dropbox_write.cpp
    Node& Commit(const DropboxCall& call, const dropbox::Arguments& commit,
                 const ContentPtr& content);
    bool MayOverwrite(const dropbox::Arguments& commit, const Node& taken) const;
    Node& Store(const DropboxCall& call, const dropbox::Arguments& commit, const Target& target,
                const ContentPtr& content);
    bool IsSame(const Node& file, const Content& content);

    // dropbox_session.cpp
    Json::Value Finish(const DropboxCall& call, const dropbox::Arguments& args, ContentPtr last,
                       bool batch);
    Reply StartBatch(const DropboxCall& call);
    Json::Value FinishEntries(const DropboxCall& call);
    Reply FinishBatch(const DropboxCall& call);
    Reply FinishBatch2(const DropboxCall& call);
    Reply CheckBatch(const DropboxCall& call);
    std::string OpenSession(const Account& account, ContentPtr first, bool closed);
    /** Throws the error when there is none, or it doesn't stand there. */
    dropbox::Session& SessionAt(const DropboxCall& call, const dropbox::Arguments& cursor);

    const DropboxOptions dropbox_options_;
    std::atomic<int64_t> throttled_until_{0};
    std::map<std::string, dropbox::Session> sessions_;
    std::map<std::string, dropbox::Cursor> cursors_;
    std::map<std::string, std::shared_ptr<dropbox::Listing>> listings_;
    uint64_t listings_version_ = 0;
    size_t entries_kept_ = 0;
    struct Reference {
        const Account* owner;
        std::string id;
    };
    std::map<std::string, Reference> references_;
    std::map<std::pair<const Account*, std::string>, std::string> deleted_;
    std::map<std::string, std::string> sums_;
};

}  // namespace cloudsim

#endif
