#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>
#include <zosplatform/file.h>
#include <zyrovfs/cloud_utils.h>
#include <zyrovfs/error.h>

#include <cerrno>
#include <cstdlib>
#include <cstring>
#include <memory>
#include <vector>

#include "command.h"
#include "location.h"
#include "report.h"
#include "text.h"
#include "transfer_progress.h"
#include "transfer_task.h"

namespace tool {
namespace {

using namespace ZYROVFS;
using ZYROCloud::Cloud;

struct TransferOptions {
    std::string from;
    std::string to;
    std::string rate_text;
    long long rate = 0;
    bool resume = false;
};

/** Pieces of a file that is fetched piece by piece; what a cancel finds unfinished is lost. */
constexpr long long kPiece = 8LL << 20;
constexpr long long kPieceOfSlow = 256LL << 10;

/** A descriptor of this program's own. */
struct File {
    int fd = -1;
    File() = default;
    File(const File&) = delete;
    File& operator=(const File&) = delete;
    ~File() { Close(); }
    bool Close() { return fd < 0 || close(std::exchange(fd, -1)) == 0; }
};

/** One transfer, from what the command line said to its report. */
class Transfer {
  public:
    Transfer(unsigned int uid, const TransferOptions& options, bool json)
        : uid_(uid), options_(options), json_(json) {}

    int Copy() {
        if (!OpenEnds()) {
            return kFailure;
        }
        const TransferTask task(uid_, ServerIds());
        if (source_ && target_) {
            return CopyBetween();
        }
        return source_ ? Download() : Upload();
    }

    int Print() {
        if (!OpenEnds()) {
            return kFailure;
        }
        const TransferTask task(uid_, ServerIds());
        long long size = 0;
        if (!IsSafe(*source_, options_.from, false, -1)) {
            return failure_;
        }
        if (!source_->GetFileSize(options_.from, &size)) {
            return Fail(*source_);
        }
        Start(size, false);
        return FetchPieces(0, size, STDOUT_FILENO) ? kSuccess : failure_;
    }

  private:
    bool OpenEnds() {
        setenv("ZYROVFS_UID", std::to_string(uid_).c_str(), 1);
        return Open(options_.from, source_) && Open(options_.to, target_);
    }

    bool Open(const std::string& place, std::unique_ptr<Cloud>& cloud) {
        if (!IsUri(place)) {
            return true;
        }
        std::string problem;
        cloud = OpenLocation(uid_, place, problem);
        if (!cloud) {
            ReportProblem(problem, json_);
        }
        return cloud != nullptr;
    }

    std::vector<std::string> ServerIds() const {
        std::vector<std::string> ids;
        for (const std::unique_ptr<Cloud>* cloud : {&source_, &target_}) {
            if (*cloud) {
                ids.push_back((*cloud)->GetServerID());
            }
        }
        return ids;
    }

    std::string What() const {
        return options_.to.empty() ? "cat " + options_.from
                                   : "cp " + options_.from + " " + options_.to;
    }

    int Fail(Cloud& cloud) {
        progress_.reset();
        if (Progress::Cancelled()) {
            cloud.SetError(VFS_ERR_CANCELLED, "");
        }
        return ReportCode(What(), cloud.GetErrorCode(), -Cloud::GetUploadErrorCode(&cloud), json_);
    }

    int FailLocally(const std::string& step) {
        const std::string cause = std::strerror(errno);
        progress_.reset();
        return ReportProblem(step + " failed: " + cause, json_);
    }

    /** What a driver would do with this that nobody asked for is refused in words. */
    bool IsSafe(Cloud& cloud, const std::string& uri, bool upload, long long size) {
        std::string why;
        if (ZYROCloud::Utils::IsTransferSafe(&cloud, uri, upload, size, why)) {
            return true;
        }
        failure_ = cloud.GetErrorCode() == VFS_ERR_NONE ? ReportProblem(why, json_) : Fail(cloud);
        return false;
    }

    void Start(long long size, bool bar, long long already = 0) {
        progress_ =
            std::make_unique<Progress>(NameOf(options_.from), size, options_.rate,
                                       bar && !json_ && isatty(STDERR_FILENO) == 1, already);
    }
    ZYROCloud::SpeedCallback Speed() const {
        return options_.rate > 0 ? Progress::OnSpeed : nullptr;
    }

