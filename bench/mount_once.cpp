// mount_once UID USER PASSWORD URI [COUNT]: mounts and unmounts a location COUNT times with
// VFS::Mount, in a process that is ready for the user, and prints seconds per mount, one per line.
#include <chrono>
#include <cstdio>
#include <cstdlib>

#include "zyrovfs/error.h"
#include "zyrovfs/global.h"
#include "zyrovfs/vfs.h"

int main(int argc, char** argv) {
    if (argc < 5) {
        return 2;
    }
    if (!ZYROVFS::InitGlobal(static_cast<unsigned>(std::atoi(argv[1])), false)) {
        return 1;
    }
    const int count = argc > 5 ? std::atoi(argv[5]) : 1;
    for (int i = 0; i < count; ++i) {
        ZYROVFS::VFS vfs;
        vfs.Init(argv[2], argv[3], argv[4], "", "UTF-8", Json::Value(Json::objectValue), false);
        const auto start = std::chrono::steady_clock::now();
        if (!vfs.Mount()) {
            std::fprintf(stderr, "mount: %s\n", ZYROVFS::GetErrorName(ZYROVFS::GetError()));
            return 1;
        }
        const std::chrono::duration<double> took = std::chrono::steady_clock::now() - start;
        std::printf("%.6f\n", took.count());
        std::fflush(stdout);
        vfs.UnMount();
    }
    return 0;
}
