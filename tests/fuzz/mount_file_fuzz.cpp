#include <sys/mman.h>
#include <unistd.h>
#include <zosplatform/file.h>

#include <cstdint>
#include <cstdlib>
#include <string>

#include "server/mount_file.h"

/** A catalogue file of any content is read, and gives texts that no NUL or newline can be in. */
extern "C" int LLVMFuzzerTestOneInput(const uint8_t* data, size_t size) {
    static const int fd = memfd_create("mount", MFD_CLOEXEC);
    static const std::string path = "/proc/self/fd/" + std::to_string(fd);
    if (fd < 0 || ftruncate(fd, 0) != 0 ||
        pwrite(fd, data, size, 0) != static_cast<ssize_t>(size)) {
        abort();
    }
    ZYROVFS::Protocol::MountFile file;
    if (!file.Init() || !file.Read(path)) {
        abort();
    }
    const auto record = file.Record();
    for (const std::string& text : {record.protocol, record.name, record.api, record.enable_curl}) {
        if (text.find('\n') != std::string::npos || text.find('\0') != std::string::npos) {
            abort();
        }
    }
    ZYROVFS::Protocol::ToJson(record);
    return 0;
}
