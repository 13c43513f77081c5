#include <libsoup/soup.h>

#include <algorithm>
#include <iterator>
#include <memory>
#include <new>

#include "cloud/handler.h"
#include "cloud/pkce.h"
#include "cloud/secret.h"
#include "cloud/service_config.h"
#include "cloud/without_tokens.h"
#include "core/json.h"
#include "core/log.h"
#include "core/no_throw.h"
#include "mount/glib_handle.h"
#include "zyrovfs/cloud_utils.h"

namespace ZYROCloud::Utils {

using namespace ZYROVFS;

namespace {

template <typename Errors>
ErrorHandler* New() {
    return new (std::nothrow) Errors;
}

/** What the services differ in. */
struct Service {
    const char* name;
    std::string (*page_host)();
    const char* page_path;
    std::string (*token_host)();
    const char* token_path;
    const char* scope;  ///< "" where the client's registration tells what is asked for
    const char* extra;  ///< further parameters of the page
    bool fixed_client;  ///< renewals know one client alone
    bool expires;       ///< its tokens end, and it says when
    ErrorHandler* (*errors)();
};

constexpr Service kServices[] = {
    {"box", BoxAccountHost, "/api/oauth2/authorize", BoxApiHost, "/oauth2/token", "", "", false,
     true, New<BoxErrorHandler>},
    {"dropbox", DropboxWebHost, "/oauth2/authorize", DropboxApiHost, "/oauth2/token", "", "", false,
     false, New<DropboxErrorHandler>},
    // A second login gives a refresh token only if the person is asked once more.
    {"google", GoogleAccountsHost, "/o/oauth2/v2/auth", GoogleAccountsHost, "/o/oauth2/token",
     "https://www.googleapis.com/auth/drive", "&access_type=offline&prompt=consent", false, true,
     New<GDriveErrorHandler>},
    {"onedrive", LiveLoginHost, "/oauth20_authorize.srf", LiveLoginHost, "/oauth20_token.srf",
     "wl.signin wl.offline_access wl.emails wl.skydrive_update", "", true, true,
     New<OneDriveErrorHandler>},
};

const Service* FindService(const std::string& name) {
    const auto* found = std::find_if(std::begin(kServices), std::end(kServices),
                                     [&name](const Service& s) { return name == s.name; });
    return found == std::end(kServices) ? nullptr : found;
}

bool IsFixedClient(const Service& service, const std::string& client) {
    return !service.fixed_client || client == FixedClientId(service.name);
}

/** The client that was named, or the one that goes without saying. */
bool ChooseClient(const Service& service, const std::string& wanted, std::string& client) {
    Json::Value clients;
    if (!ListClients(clients)) {
        return false;
    }
    const Json::Value& ids = clients[service.name];
    client = !wanted.empty()        ? wanted
             : service.fixed_client ? FixedClientId(service.name)
             : ids.size() == 1      ? ids[0].asString()
                                    : "";
    const bool known =
        std::any_of(ids.begin(), ids.end(), [&](const Json::Value& id) { return id == client; });
    if (!known || !IsFixedClient(service, client)) {
        LOG_ERROR("No client for a login at %s, %s", service.name, wanted.c_str());
        return Fail(VFS_ERR_BAD_PARAM);
    }
    return true;
}

std::string Parameter(const char* name, const std::string& value) {
    const UniqueGText escaped(g_uri_escape_string(value.c_str(), nullptr, FALSE));
    return std::string("&") + name + "=" + escaped.get();
}

std::string PageAddress(const Service& service, const Login& login) {
    return service.page_host() + service.page_path + "?response_type=code" +
           Parameter("client_id", login.client_id) + Parameter("redirect_uri", login.redirect_uri) +
           Parameter("state", login.state) +
           Parameter("code_challenge", ChallengeOf(login.verifier)) +
           "&code_challenge_method=S256" +
           (*service.scope == '\0' ? "" : Parameter("scope", service.scope)) + service.extra;
}

/** The parameters of an address, or of what follows its question mark. */
struct Answer {
    explicit Answer(const std::string& text)
        : table(soup_form_decode(text.substr(text.find('?') + 1, LengthOfQuery(text)).c_str())) {}
    Answer(const Answer&) = delete;
    Answer& operator=(const Answer&) = delete;
    ~Answer() { g_hash_table_unref(table); }

    std::string operator[](const char* name) const {
        const auto* value = static_cast<const char*>(g_hash_table_lookup(table, name));
        return value == nullptr ? "" : value;
    }

  private:
    static size_t LengthOfQuery(const std::string& text) {
        const size_t begin = text.find('?') + 1;
        return std::min(text.find('#', begin), text.size()) - begin;
    }

