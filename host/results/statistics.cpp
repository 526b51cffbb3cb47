#include "host/results/statistics.h"

#include <algorithm>
#include <cmath>
#include <limits>

namespace host {

namespace {

constexpr double kZ =
    1.959963984540054;  // the normal distribution's quantile at (1 + kConfidence) / 2

double logFactorial(double n) {
    // std::lgamma writes a global variable; its other form is not in the standard.
    int sign = 0;
    return lgamma_r(n + 1, &sign);
}

double logChoose(double n, double k) {
    return logFactorial(n) - logFactorial(k) - logFactorial(n - k);
}

}  // namespace

std::optional<Share> shareOf(std::int64_t count, std::int64_t of) {
    if (of <= 0) {
        return std::nullopt;
    }
    const auto n = static_cast<double>(of);
    const double share = static_cast<double>(count) / n;
    const double z2 = kZ * kZ;
    const double middle = (share + z2 / (2 * n)) / (1 + z2 / n);
    const double half = kZ / (1 + z2 / n) * std::sqrt(share * (1 - share) / n + z2 / (4 * n * n));
    // Rounding may leave the ends a little beside the bounds that they have exactly.
    return Share{count, of, count == 0 ? 0 : middle - half, count == of ? 1 : middle + half};
}

std::optional<double> fisherTest(std::int64_t count,
                                 std::int64_t of,
                                 std::int64_t otherCount,
                                 std::int64_t otherOf) {
    if (of <= 0 || otherOf <= 0) {
        return std::nullopt;
    }
    const auto n = static_cast<double>(of);
    const auto m = static_cast<double>(otherOf);
    const std::int64_t all = count + otherCount;
    const double ways = logChoose(n + m, static_cast<double>(all));
    const auto logProbability = [&](std::int64_t k) {
        return logChoose(n, static_cast<double>(k)) + logChoose(m, static_cast<double>(all - k)) -
               ways;
    };
    // Two tables that are equally likely may differ in the last digits.
    const double found = logProbability(count) + 1e-7;
    double sum = 0;
    for (std::int64_t k = std::max<std::int64_t>(0, all - otherOf); k <= std::min(of, all); ++k) {
        const double one = logProbability(k);
        sum += one <= found ? std::exp(one) : 0;
    }
    return std::min(sum, 1.0);
}

double levelOfOne(std::int64_t tests) {
    return (1 - kConfidence) / static_cast<double>(std::max<std::int64_t>(tests, 1));
}

double Moments::mean() const {
    return n > 0 ? middle + sum / static_cast<double>(n) : std::numeric_limits<double>::quiet_NaN();
}

double Moments::deviation() const {
    if (n < 2) {
        return std::numeric_limits<double>::quiet_NaN();
    }
    const auto count = static_cast<double>(n);
    return std::sqrt(std::max(0.0, squares - sum * sum / count) / (count - 1));
}

Capability capabilityOf(const Moments& moments,
                        std::optional<double> lower,
                        std::optional<double> upper) {
    const double deviation = moments.deviation();
    if (moments.n < kLeastForCapability || !(deviation > 0)) {
        return {};
    }
    Capability capability;
    if (lower.has_value() && upper.has_value()) {
        capability.cp = (*upper - *lower) / (6 * deviation);
    }
    for (const std::optional<double> distance :
         {upper.has_value() ? std::optional(*upper - moments.mean()) : std::nullopt,
          lower.has_value() ? std::optional(moments.mean() - *lower) : std::nullopt}) {
        if (distance.has_value()) {
            const double index = *distance / (3 * deviation);
            capability.cpk = std::min(capability.cpk.value_or(index), index);
        }
    }
    return capability;
}

}  // namespace host
