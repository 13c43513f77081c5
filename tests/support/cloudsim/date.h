/** Dates as REST interfaces write them. */
#ifndef ZYROVFS_TESTS_CLOUDSIM_DATE_H
#define ZYROVFS_TESTS_CLOUDSIM_DATE_H

#include <cstdint>
#include <optional>
#include <string>

namespace cloudsim {

struct Moment {
    int64_t seconds = 0;  ///< since 1970
    int millis = 0;

    bool operator<(const Moment& other) const {
        return seconds != other.seconds ? seconds < other.seconds : millis < other.millis;
    }
};

/** Nothing for what is no RFC 3339 date. Without a zone it is UTC where `bare` allows that. */
std::optional<Moment> ParseDate(const std::string& text, bool bare = false);
/** "2013-01-31T23:59:59.007Z". */
std::string UtcDate(const Moment& moment);

}  // namespace cloudsim

#endif
