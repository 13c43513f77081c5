#include "name_service.h"

#include <dlfcn.h>
#include <nss.h>

#include <charconv>
#include <cstdlib>
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

/** Hands the services that a database of nsswitch.conf draws on to `use`, as far as they are known.
 */
template <typename Use>
void ForEachService(const char* database, Use use) {
    std::ifstream file("/etc/nsswitch.conf");
    for (std::string line; std::getline(file, line);) {
        std::istringstream words(line.substr(0, line.find('#')));
        std::string word;
        if (!(words >> word) || word != std::string(database) + ":") {
            continue;
        }
        while (words >> word) {
            for (const Service& service : kServices) {
                if (word == service.name) {
                    use(service);
                }
            }
        }
    }
}

using GroupsOfUser = nss_status (*)(const char*, gid_t, long*, long*, gid_t**, long, int*);

bool Answers(GroupsOfUser ask, const char* user, gid_t group) {
    long start = 0;
    long size = 64;
    auto* groups = static_cast<gid_t*>(calloc(static_cast<size_t>(size), sizeof(gid_t)));
    if (groups == nullptr) {
        return false;
    }
    int error = 0;
    const nss_status status = ask(user, group, &start, &size, &groups, -1, &error);
    free(groups);
    return status == NSS_STATUS_SUCCESS || status == NSS_STATUS_NOTFOUND;
}

/** A service that is not installed has nothing to say, as for the C library; one that cannot be
 * asked for a user's groups is not asked. */
bool HasAnswered(const std::string& service, const char* user, gid_t group) {
    void* const library = dlopen(("libnss_" + service + ".so.2").c_str(), RTLD_NOW | RTLD_NODELETE);
    void* const ask = library == nullptr
                          ? nullptr
                          : dlsym(library, ("_nss_" + service + "_initgroups_dyn").c_str());
    return ask == nullptr || Answers(reinterpret_cast<GroupsOfUser>(ask), user, group);
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
    ForEachService(database, [&](const Service& service) { kinds |= service.kind; });
    return kinds;
}

bool HaveServicesAnswered(const char* user, gid_t group) {
    bool answered = true;
    for (const char* database : {"initgroups", "group"}) {
        ForEachService(database, [&](const Service& service) {
            answered = answered && HasAnswered(service.name, user, group);
        });
    }
    return answered;
}

}  // namespace zos
