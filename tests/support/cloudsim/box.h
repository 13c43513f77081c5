/** Box: REST API 2.0, its upload and download hosts and its token endpoint. */
#ifndef ZYROVFS_TESTS_CLOUDSIM_BOX_H
#define ZYROVFS_TESTS_CLOUDSIM_BOX_H

#include <deque>
#include <map>
#include <string>

#include "support/cloudsim/service.h"

namespace cloudsim {

struct BoxOptions : ServerOptions {
    /**
     * With names, API, upload and download are told apart by host, and what belongs to one is not
     * found at another: these names, or any that begins with "api.", "upload.", "dl." or "app.".
     * At a bare address (127.0.0.1) everything is answered.
     */
    std::string api_name = "localhost";
    std::string upload_name = "upload.localhost";
    std::string download_name = "dl.localhost";
    /** Offsets of listings beyond this are refused, as documented today. */
    uint64_t max_offset = 10000;
};

/** One request to the API: who asks, the id in its path, and its JSON body (null without one). */
struct BoxCall {
    const Request& request;
    Account& account;
    std::string id;
    Json::Value body;
};

class BoxService : public Service {
  public:
    explicit BoxService(const BoxOptions& options = {});
    ~BoxService() override { Stop(); }

    /** "https://localhost:PORT" and so on, without a slash at the end. */
    std::string ApiHost() const { return Address(box_options_.api_name); }
    std::string UploadHost() const { return Address(box_options_.upload_name); }
    std::string DownloadHost() const { return Address(box_options_.download_name); }
    /** Where a person logs in, at the service "account.box.com". */
    std::string AccountHost() const { return ApiHost(); }
    std::string TokenUrl() const { return ApiHost() + "/oauth2/token"; }

    std::map<std::string, std::string> Attributes(const Account& account,
                                                  const Item& item) override;

  private:
    friend class BoxUpload;
    using Operation = Reply (BoxService::*)(const BoxCall&);
    struct Route {
        const char* role;
        const char* method;
        const char* path;  ///< '*' stands for an id
        Operation operation;
    };
    static const Route kRoutes[];

    std::unique_ptr<Handler> Begin(Request& request) override;
    std::string Role(const Request& request) const override;
    std::unique_ptr<Handler> BeginUpload(Request& request, const std::vector<std::string>& path);
    std::unique_ptr<Handler> BeginCall(Request& request, const std::vector<std::string>& path);
    Reply Call(const Request& request, Account& account, const std::string& id, Operation operation,
               const std::string& body);
    Account* Authorize(Request& request);

    // box_token.cpp
    Reply Token(const std::string& form);
    Reply Refused(const Request& request) const;

    // box_items.cpp: what reads
    Reply GetUser(const BoxCall& call);
    Reply GetFolder(const BoxCall& call);
    Reply ListFolder(const BoxCall& call);
    Reply MakePage(const BoxCall& call);
    Reply GetFile(const BoxCall& call);
    Reply Search(const BoxCall& call);

    // box_change.cpp: what changes
    Reply CreateFolder(const BoxCall& call);
    Reply UpdateFolder(const BoxCall& call);
    Reply DeleteFolder(const BoxCall& call);
    Reply CopyFolder(const BoxCall& call);
    Reply UpdateFile(const BoxCall& call);
    Reply DeleteFile(const BoxCall& call);
    Reply CopyFile(const BoxCall& call);
    Reply Update(const BoxCall& call, Node& node);
    Reply Copy(const BoxCall& call, Node& node);

    // box_transfer.cpp
    Reply Preflight(const BoxCall& call);
    Reply PreflightVersion(const BoxCall& call);
    Reply GetContent(const BoxCall& call);
    Reply Download(const Request& request);

    /** Throws the reply when there is none. */
    Node& Find(const BoxCall& call, const std::string& id, bool folder);
    Node& File(const BoxCall& call) { return Find(call, call.id, false); }
    Node& Folder(const BoxCall& call) { return Find(call, call.id, true); }
    Node& ParentOf(const BoxCall& call, const Json::Value& body);
    void CheckName(const std::string& name) const;
    void CheckFree(Node& parent, const std::string& name, const Node* except) const;
    void CheckSize(const Account& account, uint64_t size, uint64_t replaced) const;
    Json::Value Answer(const BoxCall& call, const Node& node) const;

    const BoxOptions box_options_;
    std::map<std::string, ContentPtr> tickets_;
    std::deque<std::string> ticket_order_;
    std::map<std::pair<std::string, std::string>, Reply> pages_;
    uint64_t pages_version_ = 0;
};

}  // namespace cloudsim

#endif
