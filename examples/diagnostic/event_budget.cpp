// A plug-in with one diagnostic: a device may count a few events, but no more than its budget.
#include <algorithm>
#include <memory>
#include <string>
#include <string_view>
#include <utility>

#include "frame/host_interface.h"
#include "platform/log.h"
#include "platform/welkin/meterix.h"

namespace {

using platform::fail;

// EventBudgetErrorDomain
//   1  the counters cannot be read; the facility's own error, if any, is the underlying one
//   2  the device publishes no event counters
//   3  a counter has no count
constexpr std::string_view kErrorDomain = "EventBudgetErrorDomain";

constexpr std::string_view kTotal = "Total Events";
constexpr std::string_view kGreatest = "Greatest Counter";

// The counters of the group's events; the group publishes others, which are not faults.
bool isEventCounter(const WLMeterixChannelDescription& channel) {
    return channel.groupName() == "Q71ISP" && channel.subGroupName() == "Q71ISP Events";
}

MeasurementRef events(double count) {
    return std::make_shared<const Measurement>(count, ZRDimensionlessUnit::events());
}

// Measures the sum of the event counters and the greatest of them.
class EventBudgetExperiment final : public ZRExperiment {
  public:
    ZRDescription experimentDescription() const override {
        return ZRDescription("Read the event counters once and add them up.");
    }

    ZRExperimentResultRef run(platform::ErrorSlot error) override {
        platform::ErrorRef reported;
        // An absent report makes an absent snapshot: one check serves both calls.
        const WLMeterixSnapshot snapshot = WLMeterix::reportWithOnlySimpleChannels(&reported)
                                               .reportByFilteringChannels(isEventCounter)
                                               .snapshot(&reported);
        if (!snapshot) {
            return fail(error, kErrorDomain, 1, reported, "The event counters cannot be read.");
        }
        if (snapshot.samples().empty()) {
            return fail(error, kErrorDomain, 2, nullptr, "The device has no event counters.");
        }
        double total = 0;
        double greatest = 0;
        for (const WLMeterixSample& sample : snapshot.samples()) {
            const WLMeterixChannel& channel = sample.channel();
            const std::string& name = channel.channelDescription().name();
            if (!channel.count().isPresent()) {
                return fail(error, kErrorDomain, 3, nullptr, "The counter %@ has no count.", name);
            }
            const double count = channel.count().asDouble();
            if (count != 0) {
                _log.write(platform::LogLevel::Default,
                           [&] { return name + ": " + channel.count().text(); });
            }
            total += count;
            greatest = std::max(greatest, count);
        }
        auto result = std::make_shared<ZRExperimentResult>();
        result->measurements().set(kTotal, events(total));
        result->measurements().set(kGreatest, events(greatest));
        return result;
    }

  private:
    const platform::Log _log{"org.example.event-budget", "counters"};
};

// Limits the sum to the budget; the greatest counter is information.
class EventBudgetAnalysis final : public ZRAnalysis, public ZRSetup {
  public:
    ZRDescription analysisDescription() const override {
        ZRDescription description("Demand that no more events happened than the budget allows.");
        description.addParameter(ZRNumberParameter("The most events; 0 if not given.", false),
                                 "budget");
        return description;
    }

    bool setupWithParameters(const platform::Dictionary& parameters,
                             ZRDiagnosticHost* /*host*/,
                             platform::ErrorSlot error) override {
        _budget = parameters.number("budget").asDouble();
        if (!(_budget >= 0)) {
            return fail(error, ZRErrorDomain, 5, nullptr, "The budget %lf is not 0 or more.",
                        _budget);
        }
        return true;
    }

    ZRAnalysisResultRef analyzeExperimentResult(const ZRExperimentResult& result,
                                                platform::ErrorSlot error) override {
        auto analysis = std::make_shared<ZRAnalysisResult>();
        for (const std::string_view name : {kTotal, kGreatest}) {
            const MeasurementRef* measurement = result.measurements().find(name);
            if (measurement == nullptr) {
                return fail(error, ZRErrorDomain, 6, nullptr, "Missing measurement %@.", name);
            }
            analysis->measuredResults().push_back(
                std::make_shared<ZRMeasuredResult>(std::string(name), *measurement));
        }
        auto limit = std::make_shared<ZRLimit>("Budget");
        limit->setUpperBound(std::make_shared<const ZRBound>(events(_budget), /*open=*/false));
        analysis->measuredResults().front()->setLimit(std::move(limit));
        return analysis;
    }

  private:
    double _budget = 0;
};

// Runs once, when zrlab loads the module.
[[gnu::constructor]] void registerWithLab() {
    ZRLab& lab = ZRLab::defaultLab();
    lab.addExperimentWithName("EventBudgetExperiment",
                              [] { return std::make_shared<EventBudgetExperiment>(); });
    lab.addAnalysisWithName("EventBudgetAnalysis",
                            [] { return std::make_shared<EventBudgetAnalysis>(); });
    lab.addDiagnosticWithName("EventBudgetDiagnostic",
                              "Allow a device a number of events in all its counters together.",
                              "EventBudgetExperiment", "EventBudgetAnalysis");
}

}  // namespace
