#include "host/zrlab/conformance_command.h"

#include <algorithm>
#include <chrono>
#include <string>
#include <utility>
#include <vector>

#include <fmt/format.h>

#include "host/conformance/conformance.h"
#include "host/record/problem.h"
#include "host/report/replay.h"
#include "host/run/judge.h"
#include "host/zrlab/session.h"
#include "host/zrlab/session_reports.h"
#include "host/zrlab/terminal.h"
#include "input/nearest.h"
#include "platform/log.h"

namespace host {

namespace {

// The log is the device's own; what a broken promise was is in the record.
class NoLog final : public platform::LogSink {
  public:
    void write(const platform::LogLine& /*line*/) override {}
};

const ServiceChecks& serviceNamed(const std::string& name) {
    std::vector<std::string> known;
    for (const ServiceChecks& service : kServiceChecks) {
        if (service.name == name) {
            return service;
        }
        known.emplace_back(service.name);
    }
    throw Problem(kExitUsage,
                  fmt::format("conformance: unknown service \"{}\"{}; there are {}", name,
                              input::didYouMean(name, known), fmt::join(known, ", ")));
}

// Those that are asked for, else those that the device has.
std::vector<const ServiceChecks*> servicesToCheck(const SessionOptions& options,
                                                  const devices::Device& device) {
    std::vector<const ServiceChecks*> services;
    for (const std::string& name : options.names) {
        const ServiceChecks& service = serviceNamed(name);
        if (!service.has(device.services)) {
            throw Problem(kExitUsage,
                          fmt::format("conformance: {} has no service \"{}\"", device.name, name));
        }
        services.push_back(&service);
    }
    if (options.names.empty()) {
        for (const ServiceChecks& service : kServiceChecks) {
            if (service.has(device.services)) {
                services.push_back(&service);
            }
        }
    }
    if (services.empty()) {
        throw Problem(kExitError,
                      fmt::format("conformance: {} has no service at all", device.name));
    }
    return services;
}

}  // namespace

int conformanceCommand(const SessionOptions& options) {
    const auto began = std::chrono::steady_clock::now();
    platform::setLogSink(std::make_shared<NoLog>(), platform::LogLevel::Error);
    const devices::Device device = openDevice(options.device);
    SessionRecord record;
    record.version = options.version;
    record.commandLine = options.commandLine;
    record.identity = options.identity;
    record.deviceName = device.name;
    record.deviceSummary = device.summary;
    record.deviceFacts = device.facts;
    const auto services = servicesToCheck(options, device);
    const auto leaveOut = [&record](const ServiceChecks& service, const std::string& why) {
        record.deviceFacts.emplace_back(service.name, why);
        Terminal::shared().complain(fmt::format("{}: {}", service.name, why));
    };
    if (options.names.empty()) {
        for (const ServiceChecks& service : kServiceChecks) {
            if (!service.has(device.services)) {
                leaveOut(service, "not checked: the device has no such service");
            }
        }
    }
    SessionReports reports(options, record);
    bool isWhole = true;  // of what was asked for, each was checked
    for (const ServiceChecks* service : services) {
        RunRecord run = runOfChecks(*service, device);
        if (run.results.empty()) {
            leaveOut(*service, run.benchResults.front().note);
            isWhole = options.names.empty();
            continue;
        }
        record.verdict = worse(record.verdict, run.verdict);
        record.planned.push_back(run.plan);
        record.runs.push_back(std::move(run));
    }
    if (record.runs.empty()) {
        throw Problem(kExitError,
                      fmt::format("conformance: nothing of {} could be checked", device.name));
    }
    record.seconds =
        std::chrono::duration<double>(std::chrono::steady_clock::now() - began).count();
    for (const auto& report : reports.listeners()) {
        replay(record, *report);
    }
    return reports.finish() && isWhole ? exitStatusOf(record.verdict) : kExitError;
}

}  // namespace host
