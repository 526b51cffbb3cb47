// ItemCosts: what a process spends on each frame or report, from when it has warmed up.
#ifndef ZR_BENCHMARKS_PROGRAMS_ITEM_COSTS_H
#define ZR_BENCHMARKS_PROGRAMS_ITEM_COSTS_H

#include <algorithm>
#include <cstdint>
#include <cstdio>
#include <ctime>
#include <vector>

#include <sys/resource.h>

// Nanoseconds; modulo 2^64.
inline std::uint64_t timeOf(clockid_t clock) {
    timespec time{};
    clock_gettime(clock, &time);
    return static_cast<std::uint64_t>(time.tv_sec) * 1'000'000'000 +
           static_cast<std::uint64_t>(time.tv_nsec);
}

// Threads  One at a time.
class ItemCosts {
  public:
    explicit ItemCosts(unsigned long items) : _items(items) { _latencies.reserve(items); }

    // Whether this item, which took so long to come, is the last one.
    bool count(std::uint64_t latency = 0) {
        constexpr unsigned long kWarmUp = 10;
        ++_seen;
        if (_seen > kWarmUp) {
            _latencies.push_back(latency);
        }
        if (_seen == kWarmUp) {
            _begin = _spent();
        }
        if (_seen == kWarmUp + _items) {
            _end = _spent();
        }
        return _seen == kWarmUp + _items;
    }

    // So many items came.
    unsigned long seen() const { return _seen; }

    // One line of JSON: per item nanoseconds of processor time in all threads and context switches; the median and
    // the worst latency; what the caller counted as lost.
    void print(std::uint64_t lost) {
        std::sort(_latencies.begin(), _latencies.end());
        const auto items = static_cast<double>(_items);
        std::printf(
            "{\"time\": %.1f, \"switches\": %.3f, \"latency\": %ju, \"worst\": %ju, \"lost\": "
            "%ju}\n",
            static_cast<double>(_end.time - _begin.time) / items,
            static_cast<double>(_end.switches - _begin.switches) / items,
            std::uintmax_t{_latencies[_latencies.size() / 2]}, std::uintmax_t{_latencies.back()},
            std::uintmax_t{lost});
    }

  private:
    struct Spent {
        std::uint64_t time = 0;
        long switches = 0;
    };

    static Spent _spent() {
        rusage used{};
        getrusage(RUSAGE_SELF, &used);
        return {timeOf(CLOCK_PROCESS_CPUTIME_ID), used.ru_nvcsw + used.ru_nivcsw};
    }

    const unsigned long _items;
    unsigned long _seen = 0;
    Spent _begin;
    Spent _end;
    std::vector<std::uint64_t> _latencies;
};

// How long a report of the virtual machine's sensor is on its way. It begins with its ID, and holds at 8 the low half
// of the monotonic clock's nanoseconds when it was sent.
inline std::uint64_t latencyOf(const void* report) {
    std::uint32_t sent = 0;
    std::copy_n(static_cast<const char*>(report) + 8, sizeof sent, reinterpret_cast<char*>(&sent));
    return static_cast<std::uint32_t>(timeOf(CLOCK_MONOTONIC)) - sent;
}

#endif
