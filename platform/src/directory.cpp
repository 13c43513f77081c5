#include "directory.h"

#include <grp.h>
#include <pwd.h>

#include <cstdio>
#include <cstring>
#include <memory>
#include <string_view>
#include <unordered_set>

#include "name_service.h"
#include "zosplatform/user.h"

namespace zos {
namespace {

/** Debian's group of all people, which the library's children run with. */
constexpr unsigned int kPeoplesGroup = 100;
/** Ids that systemd hands out and takes back, and nobody's. */
constexpr IdRange kPassing{61184, 65535};

struct CloseFile {
    void operator()(FILE* file) const { fclose(file); }
};

struct Users {
    using Record = passwd;
    static constexpr const char* kDatabase = "passwd";
    static constexpr const char* kFile = "/etc/passwd";
    static constexpr const char* kFirst = "UID_MIN";
    static constexpr const char* kLast = "UID_MAX";
    static constexpr auto kFromFile = fgetpwent_r;
    static constexpr auto kBegin = setpwent;
    static constexpr auto kNext = getpwent_r;
    static constexpr auto kEnd = endpwent;
    static DirectoryEntry Entry(const passwd& record) {
        return {record.pw_name, record.pw_uid, record.pw_gid};
    }
};

struct Groups {
    using Record = group;
    static constexpr const char* kDatabase = "group";
    static constexpr const char* kFile = "/etc/group";
    static constexpr const char* kFirst = "GID_MIN";
    static constexpr const char* kLast = "GID_MAX";
    static constexpr auto kFromFile = fgetgrent_r;
    static constexpr auto kBegin = setgrent;
    static constexpr auto kNext = getgrent_r;
    static constexpr auto kEnd = endgrent;
    static DirectoryEntry Entry(const group& record) { return {record.gr_name, record.gr_gid, 0}; }
};

/** Hands each record that `next` has to `use`. False when reading broke off. */
template <typename Kind, typename Next, typename Use>
bool ForEach(Next next, Use use) {
    typename Kind::Record record{};
    std::vector<char> texts;
    for (;;) {
        const Lookup found = LookUp(next, record, texts);
        if (found != Lookup::kFound) {
            return found == Lookup::kUnknown;
        }
        use(Kind::Entry(record));
    }
}

template <typename Kind, typename Use>
bool ForEachLocal(Use use) {
    const std::unique_ptr<FILE, CloseFile> file(fopen(Kind::kFile, "re"));
    if (!file) {
        SET_SYSTEM_ERROR(ZOS_ERR_OPEN_FAILED);
        return false;
    }
    const auto next = [&file](auto* record, char* texts, size_t size, auto** found) {
        return Kind::kFromFile(file.get(), record, texts, size, found);
    };
    if (!ForEach<Kind>(next, use)) {
        SET_SYSTEM_ERROR(ZOS_ERR_SYSTEM);
        return false;
    }
    return true;
}

/** Whether an entry that is not of this machine is one of those asked for. */
bool IsWanted(const std::string& name, unsigned int kinds, const char* domain) {
    const size_t end = name.find('\\');
    if (end == std::string::npos) {
        return (kinds & ZOS_AUTH_LDAP) != 0;
    }
    const bool any = domain == nullptr || *domain == '\0';
    return (kinds & ZOS_AUTH_DOMAIN) != 0 &&
           (any || strcasecmp(name.substr(0, end).c_str(), domain) == 0);
}

/** What the name service knows beyond the machine's own files. */
template <typename Kind>
bool AddRemote(unsigned int kinds, const char* domain, Directory& directory) {
    std::unordered_set<std::string> local;
    if (!ForEachLocal<Kind>([&](DirectoryEntry entry) { local.insert(std::move(entry.name)); })) {
        return false;
    }
    const IdRange people = PeopleOf(Kind::kFirst, Kind::kLast);
    Kind::kBegin();
    const bool read = ForEach<Kind>(Kind::kNext, [&](DirectoryEntry entry) {
        if (entry.id >= people.first && !kPassing.Holds(entry.id) &&
            IsWanted(entry.name, kinds, domain) && local.count(entry.name) == 0) {
            directory.push_back(std::move(entry));
        }
    });
    Kind::kEnd();
    if (!read) {
        SET_SYSTEM_ERROR(ZOS_ERR_SYSTEM);
    }
    return read;
}

/** `also` says which entries outside of the people's range are people's, too. */
template <typename Kind, typename Also>
bool Read(unsigned int type, const char* domain, Directory& directory, Also also) {
    if ((type & ZOS_AUTH_LOCAL) != 0) {
        const IdRange people = PeopleOf(Kind::kFirst, Kind::kLast);
        const bool read = ForEachLocal<Kind>([&](DirectoryEntry entry) {
            if (people.Holds(entry.id) || also(entry)) {
                directory.push_back(std::move(entry));
            }
        });
        if (!read) {
            return false;
        }
    }
    const unsigned int remote = type & (ZOS_AUTH_DOMAIN | ZOS_AUTH_LDAP);
    const unsigned int kinds = remote == 0 ? 0 : remote & KindsOf(Kind::kDatabase);
    return kinds == 0 || AddRemote<Kind>(kinds, domain, directory);
}

}  // namespace

bool ReadUsers(unsigned int type, const char* domain, Directory& users) {
    return Read<Users>(type, domain, users, [](const DirectoryEntry&) { return false; });
}

bool ReadGroups(unsigned int type, const char* domain, Directory& groups) {
    AdminGroup administrators;
    if (!FindAdminGroup(administrators)) {
        administrators.name.clear();
    }
    return Read<Groups>(type, domain, groups, [&](const DirectoryEntry& entry) {
        return entry.id == kPeoplesGroup || entry.name == administrators.name;
    });
}

}  // namespace zos
