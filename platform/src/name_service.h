/** How this machine is set up to know users and groups. */
#ifndef ZOSPLATFORM_SRC_NAME_SERVICE_H
#define ZOSPLATFORM_SRC_NAME_SERVICE_H

#include <sys/types.h>

#include <vector>

#include "support.h"

namespace zos {

/** Ids that belong to people and their groups, of login.defs. */
struct IdRange {
    unsigned int first;
    unsigned int last;
    bool Holds(unsigned int id) const { return id >= first && id <= last; }
};
IdRange PeopleOf(const char* first_key, const char* last_key);

/** Which kinds of ZOS_AUTH_... the database "passwd" or "group" of nsswitch.conf draws on. */
unsigned int KindsOf(const char* database);

/**
 * Whether all directory services of this machine answer when they are asked for a user's groups.
 * The C library does not tell: from getgrouplist the groups of a service that is out of reach are
 * missing without a word. Any name does for finding out whether they are there.
 */
bool HaveServicesAnswered(const char* user, gid_t group);

/** How a lookup in the name service ended. */
enum class Lookup { kFound, kUnknown, kFailed };

/**
 * Runs one of getpwnam_r and its like with the key bound, with as much room for the texts as the
 * record takes. `*found` points to `record` or is null; kFailed leaves the cause in errno.
 */
template <typename Record, typename Call>
Lookup LookUp(Call call, Record& record, std::vector<char>& texts) {
    Record* found = nullptr;
    texts.resize(1024);
    int error = 0;
    while ((error = call(&record, texts.data(), texts.size(), &found)) == ERANGE) {
        texts.resize(texts.size() * 2);
    }
    if (found != nullptr) {
        return Lookup::kFound;
    }
    // The directory services of a host report an unknown name in several ways.
    if (error == 0 || error == ENOENT || error == ESRCH || error == EPERM) {
        return Lookup::kUnknown;
    }
    errno = error;
    return Lookup::kFailed;
}

}  // namespace zos

#endif
