/*
 * A fuzz target runs a unit millions of times: what the unit reports goes nowhere, and waiting
 * takes no time.
 */
#include <syslog.h>
#include <unistd.h>

#include <cstdarg>
#include <ctime>

extern "C" {

void syslog(int, const char*, ...) {}
void __syslog_chk(int, int, const char*, ...) {}

/** The fuzzer's own thread sleeps between its looks at the memory, and would never stop looking. */
unsigned sleep(unsigned seconds) {
    if (gettid() != getpid()) {
        const timespec time = {static_cast<time_t>(seconds), 0};
        nanosleep(&time, nullptr);
    }
    return 0;
}

int usleep(useconds_t) {
    return 0;
}

}  // extern "C"
