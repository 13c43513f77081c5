/**
 * One suite for the drivers of all services, each run against its simulated service. A service
 * costs a record of what it can do and a rig, which says in the suite's words what the driver and
 * the simulated service say in theirs; RUN_DRIVER_SUITE does the rest. What is special to a service
 * stands in its own tests.
 */
#ifndef ZYROVFS_TESTS_DRIVER_SUITE_H
#define ZYROVFS_TESTS_DRIVER_SUITE_H

#include <gmock/gmock.h>
#include <json/value.h>

#include <memory>
#include <string>
#include <vector>

#include "cloud/public_cloud.h"
#include "support/cloudsim/service.h"
#include "support/driver_suite/source.h"
#include "support/profiles.h"
#include "support/xattrtree/xattrtree.h"
#include "zyrovfs/error.h"

namespace driver_suite {

using namespace ZYROVFS;    // NOLINT(google-build-using-namespace)
using namespace ZYROCloud;  // NOLINT(google-build-using-namespace)
using cloudsim::Fault;

/** What becomes of an item that arrives where one of its name is. */
enum class Meeting {
    kReplaces,   ///< the other one is gone
    kConflict,   ///< VFS_ERR_CONFLICT
    kDirectory,  ///< VFS_ERR_IS_DIRECTORY
    kBeside,     ///< both stay, under one name or under a changed one
};

/** What the driver's user sees of a status that every request may get. */
struct StatusCase {
    int status;
    __tag_vfs_err_ code;
    bool passing;  ///< waited for and asked again
    std::string body = "{}";
};

struct Capabilities {
    std::string protocol;        ///< of profiles; "PROTOCOL://amy@example.com" is the server id
    bool renews_tokens = true;   ///< one that is refused or too old
    bool walks = true;           ///< paths become ids by a walk down the remote tree
    bool folds_case = true;      ///< that walk finds a name in another case
    bool hides_names = true;     ///< listings leave hidden names out
    bool namesakes = false;      ///< a folder may hold a name many times
    size_t page_size = 0;        ///< items of a page; 0: a listing is one request
    bool deletes_twice = false;  ///< what is not there counts as deleted
    bool renames_twice = true;   ///< a rename that took place may be asked for again
    bool moves_twice = true;     ///< a move may
    bool move_renames = false;   ///< a move takes the name at the end of its target
    bool copy_renames = false;   ///< a copy does
    bool create_refuses_namesake = true;
    Meeting rename_onto_file = Meeting::kConflict;
    Meeting move_onto_file = Meeting::kConflict, move_onto_folder = Meeting::kConflict;
    Meeting copy_onto_file = Meeting::kReplaces, copy_onto_folder = Meeting::kDirectory;
    Meeting upload_onto_file = Meeting::kReplaces;
    unsigned long long largest_file = 0;    ///< that CanFileUpload takes without asking
    unsigned long long refused_file = 0;    ///< that it refuses
    unsigned long long largest_direct = 0;  ///< sent in one request; 0: all are
    /** An upload whose token was refused goes through within the same call. */
    bool upload_survives_refusal = false;
    /** How an upload ends that no token can be had for. */
    __tag_vfs_err_ upload_without_token = VFS_ERR_UNAUTHORIZED;
    /** A browser's file of unknown size beyond one request, with fields behind it. */
    bool takes_any_stream = true;
    bool streams_in_session = false;   ///< a file of unknown size, however small
    bool repeats_bad_answers = false;  ///< an answer that is no JSON is asked for again
    std::vector<StatusCase> statuses;
};

enum class Op {
    kAccount,
    kInfo,
    kList,
    kCreate,
    kRename,
    kMove,
    kCopy,
    kDelete,
    kUpload,
    kDownload,
    kToken,    ///< endpoint of renewals; not an operation
    kContent,  ///< where a download's bytes come from; not an operation
};
inline constexpr Op kAllOps[] = {Op::kAccount, Op::kInfo, Op::kList,   Op::kCreate, Op::kRename,
                                 Op::kMove,    Op::kCopy, Op::kDelete, Op::kUpload, Op::kDownload};
std::ostream& operator<<(std::ostream& to, Op op);

/** Beginning of the request of an operation on the stage, as faults and the journal take it. */
struct Endpoint {
    std::string method, path;
    bool exact = false;  ///< nothing behind it is another operation's
};

/** One request of an upload in a session, for a file that is one piece. */
struct SessionStep {
    const char* name;
    Endpoint at;
    int after;           ///< requests of this address that come before it
    bool repeats;        ///< made again when a status passes
    bool survives_loss;  ///< the upload is a success when the answer is lost
};

/** One service as the suite needs it. Paths are those of the account. */
class Rig {
  public:
    virtual ~Rig() = default;

    virtual const Capabilities& Can() const = 0;
    virtual cloudsim::Service& Sim() = 0;
    /** "hosts" of the document with the services' addresses. */
    virtual Json::Value Hosts() = 0;
    virtual std::unique_ptr<PublicCloud> NewDriver(unsigned uid, const Json::Value& profile) = 0;
    /** Profile member "account_info". */
    virtual std::string AccountInfo() { return "{}"; }

    /** Makes the mounted tree know what the account has at `path`. */
    virtual void Show(XattrTree& tree, const std::string& path);
    /** The driver's own name for the item at `path`. */
    virtual std::string IdOf(const std::string& path) = 0;
    /** Address that ranged reads of `path` take. */
    virtual std::string Address(const std::string& path) = 0;

