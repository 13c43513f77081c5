#include <algorithm>
#include <cerrno>
#include <cstdlib>
#include <ctime>
#include <iterator>
#include <limits>
#include <memory>
#include <mutex>
#include <vector>

#include "cloud/guard.h"
#include "cloud/handler.h"
#include "cloud/public_cloud.h"
#include "cloud/without_tokens.h"
#include "core/handle.h"
#include "core/json.h"
#include "zyrovfs/utils.h"

namespace ZYROCloud {

using namespace ZYROVFS;

namespace {

/** Seconds past its end during which a token counts as valid: the clocks of the box and of the
 * service differ, and a request with a token that has just ended is renewed on its refusal. */
constexpr long long kGrace = 60;
constexpr int kPasses = 6;
constexpr int kRetriesPerPass = 6;
constexpr unsigned int kLongestSleep = 30;  // seconds between two requests for a token
constexpr size_t kCredentialBuffer = 4097;

/** Failures that no further request for a token would cure. */
constexpr __tag_vfs_err_ kHopeless[] = {
    VFS_ERR_UNAUTHORIZED, VFS_ERR_CONNECT_FAILED, VFS_ERR_TRANSFER_ABORTED,
    VFS_ERR_CANCELLED,    VFS_ERR_TIMEOUT,        VFS_ERR_TOKEN_REVOKED,
};

bool IsHopeless(__tag_vfs_err_ code) {
    return std::find(std::begin(kHopeless), std::end(kHopeless), code) != std::end(kHopeless);
}

/**
 * Holds the renewal for this thread and this process. The mount lock counts the levels of a
 * process and lets all its threads in, so a mutex stands before it; it is recursive, as the lock.
 */
class Renewal {
  public:
    Renewal() : turn_(Mutex()), locked_(ZYROVFS::Utils::LockMnt(true)) {
        if (!locked_) {
            LOG_ERROR("Failed to lock");
        }
    }
    Renewal(const Renewal&) = delete;
    Renewal& operator=(const Renewal&) = delete;
    ~Renewal() {
        // A lock that was refused may be somebody else's level of this process.
        if (locked_) {
            ZYROVFS::Utils::UnLockMnt();
        }
    }

  private:
    static std::recursive_mutex& Mutex() {
        static std::recursive_mutex mutex;
        return mutex;
    }

