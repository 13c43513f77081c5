#include <sys/utsname.h>

#include <cstdio>

#include "support.h"
#include "zosplatform/device.h"

int YLIBDsinfoUserAgentGet(const char* product, char* buffer, int size) {
    if (product == nullptr || buffer == nullptr || size <= 0) {
        SET_PLATFORM_ERROR(ZOS_ERR_BAD_PARAMETER);
        return -1;
    }
    utsname kernel{};
    uname(&kernel);
    const int length = std::snprintf(buffer, static_cast<size_t>(size), "%s/%s (%s %s)", product,
                                     ZOSPLATFORM_VERSION, kernel.sysname, kernel.release);
    if (length < 0 || length >= size) {
        buffer[0] = '\0';
        SET_PLATFORM_ERROR(ZOS_ERR_BUFFER_TOO_SMALL);
        return -1;
    }
    return 0;
}
