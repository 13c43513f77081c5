#include "support/cloudsim/gdrive_upload.h"

#include "support/cloudsim/route.h"

namespace cloudsim {
namespace {

/** Documented is multipart/related; forms are read as well, since only the order counts. */
std::string KindOf(const std::string& content_type) {
    const std::string form = "multipart/form-data";
    return SameText(content_type.substr(0, form.size()), form) ? form : "multipart/related";
}

}  // namespace

GDriveUpload::GDriveUpload(GDrive& drive, const Request& request, Account& account, std::string id)
    : drive_(drive),
      request_(request),
      account_(account),
      id_(std::move(id)),
      multipart_(request.Query("uploadType") == "multipart"),
      body_(
          request.Header("Content-Type"), [this](const Multipart::Part& part) { Begin(part); },
          [this](const Multipart::Part&, const char* data, size_t size) { Take(data, size); },
          KindOf(request.Header("Content-Type"))) {
    if (!multipart_) {
        parts_ = 2;
        type_ = request.Header("Content-Type");
        sink_ = drive.NewSink();
    }
}

void GDriveUpload::Data(const char* data, size_t size) {
    if (multipart_) {
        body_.Feed(data, size);
    } else {
        Take(data, size);
    }
}

void GDriveUpload::Begin(const Multipart::Part& part) {
    parts_++;
    if (parts_ == 2) {
        type_ = part.type;
        sink_ = drive_.NewSink();
    }
}

void GDriveUpload::Take(const char* data, size_t size) {
    if (parts_ == 1) {
        metadata_.append(data, size);
    } else if (parts_ == 2) {
        failed_ = failed_ || !sink_->Write(data, size);
    }
}

Reply GDriveUpload::Finish() {
    if (parts_ != 2 || (multipart_ && !body_.Complete())) {
        return gdrive::Error(400, "badContent", "Malformed multipart body.");
    }
    if (failed_) {
        return gdrive::Error(500, "internalError", "Internal Error");
    }
    return drive_.Call(request_, account_, id_, metadata_, [this](const GDriveCall& call) {
        return drive_.Store(call, sink_->Finish(), type_);
    });
}

Reply GDrive::Store(const GDriveCall& call, ContentPtr content, const std::string& type) {
    const gdrive::Changes changes = gdrive::ReadChanges(call.body);
    CheckTarget(call, changes);
    const Node* old = call.id.empty() ? nullptr : &Own(call);
    CheckSize(call.account, content->Size(), old == nullptr ? 0 : old->content->Size());
    if (old == nullptr) {
        return JsonReply(200, Show(call, Create(call, changes, std::move(content), type)));
    }
    Node& node = Own(call);
    tree_.SetContent(node, std::move(content));
    node.mime_type = changes.mime_type.value_or(type.empty() ? node.mime_type : type);
    Apply(call, node, changes);
    return JsonReply(200, Show(call, node));
}

Reply GDrive::OpenSession(const GDriveCall& call) {
    const Request& request = call.request;
    const std::string length = request.Header("X-Upload-Content-Length");
    const auto total = ParseNumber(length);
    if (!length.empty() && !total) {
        return gdrive::Error(400, "badRequest", "Bad Request");
    }
    CheckTarget(call, gdrive::ReadChanges(call.body));
    CheckSize(call.account, total.value_or(0),
              call.id.empty() || !total ? 0 : Own(call).content->Size());
    auto session = std::make_shared<Session>();
    session->account = &call.account;
    session->id = call.id;
    session->metadata = call.body;
    session->type = request.Header("X-Upload-Content-Type");
    session->total = total;
    session->sink = NewSink();
    session->expires = Now() + drive_options_.session_life;
    const std::string key = "AEnB2U-" + std::to_string(++last_key_) + "_" + RandomText(24);
    sessions_[key] = std::move(session);
    return Reply(200)
        .With("Location", ApiHost() + request.target + "&upload_id=" + key)
        .With("X-GUploader-UploadID", key);
}

}  // namespace cloudsim