    std::lock_guard<std::recursive_mutex> turn_;
    bool locked_;
};

std::string Loggable(Json::Value error) {
    if (error.isObject() && error["msg"].isString()) {
        error["msg"] = WithoutTokens(error["msg"].asString());
    }
    return json::toString(error);
}

/** Member "expires_in" in seconds; services give a number or its text. Json::Exception for others.
 */
int64_t LifeOf(const Json::Value& answer) {
    const Json::Value life = answer.get("expires_in", 0);
    int64_t seconds = 0;
    if (!life.isString()) {
        return life.asInt64();
    }
    if (!json::toInt64(life, seconds)) {
        Json::throwLogicError("expires_in is no number");
    }
    return seconds;
}

std::string ExpiryOf(int64_t life) {
    const time_t now = time(nullptr);
    int64_t expiry = life;
    if (now != -1 && __builtin_add_overflow(life, static_cast<int64_t>(now), &expiry)) {
        expiry = std::numeric_limits<int64_t>::max();
    }
    return std::to_string(expiry);
}

long long Seconds(const std::string& expire_time) {
    return strtoll(expire_time.c_str(), nullptr, 10);
}

/** Credential of a stored profile in plain text; false when this machine cannot read it. */
bool Decipher(const Json::Value& profile, const char* key, std::string& out) {
    if (!profile.isMember(key)) {
        return true;
    }
    char plain[kCredentialBuffer] = "";
    const bool ok = profile[key].isString() &&
                    Server::SzDecrypt(profile[key].asCString(), plain, sizeof plain) != 0;
    if (ok) {
        out = plain;
    }
    explicit_bzero(plain, sizeof plain);
    return ok;
}

/** The token of a stored profile. False for one without, and for one that cannot be read. */
bool ReadToken(const Json::Value& profile, TokenInfo& token) {
    if (!profile.isObject() || !profile["expire_time"].isString()) {
        return false;
    }
    token.expire_time = profile["expire_time"].asString();
    return Decipher(profile, "access_token", token.access_token) &&
           Decipher(profile, "refresh_token", token.refresh_token);
}

}  // namespace

int PublicCloud::IsAccessTokenValid() {
    if (token_.expire_time.empty()) {
        return 1;
    }
    const time_t now = time(nullptr);
    if (now == -1) {
        LOG_ERROR("Failed to call time function, errno=%d, %m", errno);
        return -1;
    }
    return Seconds(token_.expire_time) >= now - kGrace ? 1 : 0;
}

bool PublicCloud::RefreshToken(bool force) {
    return Guard(*this, [&] {
        int valid = force ? 0 : IsAccessTokenValid();
        if (valid != 0) {
            return valid == 1;
        }
        const Renewal renewal;
        TakeTokenOfOthers();
        if (!force && (valid = IsAccessTokenValid()) != 0) {
            return valid == 1;
        }
        return AskForToken();
    });
}

/**
 * A refresh token is good for one renewal. Whoever waited for the lock has to know what the process
 * before him got, or he would spend a token that is spent; memory alone does not tell.
 */
void PublicCloud::TakeTokenOfOthers() {
    struct Stored {
        Json::Value profile;
        TokenInfo token;
    };
    std::vector<Stored> found;
    bool ours_is_stored = false;
    for (const Server::VFS_CONFIG_MODE mode :
         {Server::VFS_CONFIG_CONNECT, Server::VFS_CONFIG_SERVER}) {
        Stored stored{Json::Value(), token_};
        if (Server::CfgGetByID(uid, mode, server_id.c_str(), stored.profile) &&
            ReadToken(stored.profile, stored.token)) {
            ours_is_stored |= stored.token.access_token == token_.access_token;
            found.push_back(stored);
        }
    }
    for (const Stored& stored : found) {
        if (!IsNewer(stored.token, ours_is_stored)) {
            continue;
        }
        token_ = stored.token;
        ours_is_stored = true;
        // A new grant may have come with another client of the service.
        if (stored.profile["client_id"].isString()) {
            client_id_ = stored.profile["client_id"].asString();
        }
    }
}

/**
 * What ends later is newer. What ends earlier may be, too, since a service gives what life it
 * likes: it is when all profiles have lost the token that this driver got from them. A file that
 * could not be rewritten keeps a token that this driver has spent.
 */
bool PublicCloud::IsNewer(const TokenInfo& stored, bool ours_is_stored) const {
    if (std::find(replaced_.begin(), replaced_.end(), stored.access_token) != replaced_.end()) {
        return false;
    }
    return Seconds(stored.expire_time) > Seconds(token_.expire_time) ||
           (!ours_is_stored && !token_is_given_);
}

bool PublicCloud::AskForToken() {
    const std::unique_ptr<APIHandler> handler(NewHandler());
    if (handler == nullptr) {
        SetError(VFS_ERR_CLOUD_FAILED, "");
        return false;
    }
    // The mount lock is held: nobody of this user connects meanwhile.
    handler->SetLongestSleep(kLongestSleep);
    // The body of a refusal tells a grant that is spent from a request that was malformed.
    handler->SetReturnOnError(false);
    Json::Value header;
    header["Authorization"] = Bearer();
    if (!SetAPIErrorHandler(handler.get()) || !handler->Init() || !handler->AddHeader(header) ||
        !SetRefreshTokenParam(handler.get())) {
        return false;
    }
    for (int pass = 0; pass < kPasses; ++pass) {
        if (handler->Process(kRetriesPerPass)) {
            return TakeToken(handler->GetResponse());
        }
        SetError(handler->GetError());
        LOG_ERROR("Failed to process curl, err:%s", Loggable(error).c_str());
        if (IsHopeless(GetErrorCode())) {
            break;
        }
    }
    LOG_ERROR("Failed to refresh token, err=%d", GetErrorCode());
    return false;
}

/** Nothing changes unless every member of the answer can be read. */
bool PublicCloud::TakeToken(const std::string& text) {
    Json::Value answer, fields;
    if (!json::fromString(answer, text)) {
        LOG_ERROR("Failed to parse response to json format, %s", WithoutTokens(text).c_str());
        return false;
    }
    TokenInfo fresh = token_;
    fresh.access_token = answer.get("access_token", "").asString();
    fresh.expire_time = ExpiryOf(LifeOf(answer));
    fields["access_token"] = fresh.access_token;
    fields["expire_time"] = fresh.expire_time;
    // Null and "" are no new token: the old one stays good.
    const std::string refresh_token = answer.get("refresh_token", "").asString();
    if (!refresh_token.empty()) {
        fresh.refresh_token = refresh_token;
        fields["refresh_token"] = refresh_token;
    }
    replaced_.push_back(token_.access_token);
    token_ = fresh;
    // This driver goes on with the new token, whether or not the profiles can be rewritten.
    UpdateProfileConfig(Server::VFS_CONFIG_CONNECT, fields);
    UpdateProfileConfig(Server::VFS_CONFIG_SERVER, fields);
    return true;
}

}  // namespace ZYROCloud