    GHashTable* table;
};

bool ReadCode(const Login& login, const Answer& answer, std::string& code, LoginRefusal& refusal) {
    if (login.state.empty() || answer["state"] != login.state) {
        LOG_ERROR("An answer to another login");
        return Fail(VFS_ERR_BAD_PARAM);
    }
    refusal = {answer["error"], answer["error_description"]};
    if (!refusal.error.empty()) {
        LOG_ERROR("The login was refused, %s", refusal.error.c_str());
        return Fail(refusal.error == "access_denied" ? VFS_ERR_ACCESS_DENIED
                                                     : VFS_ERR_CLOUD_FAILED);
    }
    code = answer["code"];
    if (code.empty()) {
        LOG_ERROR("An answer without a code");
        return Fail(VFS_ERR_BAD_PARAM);
    }
    return true;
}

bool Describe(const Service& service, const Login& login, const std::string& code,
              APIHandler& api) {
    Json::Value form;
    std::string secret;
    if (!FindSecret(service.name, login.client_id, secret)) {
        return Fail(VFS_ERR_CONFIG_READ);
    }
    form["grant_type"] = "authorization_code";
    form["code"] = code;
    form["redirect_uri"] = login.redirect_uri;
    form["client_id"] = login.client_id;
    form["client_secret"] = secret;
    form["code_verifier"] = login.verifier;
    // The body of a refusal tells what was wrong.
    return (api.SetErrorHandler(service.errors()) && api.SetReturnOnError(false) && api.Init() &&
            api.AllowOnlyHttp() && api.AddPostParam(form) &&
            api.SetURL(service.token_host() + service.token_path, true)) ||
           Fail(VFS_ERR_CLOUD_FAILED);
}

std::string Text(const Json::Value& object, const char* name) {
    const Json::Value value = object.isObject() ? object.get(name, "") : Json::Value("");
    return value.isString() ? value.asString() : "";
}

bool RefusedBy(APIHandler& api, LoginRefusal& refusal) {
    Json::Value answer;
    json::fromString(answer, api.GetResponse());
    refusal = {Text(answer, "error"), Text(answer, "error_description")};
    const int code = api.GetError().get("code", VFS_ERR_NONE).asInt();
    LOG_ERROR("Failed to get tokens, %d, %s", code, refusal.error.c_str());
    return Fail(code == VFS_ERR_NONE ? VFS_ERR_CLOUD_FAILED : static_cast<__tag_vfs_err_>(code));
}

bool ReadTokens(const Service& service, const std::string& client, const std::string& text,
                Json::Value& profile) {
    Json::Value answer;
    int64_t life = 0;
    if (!json::fromString(answer, text) || Text(answer, "access_token").empty() ||
        (service.expires &&
         (Text(answer, "refresh_token").empty() || !json::toInt64(answer["expires_in"], life)))) {
        LOG_ERROR("An answer without tokens, %s", WithoutTokens(text).c_str());
        return Fail(VFS_ERR_CLOUD_FAILED);
    }
    profile = Json::Value(Json::objectValue);
    profile["protocol"] = service.name;
    profile["alias"] = "";
    profile["client_id"] = client;
    profile["access_token"] = Text(answer, "access_token");
    profile["refresh_token"] = Text(answer, "refresh_token");
    if (json::toInt64(answer["expires_in"], life)) {
        profile["expires_in"] = std::to_string(life);
    }
    return true;
}

}  // namespace

bool BeginLogin(const std::string& service, const std::string& client_id,
                const std::string& redirect_uri, Login& out) {
    return NoThrow(VFS_ERR_CONFIG_READ, [&] {
        const Service* row = FindService(service);
        if (row == nullptr || redirect_uri.empty()) {
            LOG_ERROR("Wrong parameters");
            return Fail(VFS_ERR_BAD_PARAM);
        }
        Login login;
        if (!ChooseClient(*row, client_id, login.client_id)) {
            return false;
        }
        login.service = service;
        login.redirect_uri = redirect_uri;
        login.state = RandomVerifier();
        login.verifier = RandomVerifier();
        if (login.state.empty() || login.verifier.empty()) {
            LOG_ERROR("Failed to begin a login, there are no random numbers");
            return Fail(VFS_ERR_FAILED);
        }
        login.address = PageAddress(*row, login);
        out = login;
        return true;
    });
}

bool FinishLogin(const Login& login, const std::string& answer, Json::Value& profile,
                 LoginRefusal& refusal) {
    return NoThrow(VFS_ERR_CLOUD_FAILED, [&] {
        profile = Json::Value(Json::objectValue);
        refusal = LoginRefusal();
        const Service* service = FindService(login.service);
        std::string code;
        if (service == nullptr) {
            LOG_ERROR("Wrong parameters");
            return Fail(VFS_ERR_BAD_PARAM);
        }
        if (!ReadCode(login, Answer(answer), code, refusal)) {
            return false;
        }
        const std::unique_ptr<APIHandler> api(NewHandler());
        if (api == nullptr) {
            return Fail(VFS_ERR_OUT_OF_MEMORY);
        }
        if (!Describe(*service, login, code, *api)) {
            return false;
        }
        // A code is good for one request.
        return api->Process(0) ? ReadTokens(*service, login.client_id, api->GetResponse(), profile)
                               : RefusedBy(*api, refusal);
    });
}

}  // namespace ZYROCloud::Utils
