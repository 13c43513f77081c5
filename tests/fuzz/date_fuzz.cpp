/** Any text as a date: no crash, and a time that was read prints and reads again as itself. */
#include <cstddef>
#include <cstdint>
#include <cstdlib>
#include <string>

#include "zyrovfs/utils.h"

extern "C" int LLVMFuzzerTestOneInput(const uint8_t* data, size_t size) {
    using namespace ZYROVFS::Utils;
    constexpr long kLastOfYear9999 = 253402300799L;
    const std::string text(reinterpret_cast<const char*>(data), size);

    timeval time{};
    if (ParseRFC3339ToTime(text, time)) {
        std::string printed;
        timeval again{};
        const bool in_four_digits = time.tv_sec >= -62167219200L && time.tv_sec <= kLastOfYear9999;
        if (time.tv_usec < 0 || time.tv_usec > 999999 || !ParseTimeToRFC3339(&time, printed)) {
            abort();
        }
        if (in_four_digits && (!ParseRFC3339ToTime(printed, again) || again.tv_sec != time.tv_sec ||
                               again.tv_usec != time.tv_usec)) {
            abort();
        }
    }
    long seconds = 0;
    ParseDropboxTimeToEcho(text, seconds);
    return 0;
}
