/** The pieces of a resumable upload. */
#include <algorithm>

#include "support/cloudsim/gdrive_upload.h"
#include "support/cloudsim/route.h"

namespace cloudsim {
namespace {

/** What is kept of an upload that isn't complete is always a multiple of this. */
constexpr uint64_t kUnit = 256 * 1024;

Reply BadRange(const std::string& why) {
    return {400, "Invalid request.  " + why, "text/html; charset=UTF-8"};
}

Reply TooSmall(uint64_t size) {
    return BadRange(
        "The number of bytes uploaded is required to be equal or greater than 262144, except for "
        "the final request (it's recommended to be the exact multiple of 262144).  The received "
        "request contained " +
        std::to_string(size) + " bytes, which does not meet this requirement.");
}

}  // namespace

GDrive::SessionPtr GDrive::FindSession(const std::string& key) {
    const auto found = sessions_.find(key);
    if (found == sessions_.end()) {
        return nullptr;
    }
    if (Now() >= found->second->expires) {
        sessions_.erase(found);
        return nullptr;
    }
    return found->second;
}

GDriveResume::GDriveResume(GDrive& drive, const Request& request)
    : drive_(drive), request_(request), key_(request.Query("upload_id")) {
    const Guard lock(drive_.mutex_);
    session_ = drive_.FindSession(key_);
    if (session_ == nullptr) {
        Refuse(gdrive::Error(404, "notFound", "Not Found"));
        return;
    }
    // Of two requests the later one counts: a client that is back has given up the earlier.
    turn_ = ++session_->turn;
    if (session_->done) {
        Refuse(*session_->done);
    } else if (request.method == "DELETE") {
        drive_.sessions_.erase(key_);
        Refuse(Reply(499));
    } else if (request.method != "PUT" && request.method != "POST") {
        Refuse(Reply(405).With("Allow", "PUT"));
    } else {
        ReadRange(request.Header("Content-Range"));
        CheckPiece();
    }
}

void GDriveResume::Refuse(Reply reply) {
    if (!refused_) {
        refused_ = std::move(reply);
    }
}

/** "bytes 0-99/1000", "bytes 0-99/" and a star, or "bytes", a star, and the total or a star. */
void GDriveResume::ReadRange(const std::string& text) {
    if (text.empty()) {
        total_ = ParseNumber(request_.Header("Content-Length"));
        size_ = total_.value_or(UINT64_MAX);
        return;
    }
    const size_t slash = text.find('/'), dash = text.find('-');
    const std::string total = slash == std::string::npos ? "" : text.substr(slash + 1);
    total_ = ParseNumber(total);
    if (!BeginsWith(text, "bytes ") || (!total_ && total != "*")) {
        return Refuse(BadRange("Failed to parse Content-Range header."));
    }
    asks_ = text.substr(6, slash - 6) == "*";
    if (asks_) {
        return;
    }
    const auto first = dash < slash ? ParseNumber(text.substr(6, dash - 6)) : std::nullopt;
    const auto last = first ? ParseNumber(text.substr(dash + 1, slash - dash - 1)) : std::nullopt;
    if (!last || *last < *first || (total_ && *last >= *total_)) {
        return Refuse(BadRange("Failed to parse Content-Range header."));
    }
    ranged_ = true;
    first_ = *first;
    size_ = *last - *first + 1;
}

bool GDriveResume::IsLast() const {
    const std::optional<uint64_t> total = session_->total ? session_->total : total_;
    return total && first_ + size_ == *total;
}

void GDriveResume::CheckPiece() {
    if (refused_) {
        return;
    }
    const auto length = ParseNumber(request_.Header("Content-Length"));
    if (total_ && session_->total && *total_ != *session_->total) {
        Refuse(BadRange("The total size differs from the one that was announced."));
    } else if (!asks_ && first_ > session_->received) {
        Refuse(gdrive::Error(503, "backendError", "Backend Error"));
    } else if (ranged_ && length && *length != size_) {
        Refuse(BadRange("The body is not as long as the Content-Range header tells."));
    } else if (ranged_ && !IsLast() && size_ < kUnit) {
        Refuse(TooSmall(size_));
    }
    if (!refused_ && total_) {
        session_->total = total_;
    }
}

void GDriveResume::Data(const char* data, size_t size) {
    const Guard lock(drive_.mutex_);
    if (refused_ || asks_ || session_->turn != turn_) {
        came_ += size;
        return;
    }
    // What has arrived before is let go by.
    const uint64_t place = first_ + came_, known = session_->received + tail_.size();
    const uint64_t skip = std::min<uint64_t>(size, known > place ? known - place : 0);
    uint64_t take = std::min<uint64_t>(size, came_ < size_ ? size_ - came_ : 0);
    take = take > skip ? take - skip : 0;
    came_ += size;
    tail_.append(data + skip, take);
    Keep(false);
}

/** Hands on whole units, or everything. */
void GDriveResume::Keep(bool all) {
    const uint64_t end = session_->received + tail_.size();
    const uint64_t whole = all ? end : end / kUnit * kUnit;
    const size_t ready = whole > session_->received ? whole - session_->received : 0;
    if (ready > 0 && session_->sink->Write(tail_.data(), ready)) {
        session_->received += ready;
        tail_.erase(0, ready);
    }
}

Reply GDriveResume::Finish() {
    const Guard lock(drive_.mutex_);
    if (refused_) {
        return *refused_;
    }
    if (session_->turn != turn_) {
        return gdrive::Error(503, "backendError", "Backend Error");
    }
    return Answer();
}

Reply GDriveResume::Answer() {
    if (asks_ && came_ != 0) {
        return BadRange("A status request has no body.");
    }
    if (!ranged_ && !asks_ && !total_) {
        size_ = came_;  // it came without a length
        session_->total = session_->total.value_or(came_);
    }
    if (!asks_ && came_ > size_) {
        return BadRange("The body is longer than the Content-Range header tells.");
    }
    // Of a body that didn't arrive in full, as of a broken one, whole units are kept.
    if (!asks_ && came_ == size_ && IsLast()) {
        Keep(true);
    }
    const bool all = session_->total && session_->received == *session_->total;
    return all && (!asks_ || total_) ? Complete() : Incomplete();
}

Reply GDriveResume::Incomplete() const {
    Reply reply(308);
    if (session_->received > 0) {
        reply.With("Range", "bytes=0-" + std::to_string(session_->received - 1));
    }
    return reply.With("X-GUploader-UploadID", key_);
}

/** Whoever asks again gets the same answer. */
Reply GDriveResume::Complete() {
    const GDriveCall call = {request_, *session_->account, session_->id, session_->metadata};
    try {
        Reply reply = drive_.Store(call, session_->sink->Finish(), session_->type);
        reply.status = session_->id.empty() ? 201 : 200;
        session_->done = reply;
        return reply;
    } catch (const gdrive::Failure& failure) {
        drive_.sessions_.erase(key_);
        return failure.reply;
    }
}

}  // namespace cloudsim
