#include "host/zrlab/recording_command.h"

#include <algorithm>
#include <cstddef>
#include <map>
#include <vector>

#include <fmt/format.h>

#include "devices/recording/recording.h"
#include "host/record/clean_text.h"
#include "host/record/problem.h"
#include "host/record/run_text.h"
#include "host/zrlab/recording_profile.h"

namespace host {

namespace {

using recording::Call;
using recording::Entry;

std::string line(std::string_view name, const std::string& text) {
    return fmt::format("{:<10}  {}\n", name, plainLine(text));
}

// What of one kind came, and how long the device was silent in between.
struct Arrivals {
    std::size_t count = 0;
    recording::Microseconds first{0};
    recording::Microseconds last{0};
    recording::Microseconds longestPause{0};
    std::size_t afterPause = 0;  // the one that came after the longest pause

    void add(recording::Microseconds at) {
        if (count++ == 0) {
            first = at;
        } else if (at - last > longestPause) {
            longestPause = at - last;
            afterPause = count;
        }
        last = at;
    }
};

constexpr auto kSilence = std::chrono::milliseconds(500);  // longer than between any two frames

double seconds(recording::Microseconds time) {
    return std::chrono::duration<double>(time).count();
}

std::string arrivalsText(const Arrivals& arrivals) {
    std::string text = std::to_string(arrivals.count);
    if (arrivals.count > 1) {
        text += fmt::format(" in {:.3f} s; longest pause {:.3f} s, before number {}",
                            seconds(arrivals.last - arrivals.first), seconds(arrivals.longestPause),
                            arrivals.afterPause);
    }
    return text;
}

std::string errorText(const platform::ErrorRef& error) {
    return error != nullptr ? fmt::format(": {} {} {}", error->domain(), error->code(),
                                          error->localizedDescription())
                            : "";
}

// A call that failed says false or nothing; of those with neither result only the error tells.
bool isFailed(const Call& call) {
    const auto* number = call.result.number();
    return call.error != nullptr ||
           (number != nullptr && number->kind() == platform::Number::Kind::Boolean &&
            !number->isTrue());
}

using ArrivalsByKind = std::map<std::string_view, Arrivals>;

// How long nothing had come when the client gave up.
std::string silenceText(const Call& call,
                        recording::Microseconds at,
                        const ArrivalsByKind& arrivals) {
    const bool ends = call.operation == recording::Operation::Stop ||
                      call.operation == recording::Operation::Unschedule;
    recording::Microseconds last{0};
    for (const auto& [what, of] : arrivals) {
        last = std::max(last, of.last);
    }
    return ends && at - last > kSilence
               ? line("silence",
                      fmt::format("{:.3f} s before {}", seconds(at - last), nameOf(call.operation)))
               : "";
}

std::string showText(const recording::Recording& file, const std::string& path) {
    const recording::Session& session = file.session;
    std::string text;
    text += line("recording", fmt::format("{}, {} bytes", path, file.bytes));
    text += line("device", session.device + ": " + session.summary);
    for (const auto& [name, fact] : session.facts) {
        text += line(name, fact);
    }
    text += line("recorded", session.started + " by " + session.program);
    text += line("services", fmt::format("{}", fmt::join(session.services, ", ")));
    if (!session.parameters.empty()) {
        text += line("parameters", fmt::format("{}", fmt::join(session.parameters, ", ")));
    }
    std::size_t calls = 0;
    ArrivalsByKind arrivals;
    std::string runs;
    std::string silence;
    std::string failed;
    for (const Entry& entry : file.entries) {
        if (const auto* run = std::get_if<recording::Run>(&entry.content)) {
            runs += line("run", fmt::format("{} {}", run->name, run->number));
        } else if (const auto* call = std::get_if<Call>(&entry.content)) {
            ++calls;
            silence += silenceText(*call, entry.at, arrivals);
            if (isFailed(*call)) {
                failed += line("failed",
                               callText(call->operation, call->arguments) + errorText(call->error));
            }
        } else if (std::holds_alternative<recording::Frame>(entry.content)) {
            arrivals["frames"].add(entry.at);
        } else if (std::holds_alternative<recording::Event>(entry.content)) {
            arrivals["events"].add(entry.at);
        } else if (const auto* report = std::get_if<recording::Report>(&entry.content)) {
            arrivals["reports"].add(entry.at);
            failed += report->error != nullptr
                          ? line("failed", "input report" + errorText(report->error))
                          : "";
        } else if (std::holds_alternative<recording::Vanished>(entry.content)) {
            failed += line("failed", "a sensor vanished from the run loop");
        }
    }
    text += runs + line("calls", std::to_string(calls));
    for (const auto& [what, of] : arrivals) {
        text += line(what, arrivalsText(of));
    }
    text += silence + failed;
    for (const std::string& warning : file.warnings()) {
        text += line("missing", warning);
    }
    return text;
}

}  // namespace

std::string recordingCommand(const std::string& action, const std::string& file) {
    try {
        const auto read = recording::readRecording(file);
        return action == "show" ? showText(read, file) : profileOf(read, file);
    } catch (const recording::RecordingProblem& problem) {
        throw Problem(kExitUsage, problem.what());
    }
}

}  // namespace host
