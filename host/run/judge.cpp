#include "host/run/judge.h"

#include <algorithm>
#include <cmath>

namespace host {

namespace {

std::optional<BoundRecord> recordOf(const ZRBoundRef& bound) {
    if (bound == nullptr || bound->value() == nullptr) {
        return std::nullopt;
    }
    return BoundRecord{bound->value()->doubleValue(), bound->open()};
}

}  // namespace

bool isWithin(double value, const LimitRecord& limit) {
    if (std::isnan(value)) {
        return false;
    }
    // Written as the conditions that admit the value, so that a bound of NaN admits none.
    const bool aboveLower = !limit.lower.has_value() || value > limit.lower->value ||
                            (value == limit.lower->value && !limit.lower->open);
    const bool belowUpper = !limit.upper.has_value() || value < limit.upper->value ||
                            (value == limit.upper->value && !limit.upper->open);
    return aboveLower && belowUpper;
}

ResultRecord judge(const ZRMeasuredResult& result) {
    ResultRecord record{.name = result.name(),
                        .value = result.measurement()->doubleValue(),
                        .unit = result.measurement()->unit().symbol(),
                        .limit = std::nullopt,
                        .judgement = Judgement::Information};
    if (result.limit() != nullptr) {
        record.limit = LimitRecord{result.limit()->name(), recordOf(result.limit()->lowerBound()),
                                   recordOf(result.limit()->upperBound())};
        record.judgement =
            isWithin(record.value, *record.limit) ? Judgement::Within : Judgement::Outside;
    }
    return record;
}

Verdict verdictOf(const RunRecord& run) {
    if (!run.failures.empty()) {
        return Verdict::Error;
    }
    const auto benchFound = [&run](Judgement judgement) {
        return std::any_of(run.benchResults.begin(), run.benchResults.end(),
                           [judgement](const BenchResult& one) {
                               return one.partOfVerdict && one.judgement == judgement;
                           });
    };
    const bool outside = std::any_of(run.results.begin(), run.results.end(), [](const auto& one) {
        return one.judgement == Judgement::Outside;
    });
    if (outside || benchFound(Judgement::Outside)) {
        return Verdict::Failed;
    }
    return benchFound(Judgement::NotMeasured) ? Verdict::Error : Verdict::Passed;
}

}  // namespace host
