/** Processes: start, fork, look at; services. */
#ifndef ZOSPLATFORM_PROCESS_H
#define ZOSPLATFORM_PROCESS_H

#include <sys/types.h>

#ifdef __cplusplus
extern "C" {
#endif

typedef struct _tag_YLIBCPROC_ {
    pid_t pid;
    uid_t uid;      ///< effective user
    char name[64];  ///< the kernel's name of the process: at most 15 bytes of its program's name
} YLIBCPROC, *PYLIBCPROC;

/**
 * Runs a program and waits for it: path, arguments, and a final null of type char pointer. Exit
 * status, or negative when the program could not be started, was killed, or ended with a failure
 * status of 127. Standard input is /dev/null.
 */
int YLIBCExec(const char* path, ...) __attribute__((sentinel));

/** The same with an argument array that starts with the program's name. 0 is success. */
int YLIBCExecv(const char* path, const char* const argv[]);

/** fork; the child starts without pending signals of its parent. */
pid_t YLIBCProcFork(void);

/** 1 when a process with this pid runs; 0 for none and for one that has ended and awaits
 * collection. */
int YLIBCProcAlive(pid_t pid);

/** A record to be released with YLIBCProcFree, or null (platform error 0x600) for no such process.
 */
PYLIBCPROC YLIBCProcGetByPid(pid_t pid);
void YLIBCProcFree(PYLIBCPROC proc);

/** Starts a service if it is not running; nothing where no service manager runs. 0, or -1. */
int YLIBServicectlStart(const char* service, int flag);

/** 1 when this system may run the feature. A plain Linux may. */
int ZYRODZOSIsPrivilegedMode(void);

#ifdef __cplusplus
}
#endif

#endif
