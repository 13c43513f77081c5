#include "directory.h"
#include "support.h"
#include "zosplatform/group.h"

namespace {

constexpr int kFailed = -1;

int Enumerate(unsigned int type, const char* domain, const zos::PageRequest& request,
              YLIBGROUPINFOFUNC callback, void* context) {
    if (callback == nullptr || request.start < 0 || request.limit < -1) {
        SET_PLATFORM_ERROR(ZOS_ERR_BAD_PARAMETER);
        return kFailed;
    }
    return zos::OrOutOfMemory(kFailed, [&] {
        zos::Directory groups;
        return zos::ReadGroups(type, domain, groups)
                   ? zos::Enumerate<YLIBGROUPINFO>(groups, request, callback, context)
                   : kFailed;
    });
}

}  // namespace

int YLIBGroupInfoEnumByPrefix(unsigned int type, const char* prefix, const char* domain, int start,
                              int limit, YLIBGROUPINFOFUNC callback, void* context) {
    return Enumerate(type, domain, {prefix, true, start, limit}, callback, context);
}

int YLIBGroupInfoEnumBySubstr(unsigned int type, const char* substr, const char* domain, int start,
                              int limit, YLIBGROUPINFOFUNC callback, void* context) {
    return Enumerate(type, domain, {substr, false, start, limit}, callback, context);
}
