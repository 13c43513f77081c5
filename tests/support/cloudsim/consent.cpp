#include "support/cloudsim/consent.h"

#include <algorithm>

#include "support/cloudsim/route.h"

namespace cloudsim {
namespace {

std::string Escaped(const std::string& text) {
    std::string out;
    for (const char c : text) {
        switch (c) {
            case '&':
                out += "&amp;";
                break;
            case '<':
                out += "&lt;";
                break;
            case '"':
                out += "&quot;";
                break;
            default:
                out += c;
        }
    }
    return out;
}

std::string PercentEncode(const std::string& text) {
    static constexpr char kHex[] = "0123456789ABCDEF";
    std::string out;
    for (const char c : text) {
        const auto byte = static_cast<unsigned char>(c);
        if (isalnum(byte) != 0 || std::string("-._~").find(c) != std::string::npos) {
            out += c;
        } else {
            out += {'%', kHex[byte >> 4], kHex[byte & 15]};
        }
    }
    return out;
}

bool IsLoopback(const std::string& address) {
    return BeginsWith(address, "http://localhost") || BeginsWith(address, "http://127.0.0.1") ||
           BeginsWith(address, "http://[::1]");
}

}  // namespace

ConsentRequest::ConsentRequest(const Request& request)
    : client(request.Query("client_id")),
      redirect_uri(request.Query("redirect_uri")),
      state(request.Query("state")),
      response_type(request.Query("response_type")),
      challenge(request.Query("code_challenge")),
      method(request.Query("code_challenge_method")),
      scope(request.Query("scope")) {}

std::string ConsentRequest::Problem(const TokenStore& tokens) const {
    return !tokens.IsClientId(client)                     ? "unknown client_id"
           : !IsLoopback(redirect_uri)                    ? "redirect_uri is not registered"
           : response_type != "code"                      ? "unsupported response_type"
           : !challenge.empty() && method != "S256"       ? "unsupported code_challenge_method"
           : !challenge.empty() && challenge.size() != 43 ? "wrong code_challenge"
                                                          : "";
}

std::string ConsentRequest::Back(const Headers& parameters) const {
    std::string address = redirect_uri;
    char separator = redirect_uri.find('?') == std::string::npos ? '?' : '&';
    Headers all = parameters;
    if (!state.empty()) {
        all.emplace_back("state", state);
    }
    for (const auto& [name, value] : all) {
        address += separator + name + "=" + PercentEncode(value);
        separator = '&';
    }
    return address;
}

Reply ConsentPage(const ConsentRequest& request, const std::vector<std::string>& accounts) {
    std::string choices;
    for (const std::string& account : accounts) {
        choices += "<option>" + Escaped(account) + "</option>";
    }
    return Reply(200,
                 "<!DOCTYPE html><title>Consent</title><h1>Let " + Escaped(request.client) +
                     " in?</h1><p id=scope>" + Escaped(request.scope) +
                     "</p><form method=post><select name=account>" + choices +
                     "</select><button name=decision value=allow>Allow</button>"
                     "<button name=decision value=deny>Deny</button></form>",
                 "text/html; charset=UTF-8");
}

}  // namespace cloudsim
