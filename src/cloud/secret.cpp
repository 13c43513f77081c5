#include "cloud/secret.h"

#include <cstring>

#include "cloud/service_config.h"
#include "core/log.h"
#include "zyrovfs/cloud_utils.h"

namespace ZYROCloud {
namespace {

constexpr int kSecretSize = 1024;

}  // namespace

bool FindSecret(const std::string& service, const std::string& client_id, std::string& secret,
                ZYROVFS::SourceLine at) {
    std::string enciphered;
    if (!FindClientSecret(service, client_id, enciphered)) {
        LOG_ERROR_AT(at, "Failed to find the secret by %s", client_id.c_str());
        return false;
    }
    char plain[kSecretSize];
    const bool ok = Utils::Decrypt(enciphered.data(), plain, sizeof plain) == 1;
    if (ok) {
        secret = plain;
    } else {
        LOG_ERROR_AT(at, "Failed to decrypt secret key");
    }
    explicit_bzero(plain, sizeof plain);
    return ok;
}

bool AddRefreshGrant(APIHandler& api, const std::string& service, const std::string& client_id,
                     const std::string& refresh_token, ZYROVFS::SourceLine at) {
    std::string secret;
    if (!FindSecret(service, client_id, secret, at)) {
        return false;
    }
    Json::Value form;
    form["client_id"] = client_id;
    form["client_secret"] = secret;
    form["refresh_token"] = refresh_token;
    form["grant_type"] = "refresh_token";
    return api.AddPostParam(form);
}

}  // namespace ZYROCloud
