// The statistics of the questions: textbook formulas, each with its source.
#ifndef ZR_HOST_RESULTS_STATISTICS_H
#define ZR_HOST_RESULTS_STATISTICS_H

#include <cstdint>
#include <optional>

namespace host {

// Every interval is at this confidence, two-sided.
inline constexpr double kConfidence = 0.95;

// A share, and where the true one lies by the size of the sample.
struct Share {
    std::int64_t count = 0;
    std::int64_t of = 0;  // never 0
    double low = 0;       // these two from 0 to 1
    double high = 0;

    double value() const { return static_cast<double>(count) / static_cast<double>(of); }
    bool operator==(const Share&) const = default;
};

// The share with the Wilson score interval (Wilson 1927; NIST/SEMATECH e-Handbook, 7.2.4.1): it holds for small
// samples and for shares near 0 and 1. With none of n the upper end is 3.84 / (n + 3.84), a little above the
// "rule of three". Nothing of an empty sample.
std::optional<Share> shareOf(std::int64_t count, std::int64_t of);

// Fisher's exact test, two-sided (Fisher 1934): how likely a difference as great as that between two shares is,
// or a greater one, when both samples have the same true share. It holds for samples of any size. Nothing when
// a sample is empty.
std::optional<double> fisherTest(std::int64_t count,
                                 std::int64_t of,
                                 std::int64_t otherCount,
                                 std::int64_t otherOf);

// The level of one of `tests` tests that together raise a false alarm with a probability of 1 - kConfidence at
// most (Bonferroni).
double levelOfOne(std::int64_t tests);

// The moments of a sample, from sums around a middle that is near the mean (the corrected two-pass algorithm,
// Chan, Golub and LeVeque 1983): digits are not lost where the mean is great beside the deviation.
struct Moments {
    std::int64_t n = 0;
    double middle = 0;
    double sum = 0;      // of value - middle
    double squares = 0;  // of (value - middle)²

    // Of the sample. NaN of none.
    double mean() const;
    // The sample's standard deviation, with n - 1. NaN of fewer than two values.
    double deviation() const;
};

// From so many values on capability indices are shown: with 30 the 95 % interval of one is about ± 26 %.
inline constexpr std::int64_t kLeastForCapability = 30;

// Capability indices (Montgomery, Introduction to Statistical Quality Control; ISO 22514-2): Cp = (U - L) / 6s,
// Cpk = min(U - mean, mean - L) / 3s. The deviation is that of all values, between days and stations too; some
// books call the indices Pp and Ppk then. They suppose values that are normally distributed.
struct Capability {
    std::optional<double> cp;   // needs both bounds
    std::optional<double> cpk;  // needs a bound
};

// Nothing of fewer than kLeastForCapability values, or when all are the same.
Capability capabilityOf(const Moments& moments,
                        std::optional<double> lower,
                        std::optional<double> upper);

}  // namespace host

#endif
