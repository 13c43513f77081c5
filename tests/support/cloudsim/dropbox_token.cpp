/** The token endpoint, and the answer to those who come without a good token. */
#include <json/value.h>
#include <openssl/evp.h>

#include "support/cloudsim/dropbox.h"
#include "support/cloudsim/route.h"

namespace cloudsim {
namespace {

Reply TokenError(int status, const char* error, const char* description) {
    Json::Value body;
    body["error"] = error;
    body["error_description"] = description;
    return JsonReply(status, body);
}

Reply TokenAnswer(const Tokens& tokens, bool with_refresh_token = false) {
    Json::Value body;
    body["access_token"] = tokens.access_token;
    body["token_type"] = "bearer";
    body["expires_in"] = Json::Int64(tokens.expires_in);
    if (with_refresh_token) {
        body["refresh_token"] = tokens.refresh_token;
    }
    return JsonReply(200, body).With("Cache-Control", "no-store");
}

struct Credentials {
    std::string id, secret;
};

/** Of a Basic Authorization header; empty when it isn't one. */
Credentials BasicCredentials(const std::string& header) {
    if (!SameText(header.substr(0, 6), "Basic ")) {
        return {};
    }
    std::string text(header.size(), '\0');
    const int size = EVP_DecodeBlock(reinterpret_cast<unsigned char*>(text.data()),
                                     reinterpret_cast<const unsigned char*>(header.data()) + 6,
                                     static_cast<int>(header.size() - 6));
    text.resize(size < 0 ? 0 : static_cast<size_t>(size));
    // Padding is decoded as zeros.
    text.resize(text.find_last_not_of('\0') + 1);
    const size_t colon = text.find(':');
    return colon == std::string::npos ? Credentials()
                                      : Credentials{PercentDecode(text.substr(0, colon), true),
                                                    PercentDecode(text.substr(colon + 1), true)};
}

}  // namespace

Reply Dropbox::Token(const Request& request, const std::string& text) {
    Request form;
    form.query = ParseForm(text);
    const Credentials client =
        form.HasQuery("client_id")
            ? Credentials{form.Query("client_id"), form.Query("client_secret")}
            : BasicCredentials(request.Header("Authorization"));
    if (!tokens_.IsClient(client.id, client.secret)) {
        return TokenError(401, "invalid_client", "Invalid client_id or client_secret");
    }
    Tokens tokens;
    if (form.Query("grant_type") == "authorization_code") {
        // A refresh token comes only to those who asked for one on the page.
        return TakeCode(form, client.id, tokens)
                   ? TokenAnswer(tokens)
                   : TokenError(400, "invalid_grant", "code doesn't exist or has expired");
    }
    if (form.Query("grant_type") != "refresh_token") {
        return TokenError(400, "unsupported_grant_type", "grant_type is not supported");
    }
    if (!form.HasQuery("refresh_token")) {
        return TokenError(400, "invalid_request", "missing required field \"refresh_token\"");
    }
    const std::string old = form.Query("refresh_token");
    if (!tokens_.Refresh(old, client.id, tokens)) {
        return TokenError(400, "invalid_grant", "refresh token is invalid or revoked");
    }
    // One that stays good isn't told again.
    return TokenAnswer(tokens, tokens.refresh_token != old);
}

Account* Dropbox::Authorize(Request& request) {
    Account* account = tokens_.Owner(request.BearerToken());
    request.account = account == nullptr ? "" : account->Email();
    return account;
}

Reply Dropbox::Refused(const Request& request, const std::string& function) const {
    const std::string header = request.Header("Authorization"), token = request.BearerToken();
    if (header.empty()) {
        return dropbox::BadInput(function,
                                 "Must provide HTTP header \"Authorization\" or URL parameter "
                                 "\"authorization\".");
    }
    if (token.empty()) {
        return dropbox::BadInput(
            function,
            "Invalid authorization value in HTTP header \"Authorization\": \"" + header + "\".");
    }
    const char* why = tokens_.IsExpired(token) ? "expired_access_token" : "invalid_access_token";
    return dropbox::ErrorWithStatus(401, dropbox::Tagged({why}));
}

}  // namespace cloudsim
