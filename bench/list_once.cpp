// list_once COUNT: saves that many profiles, then lists them in a child and tells its peak memory.
#include <sys/resource.h>
#include <sys/wait.h>
#include <unistd.h>

#include <cstdio>
#include <cstdlib>

#include "profiles.h"

int main(int argc, char** argv) {
    const int count = argc > 1 ? std::atoi(argv[1]) : 500;
    const pid_t child = fork();
    if (child == 0) {
        bench::Fill(count);
        _exit(0);
    }
    waitpid(child, nullptr, 0);

    rusage before{};
    getrusage(RUSAGE_SELF, &before);
    Json::Value out;
    if (!ZYROVFS::Server::List(bench::kUid, ZYROVFS::Server::VFS_CONFIG_SERVER, nullptr, nullptr,
                               true, 0, 0, out)) {
        return 1;
    }
    rusage after{};
    getrusage(RUSAGE_SELF, &after);
    std::printf("listing of %d profiles: peak %ld KiB, %ld KiB above the start\n",
                out["total"].asInt(), after.ru_maxrss, after.ru_maxrss - before.ru_maxrss);
    return 0;
}
