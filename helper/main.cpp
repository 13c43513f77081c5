// The helper program of libzyrovfs: mounts, unmounts and looks up as a user, for the library, which
// executes it and tells it what to do. It is of no use to anybody else.
#include <cstdio>

#include "server/helper_program.h"

int main(int argc, char** argv) {
    if (argc == 2) {
        ZYROVFS::RunHelper(argv[1]);
    }
    std::fputs("zyrovfs-helper: this program is run by libzyrovfs alone\n", stderr);
    return 2;
}
