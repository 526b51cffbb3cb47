#include "devices/faulty/fault.h"

#include <cstddef>
#include <iterator>

#include "platform/text_format.h"

namespace faulty {

namespace {

// In the order of the enumerations.
constexpr std::string_view kKinds[] = {"service", "call", "frame", "event", "report"};
constexpr std::string_view kWays[] = {
    "fails with an error object",
    "fails without an error object",
    "yields no object",
    "yields no value",
    "yields something empty",
    "yields something of the wrong kind",
    "yields entries of the wrong kind",
    "is lost",
};
static_assert(std::size(kKinds) == static_cast<std::size_t>(StepKind::Report) + 1);
static_assert(std::size(kWays) == static_cast<std::size_t>(Way::Lost) + 1);

// 1st, 2nd, 3rd, 4th; 11th, 12th, 13th.
std::string_view ordinalSuffix(std::uint64_t number) {
    const std::uint64_t last = number % 10;
    if (number / 10 % 10 == 1 || last == 0 || last > 3) {
        return "th";
    }
    return last == 1 ? "st" : last == 2 ? "nd" : "rd";
}

}  // namespace

std::string Step::text() const {
    return platform::format("%lu%@ %@%@%@", place.number, ordinalSuffix(place.number),
                            kKinds[static_cast<std::size_t>(place.kind)],
                            operation.empty() ? "" : ": ", operation);
}

std::string Step::text(Way way) const {
    return platform::format("%@ %@", text(), kWays[static_cast<std::size_t>(way)]);
}

}  // namespace faulty
