/**
 * A user directory that fails: a program that includes this in its one source file defines the
 * platform's calls itself, which fail while their flag is set.
 */
#ifndef ZYROVFS_TESTS_FAILING_DIRECTORY_H
#define ZYROVFS_TESTS_FAILING_DIRECTORY_H

#include <dlfcn.h>
#include <zosplatform/error.h>
#include <zosplatform/group.h>
#include <zosplatform/user.h>

namespace failing_directory {

inline bool no_administrators = false;
inline bool no_users = false;
inline bool no_groups = false;
inline bool no_group_list = false;
inline bool no_ids = false;  ///< enumerations give (id)-1, as directories without numbers do

template <typename Function>
Function Real(const char* name) {
    return reinterpret_cast<Function>(dlsym(RTLD_NEXT, name));
}

inline void SetError() {
    YLIBCErrSetEx(ZOS_ERR_SYSTEM, "directory.cpp", 12);
}

/** A callback that hides the ids of what it hands on. */
template <typename Info, typename Callback>
struct WithoutIds {
    Callback callback;
    void* context;
    static int Call(const Info* info, void* pointer) {
        const auto& self = *static_cast<const WithoutIds*>(pointer);
        const Info hidden{info->name, static_cast<uid_t>(-1)};
        return self.callback(&hidden, self.context);
    }
};

template <typename Info, typename Callback>
int Filtered(const char* name, bool fail, unsigned type, const char* text, const char* domain,
             int start, int limit, Callback callback, void* context) {
    if (fail) {
        SetError();
        return -1;
    }
    using Function = int (*)(unsigned, const char*, const char*, int, int, Callback, void*);
    WithoutIds<Info, Callback> hiding{callback, context};
    return no_ids ? Real<Function>(name)(type, text, domain, start, limit, hiding.Call, &hiding)
                  : Real<Function>(name)(type, text, domain, start, limit, callback, context);
}

}  // namespace failing_directory

extern "C" {

int YLIBUserAdminListGet(unsigned type, PYLIBCSZLIST* list) {
    if (failing_directory::no_administrators) {
        failing_directory::SetError();
        return -1;
    }
    return failing_directory::Real<int (*)(unsigned, PYLIBCSZLIST*)>("YLIBUserAdminListGet")(type,
                                                                                             list);
}

int YLIBUserInfoEnum(unsigned type, const char* domain, int start, int limit,
                     YLIBUSERINFOFUNC callback, void* context) {
    return failing_directory::Filtered<YLIBUSERINFO>("YLIBUserInfoEnumByPrefix",
                                                     failing_directory::no_users, type, "", domain,
                                                     start, limit, callback, context);
}

int YLIBUserInfoEnumByPrefix(unsigned type, const char* prefix, const char* domain, int start,
                             int limit, YLIBUSERINFOFUNC callback, void* context) {
    return failing_directory::Filtered<YLIBUSERINFO>("YLIBUserInfoEnumByPrefix",
                                                     failing_directory::no_users, type, prefix,
                                                     domain, start, limit, callback, context);
}

int YLIBUserInfoEnumBySubstr(unsigned type, const char* substr, const char* domain, int start,
                             int limit, YLIBUSERINFOFUNC callback, void* context) {
    return failing_directory::Filtered<YLIBUSERINFO>("YLIBUserInfoEnumBySubstr",
                                                     failing_directory::no_users, type, substr,
                                                     domain, start, limit, callback, context);
}

int YLIBGroupInfoEnumByPrefix(unsigned type, const char* prefix, const char* domain, int start,
                              int limit, YLIBGROUPINFOFUNC callback, void* context) {
    return failing_directory::Filtered<YLIBGROUPINFO>("YLIBGroupInfoEnumByPrefix",
                                                      failing_directory::no_groups, type, prefix,
                                                      domain, start, limit, callback, context);
}

int YLIBGroupInfoEnumBySubstr(unsigned type, const char* substr, const char* domain, int start,
                              int limit, YLIBGROUPINFOFUNC callback, void* context) {
    return failing_directory::Filtered<YLIBGROUPINFO>("YLIBGroupInfoEnumBySubstr",
                                                      failing_directory::no_groups, type, substr,
                                                      domain, start, limit, callback, context);
}

PYLIBCSZLIST YLIBGroupInfoListGet(const char* user, int flags) {
    if (failing_directory::no_group_list) {
        failing_directory::SetError();
        return nullptr;
    }
    return failing_directory::Real<PYLIBCSZLIST (*)(const char*, int)>("YLIBGroupInfoListGet")(
        user, flags);
}

}  // extern "C"

#endif
