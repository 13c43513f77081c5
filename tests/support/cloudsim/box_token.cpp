/** The token endpoint, and the answer to those who come without a good token. */
#include <json/value.h>

#include "support/cloudsim/box.h"

namespace cloudsim {
namespace {

Reply TokenError(const char* error, const char* description) {
    Json::Value body;
    body["error"] = error;
    body["error_description"] = description;
    return JsonReply(400, body);
}

}  // namespace

Reply BoxService::Token(const std::string& text) {
    Request form;
    form.query = ParseForm(text);
    const bool by_code = form.Query("grant_type") == "authorization_code" && form.HasQuery("code");
    const bool by_token =
        form.Query("grant_type") == "refresh_token" && form.HasQuery("refresh_token");
    if (!by_code && !by_token) {
        return TokenError("invalid_request", "Invalid grant_type parameter or parameter missing");
    }
    if (!tokens_.IsClient(form.Query("client_id"), form.Query("client_secret"))) {
        return TokenError("invalid_client", "The client credentials are invalid");
    }
    Tokens tokens;
    const std::string client = form.Query("client_id");
    if (by_code && !TakeCode(form, client, tokens)) {
        return TokenError("invalid_grant", "The authorization code has expired");
    }
    if (by_token && !tokens_.Refresh(form.Query("refresh_token"), client, tokens)) {
        return TokenError("invalid_grant", "Invalid refresh token");
    }
    Json::Value body;
    body["access_token"] = tokens.access_token;
    body["expires_in"] = Json::Int64(tokens.expires_in);
    body["restricted_to"] = Json::arrayValue;
    body["refresh_token"] = tokens.refresh_token;
    body["token_type"] = "bearer";
    return JsonReply(200, body).With("Cache-Control", "no-store");
}

Reply BoxService::Refused(const Request& request) const {
    const std::string why = request.BearerToken().empty()
                                ? ""
                                : ", error=\"invalid_token\", error_description=\"The access token "
                                  "provided is invalid.\"";
    return Reply(401).With("WWW-Authenticate", "Bearer realm=\"Service\"" + why);
}

}  // namespace cloudsim
