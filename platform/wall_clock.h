// Date: a moment of the wall clock, with its default text.
#ifndef ZR_PLATFORM_WALL_CLOCK_H
#define ZR_PLATFORM_WALL_CLOCK_H

#include <chrono>
#include <string>

namespace platform {

class Date {
  public:
    explicit Date(std::chrono::system_clock::time_point moment) : _moment(moment) {}

    static Date now() { return Date(std::chrono::system_clock::now()); }

    std::chrono::system_clock::time_point moment() const { return _moment; }

    // The default text, always in UTC and in whole seconds: "2026-11-24 17:34:07 +0000".
    std::string text() const;
    // The text of RFC 3339 with milliseconds, in UTC: "2026-11-24T17:34:07.125Z".
    std::string timestamp() const;

  private:
    std::chrono::system_clock::time_point _moment;
};

}  // namespace platform

#endif
