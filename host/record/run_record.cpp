#include "host/record/run_record.h"

#include "platform/number.h"

namespace host {

std::string_view verdictText(Verdict verdict) {
    switch (verdict) {
        case Verdict::Passed:
            return "PASS";
        case Verdict::Failed:
            return "FAIL";
        case Verdict::Error:
            break;
    }
    return "ERROR";
}

std::string_view partText(Part part) {
    return part == Part::Experiment ? "experiment" : "analysis";
}

std::string failureText(const FailureRecord& failure) {
    if (failure.error != nullptr) {
        return failure.error->localizedDescription();
    }
    return failure.message.empty() ? "it failed without saying why" : failure.message;
}

std::string numberText(double value) {
    return platform::Number(value).text();
}

std::string limitText(const LimitRecord& limit, std::string_view unit) {
    const auto bound = [](std::string_view closedSign, std::string_view openSign, BoundRecord end) {
        return std::string(end.open ? openSign : closedSign) + " " + numberText(end.value);
    };
    std::string text;
    if (limit.lower.has_value() && limit.upper.has_value() && !limit.lower->open &&
        !limit.upper->open) {
        text = numberText(limit.lower->value) + " … " + numberText(limit.upper->value);
    } else {
        if (limit.lower.has_value()) {
            text = bound("≥", ">", *limit.lower);
        }
        if (limit.upper.has_value()) {
            text += text.empty() ? "" : " and ";
            text += bound("≤", "<", *limit.upper);
        }
    }
    if (text.empty()) {
        return "no bounds";
    }
    return unit.empty() ? text : text + " " + std::string(unit);
}

}  // namespace host
