/** Upload sessions, one by one and in batches. */
#include "support/cloudsim/dropbox_session.h"

#include "support/cloudsim/dropbox.h"

namespace cloudsim {
namespace {

dropbox::Failure WrongOffset(uint64_t right) {
    Json::Value error = dropbox::Tagged({"incorrect_offset"});
    error["correct_offset"] = Json::UInt64(right);
    return {dropbox::Error(error), error};
}

/** An error of the session, as the functions that finish it tell it. */
dropbox::Failure LookupFailed(const Json::Value& error) {
    Json::Value outer = dropbox::Tagged({"lookup_failed"});
    outer["lookup_failed"] = error;
    return {dropbox::Error(outer), outer};
}

}  // namespace

std::string Dropbox::OpenSession(const Account& account, ContentPtr first, bool closed) {
    const std::string id = "pid_upload_session:" + RandomText(40);
    dropbox::Session& session = sessions_[id];
    session.account = &account;
    session.Add(std::move(first));
    session.closed = closed;
    session.expires = Now() + dropbox_options_.session_life;
    return id;
}

dropbox::Session& Dropbox::SessionAt(const DropboxCall& call, const dropbox::Arguments& cursor) {
    const auto found = sessions_.find(cursor.Text("session_id"));
    const uint64_t offset = cursor.Number("offset");
    if (found == sessions_.end() || found->second.account != &call.account ||
        found->second.expires <= Now()) {
        throw dropbox::Fail({"not_found"});
    }
    if (found->second.closed) {
        throw dropbox::Fail({"closed"});
    }
    if (offset != found->second.size) {
        throw WrongOffset(found->second.size);
    }
    return found->second;
}

/** The bytes that come with the end belong to the file only when its place takes it. */
Json::Value Dropbox::Finish(const DropboxCall& call, const dropbox::Arguments& args,
                            ContentPtr last, bool batch) {
    const dropbox::Arguments cursor = args.Object("cursor"), commit = args.Object("commit");
    const std::string id = cursor.Text("session_id");
    const uint64_t offset = cursor.Number("offset");
    const auto found = sessions_.find(id);
    if (found == sessions_.end() || found->second.account != &call.account ||
        found->second.expires <= Now()) {
        throw LookupFailed(dropbox::Tagged({"not_found"}));
    }
    dropbox::Session whole = found->second;
    if (offset != whole.size) {
        throw LookupFailed(WrongOffset(whole.size).error);
    }
    if (batch && !whole.closed) {
        throw LookupFailed(dropbox::Tagged({"not_closed"}));
    }
    if (whole.closed && last->Size() > 0) {
        throw LookupFailed(dropbox::Tagged({"closed"}));
    }
    whole.Add(std::move(last));
    if (whole.size > call.account.MaxUpload()) {
        throw LookupFailed(dropbox::Tagged({"too_large"}));
    }
    Node& file = Commit(call, commit, MakeJoined(std::move(whole.pieces)));
    sessions_.erase(id);
    return Show(file, false);
}

Reply Dropbox::StartBatch(const DropboxCall& call) {
    const uint64_t count = call.args.Number("num_sessions");
    if (count < 1 || count > 1000) {
        call.args.Refuse("num_sessions: not within 1 and 1000");
    }
    Json::Value answer;
    for (uint64_t i = 0; i < count; i++) {
        answer["session_ids"].append(OpenSession(call.account, MakeBytes(""), false));
    }
    return JsonReply(200, answer);
}

Json::Value Dropbox::FinishEntries(const DropboxCall& call) {
    Json::Value entries = Json::arrayValue;
    for (const dropbox::Arguments& entry : call.args.List("entries")) {
        Json::Value result;
        try {
            result = Finish(call, entry, MakeBytes(""), true);
            result[".tag"] = "success";
        } catch (const dropbox::Failure& failure) {
            if (failure.error.isNull()) {
                throw;
            }
            result = dropbox::Tagged({"failure"});
            result["failure"] = failure.error;
        }
        entries.append(result);
    }
    return entries;
}

/** The older of the two works in the background, and may be done at once. */
Reply Dropbox::FinishBatch(const DropboxCall& call) {
    Json::Value answer = dropbox::Tagged({"complete"});
    answer["entries"] = FinishEntries(call);
    return JsonReply(200, answer);
}

Reply Dropbox::FinishBatch2(const DropboxCall& call) {
    Json::Value answer;
    answer["entries"] = FinishEntries(call);
    return JsonReply(200, answer);
}

/** No batch is ever left for later. */
Reply Dropbox::CheckBatch(const DropboxCall& call) {
    call.args.Text("async_job_id");
    throw dropbox::Fail({"invalid_async_job_id"});
}

}  // namespace cloudsim
