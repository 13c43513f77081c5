/** Live login's token endpoint, and the answer to those who come without a good token. */
#include <json/value.h>

#include "support/cloudsim/onedrive.h"
#include "support/cloudsim/onedrive_json.h"

namespace cloudsim {
namespace {

Reply TokenError(const char* error, const std::string& description) {
    Json::Value body;
    body["error"] = error;
    body["error_description"] = description;
    return JsonReply(400, body);
}

}  // namespace

Reply OneDrive::Token(const std::string& text) {
    Request form;
    form.query = ParseForm(text);
    const std::string client = form.Query("client_id");
    if (!form.HasQuery("grant_type")) {
        return TokenError("invalid_request",
                          "The request must include the input parameter 'grant_type'.");
    }
    const std::string grant = form.Query("grant_type");
    const std::string needed = grant == "authorization_code" ? "code" : "refresh_token";
    if (grant != "refresh_token" && grant != "authorization_code") {
        return TokenError("unsupported_grant_type",
                          "The provided value for the input parameter 'grant_type' is not valid.");
    }
    if (!form.HasQuery(needed)) {
        return TokenError("invalid_request",
                          "The request must include the input parameter '" + needed + "'.");
    }
    // A client that was given no secret sends none.
    if (!tokens_.IsClient(client, form.Query("client_secret"))) {
        return TokenError("invalid_client",
                          "The client does not exist, or its secret is not the right one.");
    }
    Tokens tokens;
    if (grant == "authorization_code" ? !TakeCode(form, client, tokens)
                                      : !tokens_.Refresh(form.Query(needed), client, tokens)) {
        return TokenError("invalid_grant", "The provided value for the input parameter '" + needed +
                                               "' is not valid.");
    }
    Json::Value body;
    body["token_type"] = "bearer";
    body["expires_in"] = Json::Int64(tokens.expires_in);
    body["scope"] = "wl.basic wl.emails wl.offline_access wl.skydrive_update";
    body["access_token"] = tokens.access_token;
    body["refresh_token"] = tokens.refresh_token;
    body["user_id"] = tokens_.Owner(tokens.access_token)->Id();
    return JsonReply(200, body).With("Cache-Control", "no-store");
}

Reply OneDrive::Refused(const Request& request) const {
    const bool given = !request.BearerToken().empty() || request.HasQuery("access_token");
    return given ? onedrive::Error(401, "request_token_expired",
                                   "The provided access token has expired.")
                 : onedrive::Error(401, "request_token_missing",
                                   "The request does not include an access token.");
}

}  // namespace cloudsim
