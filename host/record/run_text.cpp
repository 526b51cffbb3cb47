#include "host/record/run_text.h"

#include <algorithm>
#include <array>
#include <cstddef>
#include <cstdint>

#include <fmt/format.h>

#include "host/record/clean_text.h"
#include "platform/number.h"

namespace host {

std::string_view verdictText(Verdict verdict) {
    switch (verdict) {
        case Verdict::Passed:
            return "PASS";
        case Verdict::Failed:
            return "FAIL";
        case Verdict::Error:
            return "ERROR";
        case Verdict::Interrupted:
            break;
    }
    return "INTERRUPTED";
}

std::string_view verdictName(Verdict verdict) {
    static constexpr std::string_view kNames[] = {"pass", "fail", "error", "interrupted"};
    return kNames[static_cast<std::size_t>(verdict)];
}

namespace {

std::string countsText(std::uint64_t passed,
                       std::uint64_t failed,
                       std::uint64_t errors,
                       std::uint64_t interrupted,
                       std::uint64_t notStarted) {
    std::string text = fmt::format("{} passed, {} failed, {} in error", passed, failed, errors);
    text += interrupted > 0 ? fmt::format(", {} interrupted", interrupted) : "";
    return text + (notStarted > 0 ? fmt::format(", {} not started", notStarted) : "");
}

// How far an interrupted run came: "37 of 90 frames". Empty when nothing is known of it.
std::string progressText(const RunRecord& run) {
    for (const CountParameter& count : kCountParameters) {
        const platform::Number wanted = run.plan.experiment.parameter(count.parameter);
        if (wanted.isPresent()) {
            return fmt::format(
                "{} of {} {}",
                count.counted == Counted::Frames ? run.framesDelivered : run.imagesDelivered,
                wanted.text(), count.plural);
        }
    }
    return "";
}

}  // namespace

std::string countsText(const RepeatRecord& repeat) {
    return countsText(repeat.passed, repeat.failed, repeat.errors, repeat.interrupted, 0);
}

std::string countsText(const SessionRecord& session) {
    std::array<std::uint64_t, 4> counts{};
    for (const RunRecord& run : session.runs) {
        ++counts[static_cast<std::size_t>(run.verdict)];
    }
    return countsText(counts[0], counts[1], counts[2], counts[3], session.notStarted().size());
}

std::string_view partText(Part part) {
    return part == Part::Experiment ? "experiment" : "analysis";
}

std::string failureText(const FailureRecord& failure) {
    if (failure.error != nullptr) {
        return failure.error->localizedDescription();
    }
    return failure.message.empty() ? "failed without an error" : failure.message;
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

std::string plural(std::uint64_t count, std::string_view one, std::string_view many) {
    return fmt::format("{} {}", count, count == 1 ? one : many);
}

std::string valueText(double value, std::string_view unit) {
    // The host's units are plural nouns: events, frames, errors.
    if (value == 1 && unit.size() > 2 && unit.ends_with('s')) {
        unit.remove_suffix(1);
    }
    return unit.empty() ? numberText(value) : fmt::format("{} {}", numberText(value), unit);
}

std::string limitLine(const std::optional<LimitRecord>& limit, std::string_view unit) {
    return limit.has_value() ? fmt::format("{}: {}", limit->name, limitText(*limit, unit))
                             : "no limit";
}

bool isBenchFinding(const BenchResult& result) {
    return result.partOfVerdict &&
           (result.judgement == Judgement::Outside || result.judgement == Judgement::NotMeasured);
}

std::string benchLine(const BenchResult& result, bool verdict) {
    const std::string range = limitLine(result.limit, result.unit);
    std::string text = result.judgement == Judgement::NotMeasured
                           ? fmt::format("not measured, {}; {}", range, result.note)
                           : fmt::format("{}, {}", valueText(result.value, result.unit), range);
    if (verdict && !result.partOfVerdict) {
        text += "; not part of the verdict";
    }
    return text;
}

std::string benchHeadline(const RunRecord& run) {
    const auto countOf = [&run](Judgement judgement) {
        return std::count_if(run.benchResults.begin(), run.benchResults.end(),
                             [judgement](const auto& one) { return one.judgement == judgement; });
    };
    const std::size_t all = run.benchResults.size();
    const auto outside = countOf(Judgement::Outside);
    const auto notMeasured = countOf(Judgement::NotMeasured);
    if (all == 0) {
        return "";
    }
    const std::string limits = plural(all, "bench limit", "bench limits");
    std::string text = outside > 0 ? fmt::format("{} of {} not met", outside, limits) : "";
    if (notMeasured > 0) {
        text += text.empty() ? fmt::format("{} of {} not measured", notMeasured, limits)
                             : fmt::format(", {} not measured", notMeasured);
    }
    return !text.empty() ? text : (all > 1 ? "all " : "") + limits + " met";
}

namespace {

// What the module's own results come to.
std::string moduleHeadline(const RunRecord& run) {
    if (run.verdict == Verdict::Interrupted) {
        const std::string progress = progressText(run);
        return progress.empty() ? "stopped before its end" : "stopped after " + progress;
    }
    if (!run.failures.empty() || (run.verdict == Verdict::Error && run.benchResults.empty())) {
        return "did not complete";
    }
    if (!run.plan.isDiagnostic()) {
        return run.benchResults.empty() ? "completed, not judged" : "completed";
    }
    const auto countOf = [&run](Judgement judgement) {
        return std::count_if(run.results.begin(), run.results.end(),
                             [judgement](const auto& one) { return one.judgement == judgement; });
    };
    const auto outside = countOf(Judgement::Outside);
    const auto limited = outside + countOf(Judgement::Within);
    if (limited == 1) {
        return outside > 0 ? "the limit is not met" : "the limit is met";
    }
    return outside > 0 ? fmt::format("{} of {} limits not met", outside, limited)
                       : fmt::format("all {} limits met", limited);
}

}  // namespace

std::string headline(const RunRecord& run) {
    const std::string bench = benchHeadline(run);
    return moduleHeadline(run) + (bench.empty() ? "" : "; " + bench);
}

std::string interruptionText(const SessionRecord& session) {
    if (!session.runs.empty()) {
        const RunRecord& last = session.runs.back();
        if (last.verdict == Verdict::Interrupted) {
            return last.plan.name + " " + headline(last);
        }
        const RepeatRecord* repeat = session.repeatOf(session.runs.size() - 1);
        if (repeat != nullptr && repeat->interrupted > 0) {
            return fmt::format("{} stopped in run {}", last.plan.name, repeat->runs);
        }
    }
    return "stopped between two runs";
}

std::string whyText(const RunRecord& run) {
    if (!run.failures.empty()) {
        return plainLine(failureText(run.failures.front()));
    }
    for (const ResultRecord& result : run.results) {
        if (result.judgement == Judgement::Outside) {
            return plainLine(fmt::format("{} is {}, {}", result.name,
                                         valueText(result.value, result.unit),
                                         limitLine(result.limit, result.unit)));
        }
    }
    if (run.verdict == Verdict::Interrupted) {
        return headline(run);
    }
    for (const Judgement judgement : {Judgement::Outside, Judgement::NotMeasured}) {
        for (const BenchResult& result : run.benchResults) {
            if (result.partOfVerdict && result.judgement == judgement) {
                return plainLine(fmt::format("{} {}{}", result.name,
                                             judgement == Judgement::Outside ? "is " : "",
                                             benchLine(result, false)));
            }
        }
    }
    return "";
}

const PartPlan& partOf(const RunRecord& run, Part part) {
    return part == Part::Analysis ? run.plan.analysis.value() : run.plan.experiment;
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

std::string levelText(const LogRecord& line) {
    return std::string(levelText(line.level)) + (line.late ? ", late" : "");
}

std::vector<std::pair<std::string, std::string>> identityTexts(const Identity& identity) {
    std::vector<std::pair<std::string, std::string>> texts;
    for (const auto& [name, text] : kIdentityEntries) {
        if (!(identity.*text).empty()) {
            texts.emplace_back(name, identity.*text);
        }
    }
    texts.insert(texts.end(), identity.metadata.begin(), identity.metadata.end());
    const bool onlyStation = texts.size() == 1 && !identity.station.empty();
    return onlyStation ? std::vector<std::pair<std::string, std::string>>() : texts;
}

std::string framesText(const RunRecord& run) {
    if (run.framesDelivered == 0) {
        return "";
    }
    std::string text = plural(run.framesDelivered, "frame", "frames") + " delivered";
    if (run.framesLost.has_value()) {
        text += fmt::format(", {} lost", *run.framesLost);
    }
    return text;
}

bool isNumberedApart(const FrameRecord& frame) {
    return frame.sensorNumber.has_value() &&
           static_cast<std::uint64_t>(*frame.sensorNumber) != frame.number;
}

std::string frameText(const FrameRecord& frame) {
    return fmt::format("frame {}", frame.number) +
           (isNumberedApart(frame) ? fmt::format(" (the sensor's {})", *frame.sensorNumber) : "");
}

}  // namespace host
