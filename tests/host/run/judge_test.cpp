#include "host/run/judge.h"

#include <cmath>
#include <limits>
#include <memory>
#include <optional>

#include <gtest/gtest.h>

#include "host/record/run_text.h"

namespace {

using host::Judgement;

constexpr double kInf = std::numeric_limits<double>::infinity();
const double kNan = std::nan("");

struct Bound {
    double value;
    bool open;
};

struct Row {
    const char* what;
    double value;
    std::optional<Bound> lower, upper;
    Judgement expected;
};

ZRBoundRef bound(const std::optional<Bound>& given) {
    return given.has_value()
               ? std::make_shared<const ZRBound>(std::make_shared<const Measurement>(
                                                     given->value, ZRDimensionlessUnit::events()),
                                                 given->open)
               : nullptr;
}

TEST(Judge, AdmitsWhatLiesInsideBothBounds) {
    const Row rows[] = {
        {"inside", 1, Bound{0, false}, Bound{2, false}, Judgement::Within},
        {"on a closed lower bound", 0, Bound{0, false}, Bound{2, false}, Judgement::Within},
        {"on a closed upper bound", 2, Bound{0, false}, Bound{2, false}, Judgement::Within},
        {"on an open lower bound", 0, Bound{0, true}, Bound{2, false}, Judgement::Outside},
        {"on an open upper bound", 2, Bound{0, false}, Bound{2, true}, Judgement::Outside},
        {"zero to zero", 0, Bound{0, false}, Bound{0, false}, Judgement::Within},
        {"minus zero", -0.0, Bound{0, false}, Bound{0, false}, Judgement::Within},
        {"just above", std::nextafter(0.0, 1.0), Bound{0, false}, Bound{0, false},
         Judgement::Outside},
        {"below a lower bound alone", 29, Bound{30, false}, std::nullopt, Judgement::Outside},
        {"above a lower bound alone", kInf, Bound{30, false}, std::nullopt, Judgement::Within},
        {"under an upper bound alone", -kInf, std::nullopt, Bound{0, false}, Judgement::Within},
        {"no bounds", 7, std::nullopt, std::nullopt, Judgement::Within},
        {"NaN between bounds", kNan, Bound{0, false}, Bound{2, false}, Judgement::Outside},
        {"NaN without bounds", kNan, std::nullopt, std::nullopt, Judgement::Outside},
        {"a bound that is NaN", 1, Bound{kNan, false}, std::nullopt, Judgement::Outside},
    };
    for (const Row& row : rows) {
        ZRMeasuredResult result(
            "r", std::make_shared<const Measurement>(row.value, ZRDimensionlessUnit::events()));
        const auto limit = std::make_shared<ZRLimit>("limit");
        limit->setLowerBound(bound(row.lower));
        limit->setUpperBound(bound(row.upper));
        result.setLimit(limit);
        EXPECT_EQ(host::judge(result).judgement, row.expected) << row.what;
    }
    const ZRMeasuredResult unlimited(
        "r", std::make_shared<const Measurement>(kNan, ZRDimensionlessUnit::events()));
    EXPECT_EQ(host::judge(unlimited).judgement, Judgement::Information);
}

TEST(Judge, WritesLimitsAsPeopleReadThem) {
    using host::BoundRecord;
    using host::LimitRecord;
    const std::pair<LimitRecord, const char*> rows[] = {
        {{"", BoundRecord{0, false}, BoundRecord{0, false}}, "0 … 0 events"},
        {{"", BoundRecord{30, false}, std::nullopt}, "≥ 30 events"},
        {{"", std::nullopt, BoundRecord{2.5, true}}, "< 2.5 events"},
        {{"", BoundRecord{0, true}, BoundRecord{5, false}}, "> 0 and ≤ 5 events"},
        {{"", std::nullopt, std::nullopt}, "no bounds"},
    };
    for (const auto& [limit, text] : rows) {
        EXPECT_EQ(host::limitText(limit, "events"), text);
    }
}

}  // namespace
