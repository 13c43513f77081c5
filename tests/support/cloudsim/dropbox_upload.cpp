#include "support/cloudsim/dropbox_upload.h"

namespace cloudsim {

const DropboxUpload::Kind DropboxUpload::kKinds[] = {
    {"files/upload", &DropboxUpload::CheckNothing, &DropboxUpload::Store},
    {"files/upload_session/start", &DropboxUpload::CheckNothing, &DropboxUpload::Start},
    {"files/upload_session/append", &DropboxUpload::CheckOldCursor, &DropboxUpload::AppendOld},
    {"files/upload_session/append_v2", &DropboxUpload::CheckCursor, &DropboxUpload::Append},
    {"files/upload_session/finish", &DropboxUpload::CheckFinish, &DropboxUpload::FinishSession},
};

const DropboxUpload::Kind* DropboxUpload::Find(const std::string& name) {
    for (const Kind& kind : kKinds) {
        if (name == kind.name) {
            return &kind;
        }
    }
    return nullptr;
}

DropboxUpload::DropboxUpload(Dropbox& dropbox, const Request& request, Account& account,
                             const Kind& kind)
    : dropbox_(dropbox), request_(request), account_(account), kind_(kind) {
    const std::lock_guard<std::mutex> lock(dropbox_.mutex_);
    try {
        dropbox::CheckType(request_, kind_.name, false, {"application/octet-stream", "text/plain"});
        const DropboxCall call = {request_, account_, dropbox::ReadHeader(request_, kind_.name)};
        CheckSize(ParseNumber(request_.Header("Content-Length")).value_or(0));
        (this->*kind_.check)(call);
        sink_ = dropbox_.NewSink();
    } catch (const dropbox::Failure& failure) {
        refused_ = failure.reply;
    }
}

void DropboxUpload::CheckSize(uint64_t size) const {
    if (size > dropbox_.dropbox_options_.max_request) {
        throw dropbox::Fail({"payload_too_large"});
    }
}

void DropboxUpload::Data(const char* data, size_t size) {
    came_ += size;
    if (!refused_) {
        failed_ = !sink_->Write(data, size) || failed_;
    }
}

Reply DropboxUpload::Finish() {
    if (refused_) {
        return *refused_;
    }
    if (failed_) {
        return {500, "Internal Server Error", "text/plain"};
    }
    return dropbox_.Answer([&] {
        CheckSize(came_);
        const DropboxCall call = {request_, account_, dropbox::ReadHeader(request_, kind_.name)};
        const auto store = kind_.store;
        return (this->*store)(call);
    });
}

void DropboxUpload::CheckCursor(const DropboxCall& call) const {
    dropbox_.SessionAt(call, call.args.Object("cursor"));
}

void DropboxUpload::CheckOldCursor(const DropboxCall& call) const {
    dropbox_.SessionAt(call, call.args);
}

/** A session that is complete may be finished, but takes no more bytes. */
void DropboxUpload::CheckFinish(const DropboxCall& call) const {
    call.args.Object("cursor").Text("session_id");
    call.args.Object("commit").Text("path");
}

/** What goes wrong with the place tells a session in which the bytes are kept. */
Reply DropboxUpload::Store(const DropboxCall& call) {
    ContentPtr content = sink_->Finish();
    try {
        return JsonReply(200, dropbox_.Show(dropbox_.Commit(call, call.args, content), false));
    } catch (const dropbox::Failure& failure) {
        if (failure.error[".tag"] != "path") {
            throw;
        }
        Json::Value error = failure.error;
        error["reason"] = failure.error["path"];
        error.removeMember("path");
        error["upload_session_id"] = dropbox_.OpenSession(account_, std::move(content), true);
        return dropbox::Error(error);
    }
}

Reply DropboxUpload::Start(const DropboxCall& call) {
    Json::Value answer;
    const std::string type = call.args.Tag("session_type", "sequential");
    if (type != "sequential") {
        call.args.Refuse("session_type: unknown tag '" + type + "'");
    }
    answer["session_id"] = dropbox_.OpenSession(account_, sink_->Finish(), call.args.Flag("close"));
    return JsonReply(200, answer);
}

Reply DropboxUpload::AppendAt(const DropboxCall& call, const dropbox::Arguments& cursor) {
    dropbox::Session& session = dropbox_.SessionAt(call, cursor);
    session.Add(sink_->Finish());
    session.closed = call.args.Flag("close");
    return JsonReply(200, Json::nullValue);
}

Reply DropboxUpload::Append(const DropboxCall& call) {
    return AppendAt(call, call.args.Object("cursor"));
}

Reply DropboxUpload::AppendOld(const DropboxCall& call) {
    return AppendAt(call, call.args);
}

Reply DropboxUpload::FinishSession(const DropboxCall& call) {
    return JsonReply(200, dropbox_.Finish(call, call.args, sink_->Finish(), false));
}

}  // namespace cloudsim
