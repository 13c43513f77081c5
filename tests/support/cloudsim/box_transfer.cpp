/** Preflight, upload and download. */
#include <json/value.h>

#include "support/cloudsim/box.h"
#include "support/cloudsim/box_json.h"
#include "support/cloudsim/box_upload.h"
#include "support/cloudsim/date.h"

namespace cloudsim {
namespace {

constexpr size_t kTickets = 10000;

uint64_t SizeOf(const Json::Value& body) {
    return body.isMember("size") && !body["size"].isNull() ? body["size"].asUInt64() : 0;
}

Json::Value UploadUrl(const std::string& url) {
    Json::Value answer;
    answer["upload_url"] = url + "?upload_session_id=" + RandomText(32);
    answer["upload_token"] = Json::nullValue;
    return answer;
}

/** What the uploader says of the file itself; -1 where nothing is said. */
struct Dates {
    int64_t created, modified;
};

int64_t ReadDate(const Json::Value& attributes, const char* name) {
    if (attributes[name].isNull()) {
        return -1;
    }
    const auto given = ParseDate(attributes[name].asString());
    return given ? given->seconds
                 : throw box::Failure{
                       box::Error(400, "bad_request", std::string("Bad Request: ") + name)};
}

Dates ReadDates(const Json::Value& attributes) {
    return {ReadDate(attributes, "content_created_at"),
            ReadDate(attributes, "content_modified_at")};
}

}  // namespace

Reply BoxService::Preflight(const BoxCall& call) {
    const std::string name = call.body["name"].asString();
    CheckName(name);
    Node& parent = ParentOf(call, call.body);
    CheckFree(parent, name, nullptr);
    CheckSize(call.account, SizeOf(call.body), 0);
    return JsonReply(200, UploadUrl(UploadHost() + "/api/2.0/files/content"));
}

Reply BoxService::PreflightVersion(const BoxCall& call) {
    Node& file = File(call);
    if (call.body.isMember("name")) {
        CheckName(call.body["name"].asString());
        CheckFree(*file.parent, call.body["name"].asString(), &file);
    }
    CheckSize(call.account, SizeOf(call.body), file.Size());
    return JsonReply(200, UploadUrl(UploadHost() + "/api/2.0/files/" + file.id + "/content"));
}

Reply BoxService::GetContent(const BoxCall& call) {
    const std::string ticket = RandomText(40);
    tickets_[ticket] = File(call).content;
    ticket_order_.push_back(ticket);
    if (ticket_order_.size() > kTickets) {
        tickets_.erase(ticket_order_.front());
        ticket_order_.pop_front();
    }
    return Reply(302).With("Location", DownloadHost() + "/d/1/" + ticket + "/download");
}

/** Whoever has the URL has the file; a token is neither needed nor looked at. */
Reply BoxService::Download(const Request& request) {
    const std::lock_guard<std::mutex> lock(mutex_);
    const auto ticket = tickets_.find(request.Segments()[2]);
    return ticket == tickets_.end()
               ? Reply(404)
               : ContentReply(request, ticket->second, "application/octet-stream");
}

BoxUpload::BoxUpload(BoxService& box, const Request& request, Account& account, std::string id)
    : box_(box),
      request_(request),
      account_(account),
      id_(std::move(id)),
      body_(
          request.Header("Content-Type"), [this](const Multipart::Part& part) { Begin(part); },
          [this](const Multipart::Part& part, const char* data, size_t size) {
              Take(part, data, size);
          }) {}

void BoxUpload::Begin(const Multipart::Part& part) {
    if (part.name == "attributes") {
        late_attributes_ = late_attributes_ || sink_ != nullptr;
        has_attributes_ = true;
    } else if (part.file && sink_ == nullptr) {
        sink_ = box_.NewSink();
    }
}

void BoxUpload::Take(const Multipart::Part& part, const char* data, size_t size) {
    if (part.name == "attributes") {
        attributes_.append(data, size);
    } else if (part.file) {
        failed_ = failed_ || !sink_->Write(data, size);
    }
}

void BoxUpload::CheckBody() const {
    if (late_attributes_) {
        throw box::Failure{
            box::Error(400, "metadata_after_file_contents",
                       "Metadata is included after file contents in a file upload request.")};
    }
    if (!body_.Complete() || sink_ == nullptr || (id_.empty() && !has_attributes_)) {
        throw box::Failure{box::Error(400, "bad_request", "Bad Request")};
    }
    if (failed_) {
        throw box::Failure{box::Error(500, "internal_server_error", "Internal Server Error")};
    }
}

Reply BoxUpload::Finish() {
    const std::lock_guard<std::mutex> lock(box_.mutex_);
    try {
        CheckBody();
        const BoxCall call = {request_, account_, id_, ParseObject(attributes_)};
        if (has_attributes_ && call.body.isNull()) {
            return box::Error(400, "bad_request", "Could not parse JSON");
        }
        Json::Value answer;
        answer["total_count"] = 1;
        answer["entries"].append(box_.Answer(call, Store(call)));
        return JsonReply(201, answer);
    } catch (const box::Failure& failure) {
        return failure.reply;
    } catch (const Json::Exception&) {
        return box::Error(400, "bad_request", "Bad Request");
    }
}

Node& BoxUpload::Store(const BoxCall& call) {
    ContentPtr content = sink_->Finish();
    const std::string sum = request_.Header("Content-MD5");
    if (!sum.empty() && !SameText(sum, content->Sha1())) {
        throw box::Failure{box::Error(400, "bad_digest",
                                      "The specified content-md5 did not match what we received")};
    }
    const Dates dates = ReadDates(call.body);
    Node& file =
        id_.empty() ? StoreNew(call, std::move(content)) : StoreVersion(call, std::move(content));
    file.content_created = dates.created < 0 ? file.content_created : dates.created;
    file.content_modified = dates.modified < 0 ? file.content_modified : dates.modified;
    return file;
}

Node& BoxUpload::StoreNew(const BoxCall& call, ContentPtr content) {
    const std::string name = call.body["name"].asString();
    Node& parent = box_.ParentOf(call, call.body);
    box_.CheckName(name);
    box_.CheckFree(parent, name, nullptr);
    box_.CheckSize(account_, content->Size(), 0);
    return box_.tree_.AddFile(parent, name, std::move(content));
}

Node& BoxUpload::StoreVersion(const BoxCall& call, ContentPtr content) {
    Node& file = box_.File(call);
    const std::string match = request_.Header("If-Match");
    if (!match.empty() && match != std::to_string(file.version)) {
        throw box::Failure{
            box::Error(412, "precondition_failed",
                       "The resource has been modified. Retrieve the resource again and retry")};
    }
    box_.CheckSize(account_, content->Size(), file.Size());
    if (call.body.isMember("name") && call.body["name"].asString() != file.name) {
        const std::string name = call.body["name"].asString();
        box_.CheckName(name);
        box_.CheckFree(*file.parent, name, &file);
        box_.tree_.Move(file, *file.parent, name);
    }
    box_.tree_.SetContent(file, std::move(content));
    return file;
}

}  // namespace cloudsim