    virtual std::string ItemName(const Json::Value& item) = 0;
    virtual std::string ItemId(PublicCloud& cloud, const Json::Value& item) = 0;
    virtual bool IsFolder(PublicCloud& cloud, const Json::Value& item) = 0;

    /** By the walk, where there is one. */
    virtual bool Resolve(PublicCloud& cloud, const std::string& path, std::string& id) = 0;
    /** `path` into `folder`, its name kept. */
    virtual bool MoveInto(PublicCloud& cloud, const std::string& path,
                          const std::string& folder) = 0;

    virtual Endpoint At(Op op) = 0;
    /** Path of the request that carries the bytes of this file down. */
    virtual std::string ContentOf(const std::string& path) = 0;
    /** Listings of all folders. */
    virtual Fault AnyListing() = 0;
    /** Makes the service find an item in the way. */
    virtual Fault& Conflict(Fault&& fault) { return fault.Answer(409, "{}"); }
    /** An item in the words of the service, its name as JSON text, and a page of such items. */
    virtual std::string ItemText(const std::string& name, const std::string& id, bool folder) = 0;
    virtual std::string PageText(const std::string& items) = 0;
    /** A page that names itself as the next one; "" where pages have no names. */
    virtual std::string CircularPage() { return ""; }

    virtual std::vector<SessionStep> SessionSteps() { return {}; }
    /** The upload that large files take. */
    virtual bool SendInSession(PublicCloud&, XferData&, const Json::Value&) { return false; }

    cloudsim::Account* amy = nullptr;  ///< whose items all this is about
};

using RigMaker = std::unique_ptr<Rig> (*)();

/** The simulated service with a stage on it, "/docs/a.txt" with ten digits and "/target", and a
 * driver with fresh tokens. Whatever fault a test declares must have happened when it ends. */
class DriverTest : public profiles::ProfileTest, public testing::WithParamInterface<RigMaker> {
  protected:
    DriverTest();
    void SetUp() override;
    void TearDown() override;

    /** A driver with fresh tokens, whose life the profile may tell. */
    void Renew(const std::string& expire_time = "");
    Json::Value Stored();

    void Show(const std::string& path) { rig->Show(tree, path); }
    std::string Id(const std::string& path) { return rig->IdOf(path); }
    std::string Uri(const std::string& path) const { return server_id + path; }
    std::vector<std::string> NamesIn(const Json::Value& items);

    /** Sets the stage anew, with a driver and a journal that know of nothing. */
    void Restore();
    /** The operation on the stage. */
    bool Run(Op op);
    Fault On(Op op) const;
    size_t Count(Op op) const;
    void Add(const Fault& fault) { sim.AddFault(fault); }

    bool Upload(Source& source, const std::string& path);
    bool Upload(const std::string& text, const std::string& path);
    /** Into `received`. */
    bool Download(const std::string& path, long long size);
    /** Hex sum of what the account has at a path; "" when there is nothing. */
    std::string SumOf(const std::string& path);
    std::string TextOf(const std::string& path);
    __tag_vfs_err_ Code() const { return cloud->GetErrorCode(); }

    static constexpr const char* kSecret = "secret-of-mine";
    static constexpr const char* kDigits = "0123456789";
    const std::unique_ptr<Rig> rig;
    const Capabilities& can;
    cloudsim::Service& sim;
    cloudsim::Account& amy;
    const std::string server_id;
    XattrTree tree{"/tmp/driver_tree"};
    cloudsim::Tokens granted;
    std::unique_ptr<PublicCloud> cloud;
    std::vector<Endpoint> endpoints;  ///< of the stage as it was set
    Target received;
};

// The chapters; their tests stand in support/driver_suite/.
class DriverItems : public DriverTest {};
class DriverChanges : public DriverTest {};
class DriverTransfer : public DriverTest {};
class DriverRelay : public DriverTest {
  protected:
    /** From the browser to `path`; `size` as the library is told. */
    bool Relay(const BrowserFile& file, const std::string& path, long long size);
    void ExpectRefusal(const Fault& fault, bool known);
    _tag_cgi_upload_progress_ progress{0, 0, 0};
};
class DriverCancel : public DriverTest {};
class DriverSessions : public DriverTest {
  protected:
    bool UploadBySession(Source& source);
    void ExpectAt(const SessionStep& step, const Fault& fault, bool success);
};
class DriverToken : public DriverTest {};
class DriverFaults : public DriverTest {};
class DriverNames : public DriverTest {};

}  // namespace driver_suite

/** All of the suite for the service that `maker` rigs up. Once in a program. */
#define RUN_DRIVER_SUITE(Service, maker)                                       \
    namespace driver_suite {                                                   \
    INSTANTIATE_TEST_SUITE_P(Service, DriverItems, testing::Values(maker));    \
    INSTANTIATE_TEST_SUITE_P(Service, DriverChanges, testing::Values(maker));  \
    INSTANTIATE_TEST_SUITE_P(Service, DriverTransfer, testing::Values(maker)); \
    INSTANTIATE_TEST_SUITE_P(Service, DriverRelay, testing::Values(maker));    \
    INSTANTIATE_TEST_SUITE_P(Service, DriverCancel, testing::Values(maker));   \
    INSTANTIATE_TEST_SUITE_P(Service, DriverSessions, testing::Values(maker)); \
    INSTANTIATE_TEST_SUITE_P(Service, DriverToken, testing::Values(maker));    \
    INSTANTIATE_TEST_SUITE_P(Service, DriverFaults, testing::Values(maker));   \
    INSTANTIATE_TEST_SUITE_P(Service, DriverNames, testing::Values(maker));    \
    }

#endif