    int Done() {
        const long long bytes = progress_->Bytes();
        const double seconds = progress_->Seconds();
        progress_.reset();
        if (json_) {
            Json::Value document;
            document["from"] = options_.from;
            document["to"] = options_.to;
            document["bytes"] = Json::Int64(bytes);
            document["seconds"] = seconds;
            PrintJson(document);
        } else {
            Say("Copied " + Printable(options_.from) + " to " + Printable(options_.to) + ": " +
                HumanBytes(static_cast<double>(bytes)) + " in " + HumanTime(seconds) + ".");
        }
        return kSuccess;
    }

    /** A target that is a folder takes the source's name. */
    void NameTarget() {
        struct stat info {};
        const bool folder = IsUri(options_.to)
                                ? options_.to.back() == '/'
                                : stat(options_.to.c_str(), &info) == 0 && S_ISDIR(info.st_mode);
        if (folder) {
            options_.to += (options_.to.back() == '/' ? "" : "/") + NameOf(options_.from);
        }
    }

    int Upload() {
        NameTarget();
        File file;
        struct stat info {};
        {
            const AsUser user(uid_);
            file.fd = open(options_.from.c_str(), O_RDONLY | O_CLOEXEC);
        }
        if (file.fd < 0 || fstat(file.fd, &info) != 0) {
            return FailLocally("Opening " + options_.from);
        }
        if (!S_ISREG(info.st_mode)) {
            return ReportProblem(options_.from + " is no file.", json_);
        }
        if (!IsSafe(*target_, options_.to, true, info.st_size)) {
            return failure_;
        }
        if (!target_->CanFileUpload(static_cast<unsigned long long>(info.st_size))) {
            return Fail(*target_);
        }
        Start(info.st_size, true);
        const bool done = Cloud::UploadFile(target_.get(), options_.to, file.fd, info.st_size,
                                            Progress::OnProgress, Progress::OnCancel, Speed());
        return done ? Done() : Fail(*target_);
    }

    int CopyBetween() {
        NameTarget();
        long long size = 0;
        if (!source_->GetFileSize(options_.from, &size)) {
            return Fail(*source_);
        }
        if (!IsSafe(*source_, options_.from, false, size) ||
            !IsSafe(*target_, options_.to, true, size)) {
            return failure_;
        }
        if (!target_->CanFileUpload(static_cast<unsigned long long>(size))) {
            return Fail(*target_);
        }
        Start(size, true);
        if (Cloud::CopyFile(source_.get(), target_.get(), options_.from, options_.to, size,
                            Progress::OnProgress, Progress::OnCancel, Speed())) {
            return Done();
        }
        return Fail(source_->GetErrorCode() != VFS_ERR_NONE ? *source_ : *target_);
    }

    /** Into a file beside the target, which takes its name when it is whole. */
    int Download() {
        NameTarget();
        if (!IsSafe(*source_, options_.from, false, -1)) {
            return failure_;
        }
        long long size = 0;
        if (!source_->GetFileSize(options_.from, &size)) {
            return Fail(*source_);
        }
        const std::string part = options_.to + ".part";
        File file;
        {
            const AsUser user(uid_);
            file.fd = open(
                part.c_str(),
                O_RDWR | O_CREAT | O_CLOEXEC | O_NOFOLLOW | (options_.resume ? 0 : O_TRUNC), 0666);
        }
        if (file.fd < 0) {
            return FailLocally("Opening " + part);
        }
        struct stat info {};
        if (fstat(file.fd, &info) != 0 || !S_ISREG(info.st_mode)) {
            return ReportProblem(part + " is no file.", json_);
        }
        const off_t have = lseek(file.fd, 0, SEEK_END);
        if (have < 0 || have > size) {
            return ReportProblem(part + " is longer than the remote file; remove it.", json_);
        }
        if (!Receive(file.fd, have, size)) {
            if (!json_ && !options_.resume) {
                ReportProblem("What came is kept in " + part + "; --resume goes on with it.",
                              false);
            }
            return failure_;
        }
        if (fsync(file.fd) != 0 || !file.Close()) {
            return FailLocally("Writing " + part);
        }
        {
            const AsUser user(uid_);
            if (rename(part.c_str(), options_.to.c_str()) != 0) {
                return FailLocally("Renaming " + part);
            }
        }
        return Done();
    }

