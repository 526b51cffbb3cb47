#include "platform/wall_clock.h"

#include <cstdio>

namespace platform {

namespace {

struct Utc {
    int year;
    unsigned month, day;
    int hour, minute, second, millisecond;
};

Utc split(std::chrono::system_clock::time_point moment) {
    namespace chrono = std::chrono;
    const auto day = chrono::floor<chrono::days>(moment);
    const chrono::year_month_day date(day);
    const chrono::hh_mm_ss time(chrono::floor<chrono::milliseconds>(moment - day));
    return {static_cast<int>(date.year()),
            static_cast<unsigned>(date.month()),
            static_cast<unsigned>(date.day()),
            static_cast<int>(time.hours().count()),
            static_cast<int>(time.minutes().count()),
            static_cast<int>(time.seconds().count()),
            static_cast<int>(time.subseconds().count())};
}

}  // namespace

std::string Date::text() const {
    const Utc utc = split(_moment);
    char buffer[64];
    std::snprintf(buffer, sizeof buffer, "%04d-%02u-%02u %02d:%02d:%02d +0000", utc.year, utc.month,
                  utc.day, utc.hour, utc.minute, utc.second);
    return buffer;
}

std::string Date::timestamp() const {
    const Utc utc = split(_moment);
    char buffer[64];
    std::snprintf(buffer, sizeof buffer, "%04d-%02u-%02uT%02d:%02d:%02d.%03dZ", utc.year, utc.month,
                  utc.day, utc.hour, utc.minute, utc.second, utc.millisecond);
    return buffer;
}

}  // namespace platform
