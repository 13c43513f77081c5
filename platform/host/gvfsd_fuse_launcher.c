/*
 * Stands where the library starts gvfsd-fuse. The library passes mount options of FUSE 2, which
 * FUSE 3 refuses since they have become its normal behaviour: they are dropped here, all else is
 * handed on, and the real program takes this process's place. It keeps the pid, and since its file
 * has the same name, also the process name by which the library knows its daemon again.
 *
 * The library asks for allow_other, so that root's services reach the tree. That would let every
 * user of the machine in as well; with default_permissions the kernel lets in whom the modes let
 * in, and gvfs gives all it shows to its own user.
 */
#include <stdio.h>
#include <string.h>
#include <unistd.h>

#define REAL_PROGRAM "/usr/libexec/gvfsd-fuse"
#define MOST_ARGUMENTS 64

static const char* const kForgotten[] = {"big_writes", "direct_io"};

static int IsForgotten(const char* option, size_t length) {
    for (size_t i = 0; i < sizeof(kForgotten) / sizeof(kForgotten[0]); i++) {
        if (strlen(kForgotten[i]) == length && strncmp(kForgotten[i], option, length) == 0) {
            return 1;
        }
    }
    return 0;
}

/* Length of the first option of a list; an escaped comma belongs to the option. */
static size_t OptionLength(const char* list) {
    size_t length = 0;
    while (list[length] != '\0' && list[length] != ',') {
        length += list[length] == '\\' && list[length + 1] != '\0' ? 2 : 1;
    }
    return length;
}

/* Takes the forgotten options out of a list, in place. */
static void Filter(char* list) {
    const char* from = list;
    char* to = list;
    for (;;) {
        const size_t length = OptionLength(from);
        const char* next = from + length;
        if (!IsForgotten(from, length)) {
            if (to != list) {
                *to++ = ',';
            }
            memmove(to, from, length);
            to += length;
        }
        if (*next == '\0') {
            break;
        }
        from = next + 1;
    }
    *to = '\0';
}

/* Filters "-o LIST" and "-oLIST"; an option whose list becomes empty goes with it. */
static void FilterArguments(char** argv) {
    char** to = argv + 1;
    for (char** from = argv + 1; *from != NULL; from++) {
        if (strcmp(*from, "--") == 0) {
            while (*from != NULL) {
                *to++ = *from++;
            }
            break;
        }
        const int is_list = strncmp(*from, "-o", 2) == 0;
        const int apart = is_list && (*from)[2] == '\0' && from[1] != NULL;
        char* list = apart ? from[1] : *from + 2;
        if (!is_list || *list == '\0') {
            *to++ = *from;
            continue;
        }
        Filter(list);
        if (*list != '\0') {
            *to++ = *from;
            if (apart) {
                *to++ = list;
            }
        }
        from += apart;
    }
    *to = NULL;
}

int main(int argc, char** argv) {
    char* all[MOST_ARGUMENTS + 3] = {REAL_PROGRAM, "-odefault_permissions"};
    if (argc < 1 || argc > MOST_ARGUMENTS) {
        fprintf(stderr, "%s: between 0 and %d arguments\n", REAL_PROGRAM, MOST_ARGUMENTS - 1);
        return 127;
    }
    FilterArguments(argv);
    all[0] = argv[0];
    for (int i = 1; argv[i] != NULL; i++) {
        all[i + 1] = argv[i];
    }
    execv(REAL_PROGRAM, all);
    perror(REAL_PROGRAM);
    return 127;
}
