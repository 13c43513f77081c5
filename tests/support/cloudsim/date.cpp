#include "support/cloudsim/date.h"

#include <cstdio>
#include <ctime>

#include "support/cloudsim/http.h"

namespace cloudsim {
namespace {

/** Seconds ahead of UTC of "Z" or "+hh:mm". */
std::optional<int64_t> ParseZone(const std::string& zone) {
    if (zone == "Z" || zone == "z") {
        return 0;
    }
    if (zone.size() != 6 || zone[3] != ':' || (zone[0] != '+' && zone[0] != '-')) {
        return std::nullopt;
    }
    const auto hours = ParseNumber(zone.substr(1, 2)), minutes = ParseNumber(zone.substr(4, 2));
    if (!hours || !minutes) {
        return std::nullopt;
    }
    const auto ahead = static_cast<int64_t>(*hours * 3600 + *minutes * 60);
    return zone[0] == '-' ? -ahead : ahead;
}

/** The digits behind the point, and nothing when there are none. */
std::optional<int> ParseMillis(const std::string& digits) {
    const auto number = ParseNumber((digits + "00").substr(0, 3));
    return digits.empty() || !number ? std::nullopt : std::optional<int>(static_cast<int>(*number));
}

}  // namespace

std::optional<Moment> ParseDate(const std::string& text, bool bare) {
    struct tm parts {};
    const char* rest = strptime(text.c_str(), "%Y-%m-%dT%H:%M:%S", &parts);
    if (rest == nullptr) {
        return std::nullopt;
    }
    Moment moment;
    std::string zone = rest;
    if (zone[0] == '.') {
        const size_t end = std::min(zone.find_first_not_of("0123456789", 1), zone.size());
        const auto millis = ParseMillis(zone.substr(1, end - 1));
        if (!millis) {
            return std::nullopt;
        }
        moment.millis = *millis;
        zone.erase(0, end);
    }
    const auto ahead = zone.empty() && bare ? 0 : ParseZone(zone);
    if (!ahead) {
        return std::nullopt;
    }
    moment.seconds = timegm(&parts) - *ahead;
    return moment;
}

std::string UtcDate(const Moment& moment) {
    const time_t time = moment.seconds;
    struct tm parts {};
    gmtime_r(&time, &parts);
    char date[64], text[80];
    strftime(date, sizeof date, "%Y-%m-%dT%H:%M:%S", &parts);
    snprintf(text, sizeof text, "%s.%03dZ", date, moment.millis);
    return text;
}

}  // namespace cloudsim
