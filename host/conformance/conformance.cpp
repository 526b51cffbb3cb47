#include "host/conformance/conformance.h"

#include <chrono>
#include <limits>
#include <utility>

#include "host/record/uuid.h"
#include "host/run/judge.h"

namespace host {

namespace {

constexpr std::string_view kUnit = "times";

LimitRecord neverBroken(const Promise& promise) {
    return {.name = std::string(promise.text),
            .lower = BoundRecord{.value = 0, .open = false},
            .upper = BoundRecord{.value = 0, .open = false}};
}

}  // namespace

const ServiceChecks kServiceChecks[kServiceCount] = {
    {"meterix", "Event counters: samples and differences of them.",
     [](const platform::Services& services) { return services.meterix != nullptr; }, checkMeterix},
    {"display", "The display's power state.",
     [](const platform::Services& services) {
         return services.display != nullptr && services.registry != nullptr;
     },
     checkDisplay},
    {"hid", "The HID sensor: found, opened, scheduled on a run loop.",
     [](const platform::Services& services) { return services.hid != nullptr; }, checkHid},
    {"capture", "The camera: configured, streaming, stopped, given up.",
     [](const platform::Services& services) { return services.capture != nullptr; }, checkCapture},
};

RunRecord runOfChecks(const ServiceChecks& service, const devices::Device& device) {
    RunRecord run;
    run.uuid = newUuid();
    run.plan.name = service.name;
    run.plan.summary = service.summary;
    run.plan.experiment = {.name = std::string(service.name),
                           .summary = std::string(service.summary),
                           .parameters = {}};
    run.plan.analysis = {
        .name = "promises", .summary = "Which promises are kept.", .parameters = {}};
    const auto began = std::chrono::steady_clock::now();
    for (const CheckRecord& check : service.check(device)) {
        ResultRecord result{
            .name = std::string(check.promise.check),
            .value = static_cast<double>(check.times),
            .unit = std::string(kUnit),
            .limit = neverBroken(check.promise),
            .judgement = check.finding == Finding::Kept ? Judgement::Within : Judgement::Outside};
        if (check.finding == Finding::NotChecked) {
            result.value = std::numeric_limits<double>::quiet_NaN();
            result.unit.clear();
            result.judgement = Judgement::NotMeasured;
            BenchResult left;
            static_cast<ResultRecord&>(left) = std::move(result);
            left.note = "not checked: " +
                        (check.detail.empty() ? "the device did not get that far" : check.detail);
            run.benchResults.push_back(std::move(left));
            continue;
        }
        if (check.finding == Finding::Broken) {
            run.log.push_back({.time = platform::Date::now(),
                               .level = platform::LogLevel::Error,
                               .message = result.name + ": " + check.detail});
        }
        run.results.push_back(std::move(result));
    }
    run.seconds = std::chrono::duration<double>(std::chrono::steady_clock::now() - began).count();
    run.experimentSeconds = run.seconds;
    run.analysisSeconds = 0;
    run.verdict = verdictOf(run);
    return run;
}

}  // namespace host
