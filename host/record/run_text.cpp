#include "host/record/run_text.h"

#include <algorithm>
#include <cstddef>

#include <fmt/format.h>

namespace host {

std::string plural(std::uint64_t count, std::string_view one, std::string_view many) {
    return fmt::format("{} {}", count, count == 1 ? one : many);
}

std::string valueText(double value, std::string_view unit) {
    return unit.empty() ? numberText(value) : fmt::format("{} {}", numberText(value), unit);
}

std::string limitLine(const std::optional<LimitRecord>& limit, std::string_view unit) {
    return limit.has_value() ? fmt::format("{}: {}", limit->name, limitText(*limit, unit))
                             : "no limit";
}

std::string headline(const RunRecord& run) {
    if (run.verdict == Verdict::Error) {
        return "could not be run to its end";
    }
    if (!run.isDiagnostic) {
        return "ran to its end";
    }
    const auto countOf = [&run](Judgement judgement) {
        return std::count_if(run.results.begin(), run.results.end(),
                             [judgement](const auto& one) { return one.judgement == judgement; });
    };
    const auto outside = countOf(Judgement::Outside);
    const auto limited = outside + countOf(Judgement::Within);
    return outside > 0 ? fmt::format("{} of {} limits not met", outside, limited)
                       : fmt::format("all {} limits met", limited);
}

const PartRecord& partOf(const RunRecord& run, Part part) {
    return part == Part::Analysis && run.analysis.has_value() ? *run.analysis : run.experiment;
}

std::string placeText(const FailureRecord& failure, const RunRecord& run) {
    return fmt::format("{} {}, {}", partText(failure.part), partOf(run, failure.part).name,
                       failure.step);
}

std::string symptomText(const FailureRecord& failure, std::string_view separator) {
    if (failure.error == nullptr) {
        return fmt::format("{}{}{}", partText(failure.part), separator, failure.step);
    }
    return fmt::format("{}{}{}", failure.error->domain(), separator, failure.error->code());
}

std::string causeText(const FailureRecord& failure, std::string_view separator) {
    if (failure.error == nullptr) {
        return failureText(failure);
    }
    std::string text;
    for (const platform::Error* error = failure.error.get(); error != nullptr;
         error = error->underlyingError().get()) {
        text +=
            fmt::format("{}{} ({} {})", text.empty() ? "" : std::string(separator) + "caused by: ",
                        error->localizedDescription(), error->domain(), error->code());
    }
    return text;
}

std::string_view levelText(platform::LogLevel level) {
    static constexpr std::string_view kTexts[] = {"debug", "default", "error"};
    return kTexts[static_cast<std::size_t>(level)];
}

}  // namespace host
