/** What callers ask for, checked member by member. */
#include <algorithm>
#include <cstring>
#include <ctime>

#include "support/cloudsim/dropbox_json.h"

namespace cloudsim::dropbox {

Arguments::Arguments(std::string function, std::string place, const std::string& text)
    : function_(std::move(function)), place_(std::move(place)), values_(ParseObject(text)) {
    if (values_.isNull()) {
        throw Failure{BadInput(function_, place_ + ": could not decode input as JSON"), {}};
    }
}

void Arguments::Refuse(const std::string& why) const {
    throw Failure{BadInput(function_, place_ + ": " + why), {}};
}

bool Arguments::Has(const std::string& name) const {
    return values_.isMember(name) && !values_[name].isNull();
}

const Json::Value& Arguments::Member(const std::string& name, const char* kind, bool right) const {
    if (!values_.isMember(name)) {
        Refuse("missing required field '" + name + "'");
    }
    if (!right) {
        Refuse(name + ": expected " + kind);
    }
    return values_[name];
}

std::string Arguments::Text(const std::string& name) const {
    return Member(name, "string", values_[name].isString()).asString();
}

std::string Arguments::TextOr(const std::string& name, const std::string& missing) const {
    return Has(name) ? Text(name) : missing;
}

bool Arguments::Flag(const std::string& name, bool missing) const {
    return Has(name) ? Member(name, "boolean", values_[name].isBool()).asBool() : missing;
}

uint64_t Arguments::Number(const std::string& name) const {
    const Json::Value& value = values_[name];
    return Member(name, "integer", value.isUInt64() && value.type() != Json::realValue).asUInt64();
}

uint64_t Arguments::NumberOr(const std::string& name, uint64_t missing) const {
    return Has(name) ? Number(name) : missing;
}

Arguments Arguments::Object(const std::string& name) const {
    return {*this, Member(name, "object", values_[name].isObject())};
}

std::vector<Arguments> Arguments::List(const std::string& name) const {
    std::vector<Arguments> list;
    for (const Json::Value& value : Member(name, "list", values_[name].isArray())) {
        if (!value.isObject()) {
            Refuse(name + ": expected object");
        }
        list.push_back(Arguments(*this, value));
    }
    return list;
}

std::string Arguments::Tag(const std::string& name, const std::string& missing) const {
    if (!Has(name)) {
        return missing;
    }
    return values_[name].isObject() ? Object(name).Text(".tag") : Text(name);
}

std::optional<int64_t> Arguments::Date(const std::string& name) const {
    if (!Has(name)) {
        return std::nullopt;
    }
    const std::string text = Text(name);
    struct tm parts {};
    const char* rest = strptime(text.c_str(), "%Y-%m-%dT%H:%M:%SZ", &parts);
    if (rest == nullptr || *rest != '\0') {
        Refuse(name + ": time data '" + text + "' does not match format '%Y-%m-%dT%H:%M:%SZ'");
    }
    return timegm(&parts);
}

}  // namespace cloudsim::dropbox
