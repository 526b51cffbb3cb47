#include "devices/faulty/fault.h"

#include <utility>

#include "platform/text_format.h"

namespace faulty {

namespace {

std::string_view nameOf(StepKind kind) {
    switch (kind) {
        case StepKind::Service:
            return "service";
        case StepKind::Call:
            return "call";
        case StepKind::Frame:
            return "frame";
        case StepKind::Event:
            return "event";
        case StepKind::Report:
            return "report";
    }
    return "";
}

std::string_view textOf(Way way) {
    switch (way) {
        case Way::WithError:
            return "fails with an error object";
        case Way::WithoutError:
            return "fails without an error object";
        case Way::AbsentObject:
            return "yields no object";
        case Way::AbsentValue:
            return "yields no value";
        case Way::Empty:
            return "yields something empty";
        case Way::WrongKind:
            return "yields something of the wrong kind";
        case Way::WrongEntries:
            return "yields entries of the wrong kind";
        case Way::Lost:
            return "is lost";
    }
    return "";
}

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
                            nameOf(place.kind), operation.empty() ? "" : ": ", operation);
}

std::string Step::text(Way way) const {
    return platform::format("%@ %@", text(), textOf(way));
}

}  // namespace faulty
