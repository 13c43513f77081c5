/** The token endpoint. */
#include <json/value.h>

#include "support/cloudsim/gdrive.h"

namespace cloudsim {
namespace {

Reply TokenError(int status, const char* error, const std::string& description) {
    Json::Value body;
    body["error"] = error;
    body["error_description"] = description;
    return JsonReply(status, body);
}

}  // namespace

Reply GDrive::Token(const std::string& text) {
    Request form;
    form.query = ParseForm(text);
    if (!form.HasQuery("grant_type")) {
        return TokenError(400, "invalid_request", "Required parameter is missing: grant_type");
    }
    const std::string grant = form.Query("grant_type");
    const std::string needed = grant == "authorization_code" ? "code" : "refresh_token";
    if (grant != "refresh_token" && grant != "authorization_code") {
        return TokenError(400, "unsupported_grant_type", "Invalid grant_type");
    }
    if (!form.HasQuery(needed)) {
        return TokenError(400, "invalid_request", "Missing required parameter: " + needed);
    }
    if (!tokens_.IsClient(form.Query("client_id"), form.Query("client_secret"))) {
        return TokenError(401, "invalid_client", "The OAuth client was not found.");
    }
    Tokens tokens;
    const std::string old = form.Query("refresh_token");
    const std::string client = form.Query("client_id");
    if (grant == "authorization_code" ? !TakeCode(form, client, tokens)
                                      : !tokens_.Refresh(old, client, tokens)) {
        return TokenError(400, "invalid_grant", "Token has been expired or revoked.");
    }
    Json::Value body;
    body["access_token"] = tokens.access_token;
    body["expires_in"] = Json::Int64(tokens.expires_in);
    body["token_type"] = "Bearer";
    // A refresh token that stays good isn't told again.
    if (tokens.refresh_token != old) {
        body["refresh_token"] = tokens.refresh_token;
    }
    return JsonReply(200, body).With("Cache-Control", "no-store");
}

}  // namespace cloudsim
