#include "name_service.h"

#include <charconv>
#include <fstream>
#include <sstream>

#include "zosplatform/user.h"

namespace zos {
namespace {

constexpr IdRange kUsualPeople{1000, 60000};

struct Service {
    const char* name;
    unsigned int kind;
};

// sssd stands for a directory server, also where that one is a domain's: it gives plain names.
constexpr Service kServices[] = {
    {"ldap", ZOS_AUTH_LDAP}, {"sss", ZOS_AUTH_LDAP}, {"winbind", ZOS_AUTH_DOMAIN}};

bool ToNumber(const std::string& text, unsigned int& number) {
    unsigned int parsed = 0;
    const auto [end, error] = std::from_chars(text.data(), text.data() + text.size(), parsed);
    if (error != std::errc() || end != text.data() + text.size()) {
        return false;
    }
    number = parsed;
    return true;
}

}  // namespace

IdRange PeopleOf(const char* first_key, const char* last_key) {
    IdRange range = kUsualPeople;
    std::ifstream file("/etc/login.defs");
    for (std::string line; std::getline(file, line);) {
        std::istringstream words(line);
        std::string key;
        std::string value;
        if (words >> key >> value) {
            if (key == first_key) {
                ToNumber(value, range.first);
            } else if (key == last_key) {
                ToNumber(value, range.last);
            }
        }
    }
    return range;
}

unsigned int KindsOf(const char* database) {
    unsigned int kinds = ZOS_AUTH_LOCAL;
    std::ifstream file("/etc/nsswitch.conf");
    for (std::string line; std::getline(file, line);) {
        std::istringstream words(line.substr(0, line.find('#')));
        std::string word;
        if (!(words >> word) || word != std::string(database) + ":") {
            continue;
        }
        while (words >> word) {
            for (const Service& service : kServices) {
                kinds |= word == service.name ? service.kind : 0;
            }
        }
    }
    return kinds;
}

}  // namespace zos
