#include <cstdio>
#include <ctime>

#include "core/log.h"
#include "zyrovfs/utils.h"

namespace ZYROVFS::Utils {
namespace {

bool IsDigit(char c) {
    return c >= '0' && c <= '9';
}

/** Reads ".123" if it is there. Leaves `p` behind it; false for no digit or more than six. */
bool ReadFraction(const char*& p, long& microseconds) {
    microseconds = 0;
    if (*p != '.') {
        return true;
    }
    ++p;
    long factor = 1000000;
    const char* const first = p;
    for (; IsDigit(*p); ++p) {
        factor /= 10;
        if (factor == 0) {
            return false;
        }
        microseconds += (*p - '0') * factor;
    }
    return p != first;
}

/** One or two digits. */
bool ReadNumber(const char*& p, int& number) {
    number = 0;
    const char* const first = p;
    for (; IsDigit(*p) && p - first < 2; ++p) {
        number = number * 10 + (*p - '0');
    }
    return p != first;
}

/** Reads "Z", "+01:30" or "+0130", and nothing may follow. `shift` is what leads to UTC. */
bool ReadZone(const char* p, const char* end, long& shift) {
    shift = 0;
    if (*p == 'Z') {
        return p + 1 == end;
    }
    if (*p != '+' && *p != '-') {
        return false;
    }
    const int direction = *p++ == '-' ? 1 : -1;
    int hours = 0;
    int minutes = 0;
    if (!ReadNumber(p, hours)) {
        return false;
    }
    p += *p == ':' ? 1 : 0;
    if (!ReadNumber(p, minutes) || hours >= 24 || minutes >= 60 || p != end) {
        return false;
    }
    shift = direction * (hours * 3600L + minutes * 60L);
    return true;
}

bool ParseRFC3339(const std::string& text, timeval& time) {
    tm parts{};
    const char* p = strptime(text.c_str(), "%Y-%m-%dT%H:%M:%S", &parts);
    long microseconds = 0;
    long shift = 0;
    if (p == nullptr || !ReadFraction(p, microseconds) ||
        !ReadZone(p, text.c_str() + text.size(), shift)) {
        return false;
    }
    time.tv_sec = timegm(&parts) + shift;
    time.tv_usec = microseconds;
    return true;
}

}  // namespace

bool ParseRFC3339ToTime(const std::string& text, timeval& time) {
    if (ParseRFC3339(text, time)) {
        return true;
    }
    LOG_ERROR("Failed to parse %s", text.c_str());
    return false;
}

bool ParseTimeToRFC3339(const timeval* time, std::string& text) {
    tm parts{};
    if (time == nullptr || gmtime_r(&time->tv_sec, &parts) == nullptr) {
        return false;
    }
    char fraction[32] = "000";
    if (time->tv_usec != 0) {
        snprintf(fraction, sizeof fraction, "%06ld", static_cast<long>(time->tv_usec));
    }
    char buffer[128];
    snprintf(buffer, sizeof buffer, "%04d-%02d-%02dT%02d:%02d:%02d.%sZ", parts.tm_year + 1900,
             parts.tm_mon + 1, parts.tm_mday, parts.tm_hour, parts.tm_min, parts.tm_sec, fraction);
    text = buffer;
    return true;
}

bool ParseEpochToRFC3339(long seconds, std::string& text) {
    const timeval time{seconds, 0};
    return ParseTimeToRFC3339(&time, text);
}

bool ParseDropboxTimeToEcho(const std::string& text, long& seconds) {
    if (text.empty()) {
        return false;
    }
    tm parts{};
    if (strptime(text.c_str(), "%a, %d %b %Y %H:%M:%S %z", &parts) == nullptr) {
        LOG_ERROR("Failed to parse %s", text.c_str());
        return false;
    }
    // The offset is read and then passed over: the clock time counts as local time.
    parts.tm_isdst = -1;
    seconds = mktime(&parts);
    return true;
}

}  // namespace ZYROVFS::Utils
