#include "body.h"

#include <json/reader.h>

#include <memory>

#include "failure.h"

namespace web {
namespace {

Failure Lacks(const char* key) {
    return {400, std::string("The request lacks \"") + key + "\"."};
}

}  // namespace

std::string Body::Text(const char* key) const {
    if (!value_[key].isString()) {
        throw Lacks(key);
    }
    return value_[key].asString();
}

std::string Body::Text(const char* key, const std::string& otherwise) const {
    return value_[key].isString() ? value_[key].asString() : otherwise;
}

bool Body::Flag(const char* key) const {
    return value_[key].isBool() && value_[key].asBool();
}

Body Body::Object(const char* key) const {
    if (!value_[key].isObject()) {
        throw Lacks(key);
    }
    return Body(value_[key]);
}

Json::Value ParseObject(const std::string& text) {
    Json::CharReaderBuilder builder;
    Json::CharReaderBuilder::strictMode(&builder.settings_);
    const std::unique_ptr<Json::CharReader> reader(builder.newCharReader());
    Json::Value value;
    try {
        return reader->parse(text.data(), text.data() + text.size(), &value, nullptr) &&
                       value.isObject()
                   ? value
                   : Json::Value();
    } catch (const Json::Exception&) {
        return {};  // nested too deeply
    }
}

}  // namespace web