    bool Receive(int fd, long long have, long long size) {
        Start(size, true, have);
        if (have > 0) {
            return FetchPieces(have, size, fd);
        }
        if (Cloud::DownloadFile(source_.get(), options_.from, fd, size, Progress::OnProgress,
                                Progress::OnCancel, Speed())) {
            return true;
        }
        failure_ = Fail(*source_);
        return false;
    }

    /** The bytes from `from` up to `size`, to a descriptor that need not be a file. */
    bool FetchPieces(long long from, long long size, int fd) {
        Json::Value meta;
        if (!source_->GetMetaDataByURI(options_.from, meta, "Download")) {
            failure_ = Fail(*source_);
            return false;
        }
        // A service that is addressed by its content's URL is given that, another the location.
        const Json::Value& url = meta["url"];
        const bool by_url = source_->GetCloudType() != ZYROCloud::CLOUD_TYPE_DROPBOX;
        const std::string place = by_url && url.isString() ? url.asString() : options_.from;
        const long long most = options_.rate > 0 ? kPieceOfSlow : kPiece;
        std::vector<char> piece(static_cast<size_t>(most) + 1);
        const long long begin = from;
        while (from < size) {
            progress_->BeginAt(from - begin);
            const long long want = std::min(most, size - from);
            long long got = 0;
            if (!Cloud::DownloadFileToBuffer(source_.get(), place, piece.data(), from, want, &got,
                                             Progress::OnProgress, Progress::OnCancel, Speed()) ||
                got == 0) {
                failure_ = Fail(*source_);
                return false;
            }
            got = std::min(got, want);
            if (ZYROWriteFileFd(fd, piece.data(), static_cast<size_t>(got)) != got) {
                failure_ = FailLocally("Writing");
                return false;
            }
            from += got;
        }
        return true;
    }

    unsigned int uid_;
    TransferOptions options_;
    bool json_;
    int failure_ = kFailure;
    std::unique_ptr<Cloud> source_;
    std::unique_ptr<Cloud> target_;
    std::unique_ptr<Progress> progress_;
};

int RunTransfer(unsigned int uid, const TransferOptions& options, bool json,
                int (Transfer::*job)()) {
    Progress::CatchSignals();
    Cloud::InitCurlGlobal();
    int status = kFailure;
    {
        Transfer transfer(uid, options, json);
        status = (transfer.*job)();
    }
    Cloud::CleanupCurlGlobal();
    return status;
}

void AddRateOption(CLI::App& command, const std::shared_ptr<TransferOptions>& options) {
    command
        .add_option("--limit-rate", options->rate_text,
                    "Bytes per second at most; K, M and G count in 1024s")
        ->type_name("RATE");
}

bool TakeRate(TransferOptions& options) {
    return options.rate_text.empty() || ParseRate(options.rate_text, options.rate);
}

void AddCopyCommand(CLI::App& app, Session& session) {
    const auto options = std::make_shared<TransferOptions>();
    CLI::App* command =
        AddUserCommand(app, session, "cp", "Copy a file: from, to or between remote locations",
                       [=, &session](unsigned int uid) {
                           return RunTransfer(uid, *options, session.json, &Transfer::Copy);
                       });
    command->add_option("SOURCE", options->from, "Local file or URI")->required();
    command->add_option("TARGET", options->to, "Local file or URI; a folder takes the name")
        ->required();
    AddRateOption(*command, options);
    command->add_flag("--resume", options->resume,
                      "Go on with the part that an earlier download left");
    CheckUse(*command, "one side must be a URI, the source a file, and a rate a number like 500K",
             [options] {
                 return (IsUri(options->from) || IsUri(options->to)) && !options->to.empty() &&
                        !NameOf(options->from).empty() && TakeRate(*options);
             });
}

void AddPrintCommand(CLI::App& app, Session& session) {
    const auto options = std::make_shared<TransferOptions>();
    CLI::App* command =
        AddUserCommand(app, session, "cat", "Write a remote file to standard output",
                       [=, &session](unsigned int uid) {
                           return RunTransfer(uid, *options, session.json, &Transfer::Print);
                       });
    command->add_option("URI", options->from, "Remote file")->required();
    AddRateOption(*command, options);
    CheckUse(*command, "a URI has the form protocol://account@host:port/path",
             [options] { return IsUri(options->from) && TakeRate(*options); });
}

}  // namespace

void AddTransferCommands(CLI::App& app, Session& session) {
    AddCopyCommand(app, session);
    AddPrintCommand(app, session);
}

}  // namespace tool
