#include "platform/media_time.h"

#include <limits>

namespace platform {

double MediaTime::seconds() const {
    using Limits = std::numeric_limits<double>;
    if ((flags & kValid) == 0 || (flags & kIndefinite) != 0) {
        return Limits::quiet_NaN();
    }
    if ((flags & kPositiveInfinity) != 0) {
        return Limits::infinity();
    }
    if ((flags & kNegativeInfinity) != 0) {
        return -Limits::infinity();
    }
    const auto numerator = static_cast<double>(value);
    const auto denominator = static_cast<double>(timescale);
    if (denominator == 0.0) {  // written out, because the language leaves it undefined
        return numerator == 0.0 ? Limits::quiet_NaN()
                                : (numerator > 0.0 ? Limits::infinity() : -Limits::infinity());
    }
    return numerator / denominator;
}

}  // namespace platform
