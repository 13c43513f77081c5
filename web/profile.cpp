#include "profile.h"

#include <zyrovfs/protocol.h>

#include <charconv>

#include "connection.h"
#include "failure.h"

namespace web {
namespace {

constexpr const char* kSharing = "sharing";

Json::Value Field(const char* name, const char* label, const char* type, bool required,
                  const std::string& value = "") {
    Json::Value field;
    field["name"] = name;
    field["label"] = label;
    field["type"] = type;
    field["required"] = required;
    if (!value.empty()) {
        field["value"] = value;
    }
    return field;
}

/** A number in a text or as such, as forms send either. */
unsigned ReadPort(const Json::Value& value) {
    if (value.isNull() || (value.isString() && value.asString().empty())) {
        return 0;  // the protocol's own
    }
    unsigned port = 0;
    const std::string text = value.isConvertibleTo(Json::stringValue) ? value.asString() : "";
    const auto [stop, error] = std::from_chars(text.data(), text.data() + text.size(), port);
    if (error != std::errc() || stop != text.data() + text.size() || port > 65535) {
        throw Failure(422, "The port is no number from 1 to 65535.");
    }
    return port;
}

/** Without the slashes that people put around it. */
std::string ReadPath(std::string path) {
    path.erase(0, path.find_first_not_of('/'));
    path.erase(path.find_last_not_of('/') + 1);
    return path;
}

std::string Required(const Body& body, const char* key, const char* sentence) {
    std::string text = body.Text(key, "");
    if (text.empty()) {
        throw Failure(422, sentence);
    }
    return text;
}

}  // namespace

Json::Value FieldsOf(const Json::Value& protocol) {
    const std::string name = protocol.get("protocol", "").asString();
    Json::Value fields(Json::arrayValue);
    if (IsCloud(name)) {
        return fields;
    }
    if (name == kSharing) {
        fields.append(Field("user", "E-mail address", "text", true));
        fields.append(Field("alias", "Name", "text", false));
        return fields;
    }
    const bool shares = name == "smb" || name == "cifs" || name == "nfs";
    fields.append(Field("host", "Server", "text", true));
    fields.append(Field("port", "Port", "number", false, protocol["default_port"].asString()));
    if (name != "nfs") {
        fields.append(Field("user", "User name", "text", false));
        fields.append(Field("password", "Password", "password", false));
    }
    fields.append(Field("path", shares ? "Share" : "Folder", "text", shares));
    fields.append(Field("alias", "Name", "text", false));
    return fields;
}

Json::Value ReadProfile(const Body& body) {
    const std::string protocol = body.Text("protocol");
    Json::Value known;
    if (!ZYROVFS::Protocol::GetProtocol(protocol.c_str(), known) || IsCloud(protocol)) {
        throw Failure(422, "Connections of this kind cannot be added here.");
    }
    Json::Value profile;
    profile["protocol"] = protocol;
    if (protocol == kSharing) {
        profile["email"] = Required(body, "user", "The e-mail address is missing.");
        profile["alias"] = body.Text("alias", "");
        return profile;
    }
    const std::string host = Required(body, "host", "The name of the server is missing.");
    const std::string alias = body.Text("alias", "");
    profile["hostname"] = host;
    profile["port"] = ReadPort(body["port"]);
    profile["account"] = body.Text("user", "");
    profile["password"] = body.Text("password", "");
    profile["uri_path"] = ReadPath(body.Text("path", ""));
    profile["alias"] = alias.empty() ? host : alias;
    profile["codepage"] = "UTF-8";
    return profile;
}

}  // namespace web
