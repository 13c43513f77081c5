/** Uploads by PUT or by a form, and downloads. */
#include <algorithm>

#include "support/cloudsim/onedrive.h"
#include "support/cloudsim/onedrive_json.h"
#include "support/cloudsim/onedrive_upload.h"
#include "support/cloudsim/route.h"

namespace cloudsim {
namespace {

constexpr const char* kBytes = "application/octet-stream";
constexpr const char* kEnd = ":Binary";
constexpr size_t kHead = 24;  ///< of a PNG file, up to its width and height
constexpr uint32_t kLargestEdge = 2048;

/** All that isn't plain goes as %XX, so that a name may hold anything. */
std::string Escape(const std::string& text) {
    static const char kDigits[] = "0123456789ABCDEF";
    std::string escaped;
    for (const char c : text) {
        const auto byte = static_cast<unsigned char>(c);
        if (isalnum(byte) != 0 || c == '-' || c == '.' || c == '_' || c == '~') {
            escaped += c;
        } else {
            escaped += {'%', kDigits[byte >> 4], kDigits[byte & 15]};
        }
    }
    return escaped;
}

uint32_t EdgeAt(const std::string& png, size_t at) {
    uint32_t edge = 0;
    for (size_t i = at; i < at + 4; i++) {
        edge = edge << 8 | static_cast<unsigned char>(png[i]);
    }
    return edge;
}

bool IsLargePng(const std::string& head) {
    return head.size() == kHead && head.compare(0, 8, "\x89PNG\r\n\x1a\n") == 0 &&
           std::max(EdgeAt(head, 16), EdgeAt(head, 20)) > kLargestEdge;
}

std::string Downsized(std::string png) {
    const uint64_t longest = std::max(EdgeAt(png, 16), EdgeAt(png, 20));
    for (const size_t at : {16, 20}) {
        const auto edge = static_cast<uint32_t>(EdgeAt(png, at) * uint64_t{kLargestEdge} / longest);
        for (size_t i = 0; i < 4; i++) {
            png[at + i] = static_cast<char>(edge >> (24 - 8 * i));
        }
    }
    return png;
}

}  // namespace

std::string OneDrive::ContentUrl(const Node& node) const {
    return ContentHost() + "/s1p/" + node.id + "/" + Escape(node.name);
}

Reply OneDrive::GetContent(const OneDriveCall& call) {
    const Node& file = Item(call);
    if (file.folder) {
        return onedrive::Error(400, "request_url_invalid", "A folder has no content.");
    }
    const std::string url = ContentUrl(file) + kEnd;
    if (call.request.Query("suppress_redirects") == "true") {
        Json::Value answer;
        answer["location"] = url;
        return Answer(call.request, 200, answer);
    }
    return drive_options_.redirects ? Reply(302).With("Location", url)
                                    : ContentReply(call.request, file.content, kBytes);
}

/** Whoever has the URL has the file; a token is neither needed nor looked at. */
Reply OneDrive::Download(const Request& request) {
    const std::vector<std::string> path = request.Segments();
    const std::lock_guard<std::mutex> lock(mutex_);
    for (const auto& account : accounts_) {
        const Node* file =
            path.size() == 3 && path[0] == "s1p" ? tree_.Find(*account, path[1]) : nullptr;
        if (file != nullptr && !file->folder) {
            return ContentReply(request, file->content, kBytes);
        }
    }
    return Reply(404);
}

OneDriveUpload::OneDriveUpload(OneDrive& drive, const Request& request, Account& account,
                               std::string id, std::string name)
    : drive_(drive),
      request_(request),
      account_(account),
      id_(std::move(id)),
      form_(request.method == "POST"),
      name_(std::move(name)),
      body_(
          request.Header("Content-Type"), [this](const Multipart::Part& part) { Begin(part); },
          [this](const Multipart::Part&, const char* data, size_t size) { Take(data, size); }),
      sink_(drive.NewSink()) {}

void OneDriveUpload::Data(const char* data, size_t size) {
    if (form_) {
        body_.Feed(data, size);
    } else {
        Take(data, size);
    }
}

void OneDriveUpload::Begin(const Multipart::Part& part) {
    parts_++;
    name_ = part.file_name;
}

void OneDriveUpload::Take(const char* data, size_t size) {
    head_.append(data, std::min(size, kHead - head_.size()));
    size_ += size;
    if (size_ <= drive_.drive_options_.put_limit) {
        failed_ = failed_ || !sink_->Write(data, size);
    }
}

Reply OneDriveUpload::Finish() {
    const std::lock_guard<std::mutex> lock(drive_.mutex_);
    if (size_ > drive_.drive_options_.put_limit || size_ > account_.MaxUpload()) {
        return onedrive::Error(413, "request_entity_too_large",
                               "The request entity body is too large.");
    }
    if (failed_) {
        return onedrive::Error(500, "server_internal_error", "The server had an unexpected error.");
    }
    try {
        CheckForm();
        DownsizePhoto();
        int status = 201;
        const Node& file = Store(status);
        Json::Value answer;
        answer["id"] = file.id;
        answer["name"] = file.name;
        answer["source"] = drive_.ContentUrl(file) + kEnd;
        return drive_.Answer(request_, status, answer)
            .With("Location", drive_.ApiHost() + "/v5.0/" + file.id + "/");
    } catch (const onedrive::Failure& failure) {
        return failure.reply;
    }
}

void OneDriveUpload::CheckForm() const {
    if (form_ && (!body_.Complete() || parts_ != 1 || name_.empty())) {
        throw onedrive::Failure{onedrive::Error(400, "request_body_invalid",
                                                "The form has to be one part with a file name.")};
    }
}

/**
 * Large photos are made smaller unless the request forbids it. Only PNG is known here, and of the
 * smaller picture no more is kept than the size that its header tells.
 */
void OneDriveUpload::DownsizePhoto() {
    const bool photo = onedrive::FileType(name_) == "photo";
    if (!photo || SameText(request_.Query("downsize_photo_uploads"), "false") ||
        !IsLargePng(head_)) {
        return;
    }
    const std::string smaller = Downsized(head_);
    sink_ = drive_.NewSink();
    failed_ = !sink_->Write(smaller.data(), smaller.size());
    size_ = smaller.size();
}

/** `overwrite` is true when nothing is said; the header of that name may say it, too. */
Node& OneDriveUpload::Store(int& status) {
    if (name_.empty()) {
        status = 200;
        return Replace(drive_.Find(account_, id_));
    }
    Node& parent = drive_.Folder(account_, id_);
    drive_.CheckName(name_);
    const std::string header = request_.Header("Overwrite");
    const std::string overwrite = request_.Query("overwrite", header.empty() ? "true" : header);
    Node* taken = drive_.tree_.Child(parent, name_);
    if (taken != nullptr && !taken->folder && SameText(overwrite, "true")) {
        status = 200;
        return Replace(*taken);
    }
    const std::string name =
        taken != nullptr && SameText(overwrite, "ChooseNewName") ? FreeName(parent) : name_;
    drive_.CheckFree(parent, name, nullptr);
    drive_.CheckSpace(account_, size_, 0);
    return drive_.tree_.AddFile(parent, name, sink_->Finish());
}

Node& OneDriveUpload::Replace(Node& file) {
    if (file.folder) {
        throw onedrive::Failure{
            onedrive::Error(400, "request_url_invalid", "A folder has no content.")};
    }
    drive_.CheckSpace(account_, size_, file.Size());
    drive_.tree_.SetContent(file, sink_->Finish());
    return file;
}

std::string OneDriveUpload::FreeName(const Node& parent) const {
    const size_t dot = std::min(name_.rfind('.'), name_.size());
    std::string name = name_;
    for (int i = 1; drive_.tree_.Child(parent, name) != nullptr; i++) {
        name = name_.substr(0, dot) + " " + std::to_string(i) + name_.substr(dot);
    }
    return name;
}

}  // namespace cloudsim
