// MediaTime: a media timestamp, a rational number of seconds, with flags for times that are not
// numbers.
#ifndef ZR_PLATFORM_MEDIA_TIME_H
#define ZR_PLATFORM_MEDIA_TIME_H

#include <cstdint>

namespace platform {

struct MediaTime {
    static constexpr std::uint32_t kValid = 1U << 0;
    static constexpr std::uint32_t kHasBeenRounded = 1U << 1;
    static constexpr std::uint32_t kPositiveInfinity = 1U << 2;
    static constexpr std::uint32_t kNegativeInfinity = 1U << 3;
    static constexpr std::uint32_t kIndefinite = 1U << 4;

    std::int64_t value = 0;
    std::int32_t timescale = 1;  // units of `value` per second
    std::uint32_t flags = kValid;
    std::int64_t epoch = 0;  // which time line; seconds() ignores it

    // value / timescale in double precision. NaN for a time that is not valid or is indefinite, plus
    // or minus infinity for the infinities. A timescale of 0 divides as doubles do.
    double seconds() const;

    friend bool operator==(const MediaTime&, const MediaTime&) = default;
};

}  // namespace platform

#endif
