#include "host/zrlab/session.h"

#include <algorithm>
#include <chrono>
#include <cstdint>
#include <memory>
#include <optional>
#include <stop_token>
#include <string>
#include <string_view>
#include <utility>
#include <vector>

#include "devices/observed/observe.h"
#include "frame/host_interface.h"
#include "host/record/problem.h"
#include "host/report/text_report.h"
#include "host/run/bench_judge.h"
#include "host/run/bench_limits.h"
#include "host/run/judge.h"
#include "host/run/planner.h"
#include "host/run/repeat_statistics.h"
#include "host/run/run_recorder.h"
#include "host/run/sequence.h"
#include "host/store/store_listener.h"
#include "host/zrlab/interrupt.h"
#include "host/zrlab/progress.h"
#include "host/zrlab/recording_session.h"
#include "host/zrlab/session_reports.h"
#include "host/zrlab/terminal.h"

namespace host {

namespace {

struct LogChoice {
    std::string_view name;
    platform::LogLevel minimum;
    bool isShown;  // on standard error; reports hold the lines in any case
};
constexpr LogChoice kLogChoices[] = {{"debug", platform::LogLevel::Debug, true},
                                     {"default", platform::LogLevel::Default, true},
                                     {"error", platform::LogLevel::Error, true},
                                     {"off", platform::LogLevel::Error, false}};

const LogChoice& logChoiceOf(std::string_view name) {
    for (const LogChoice& choice : kLogChoices) {
        if (choice.name == name) {
            return choice;
        }
    }
    throw Problem(kExitUsage, "--log " + std::string(name) + ": unknown level");
}

// A late line belongs to a run that is over, and shows only among the details.
void showLine(const LogRecord& line) {
    static constexpr std::string_view kLevels[] = {"debug", "log", "error"};
    Terminal::shared().line(
        (line.late ? "debug: late: "
                   : std::string(kLevels[static_cast<std::size_t>(line.level)]) + ": ") +
        line.message);
}

class Session {
  public:
    explicit Session(const SessionOptions& options) : _options(options) {
        _record.version = options.version;
        _record.commandLine = options.commandLine;
        _record.identity = options.identity;
        const RecordedSession recorded = recordedSession(options.device);
        const auto parameters = withRecorded(options.settings, recorded, options.names);
        _record.planned = planRuns(ZRLab::defaultLab(), options.names, readSettings(parameters));
        requireRecorded(options.names, recorded, options.device);
        _warnings = recorded.warnings;
        if (!options.limits.empty()) {
            _judge = std::make_shared<BenchJudge>(
                readBenchLimits(options.limits, runnableNames(ZRLab::defaultLab())));
        }
        _reports = std::make_shared<SessionReports>(options, _record);
        _listeners = _reports->listeners();
        if (!options.store.empty()) {
            _listeners.push_back(std::make_shared<StoreListener>(
                StoreOptions{.where = options.store,
                             .attachments = {options.storeFrames, options.storeImages}},
                [](const std::string& line) { Terminal::shared().complain(line); }));
        }
        devices::Device device = openDevice(options.device);
        if (_reports->recorder() != nullptr) {
            _reports->recorder()->record(device, parameters, options.version);
        }
        _record.deviceName = std::move(device.name);
        _record.deviceSummary = std::move(device.summary);
        _record.deviceFacts = std::move(device.facts);

        const LogChoice& log = logChoiceOf(options.logLevel);
        const auto lineLogged = [reports = _reports, log](const LogRecord& line) {
            if (log.isShown && (!line.late || log.minimum == platform::LogLevel::Debug)) {
                showLine(line);
            }
            for (const auto& report : reports->listeners()) {
                report->logged(line);
            }
        };
        const bool keepsFrames = !options.store.empty() && options.storeFrames;
        RunRecorder::FramesDelivered framesDelivered;
        const bool judgesFrames = _judge != nullptr && _judge->followsFrames();
        if (_reports->followFrames() || judgesFrames) {
            framesDelivered = [reports = _reports, judge = _judge](const FrameBatch& batch) {
                for (const auto& report : reports->listeners()) {
                    report->framesDelivered(batch);
                }
                if (judge != nullptr) {
                    judge->add(batch);
                }
            };
        }
        _recorder =
            std::make_shared<RunRecorder>(lineLogged, _reports->keepFrames() || keepsFrames,
                                          std::move(framesDelivered), _reports->needsDetails());
        platform::setLogSink(_recorder, log.minimum);
        platform::installServices(observed::observe(std::move(device.services), _recorder));
    }

    int run() {
        for (const std::string& warning : _warnings) {
            Terminal::shared().complain("warning: " + warning);
        }
        for (const std::string& warning : valueWarnings(_record.planned)) {
            Terminal::shared().complain(warning);
        }
        _warnOfUnusedLimits();
        const auto start = std::chrono::steady_clock::now();
        _stop = interrupt::deferFirst();
        _tell([this](RunListener& report) { report.sessionStarted(_record); });
        for (const RunPlan& plan : _record.planned) {
            if (!_mayStart()) {
                break;
            }
            _repeat(plan);
            _tell([this](RunListener& report) { report.nameEnded(_record); });
        }
        _keepLateLines(nullptr);
        _record.seconds =
            std::chrono::duration<double>(std::chrono::steady_clock::now() - start).count();
        _tell([this](RunListener& report) { report.sessionEnded(_record); });
        const bool isWritten = _reports->finish();
        if (_record.verdict == Verdict::Interrupted) {
            if (_isGivenUp) {
                Terminal::shared().leave(interrupt::exitStatus());
            }
            return interrupt::exitStatus();
        }
        return isWritten ? exitStatusOf(_record.verdict) : kExitError;
    }

  private:
    template <class Event>
    void _tell(const Event& event) {
        for (const auto& listener : _listeners) {
            event(*listener);
        }
    }

    // A station may have one file of limits for all that it runs; a file that is for none of it is a slip.
    void _warnOfUnusedLimits() const {
        const auto& planned = _record.planned;
        if (_judge != nullptr &&
            std::none_of(planned.begin(), planned.end(),
                         [&](const auto& plan) { return _judge->hasLimitsFor(plan.name); })) {
            Terminal::shared().complain("warning: " + _options.limits +
                                        " has no limits for what is run");
        }
    }

    // Whether another run may start. No more do once standard output cannot be written, or after a request
    // to stop, which leaves the session unfinished.
    bool _mayStart() {
        if (_stop.stop_requested()) {
            _record.verdict = Verdict::Interrupted;
        }
        return !_stop.stop_requested() && !_reports->outputFailed();
    }

    void _repeat(const RunPlan& plan) {
        const bool repeats = _options.repeat > 0 || _options.untilFail;
        // Until a run fails, unless a number is given too.
        const std::uint64_t most =
            _options.repeat > 0 ? _options.repeat : (_options.untilFail ? UINT64_MAX : 1);
        RepeatStatistics statistics(plan.name);
        std::optional<RunRecord> kept;
        for (std::uint64_t number = 1; number <= most && (number == 1 || _mayStart()); ++number) {
            RunRecord run = _runWithProgress(plan, number, repeats ? most : 0);
            _record.verdict = worse(_record.verdict, run.verdict);
            if (repeats) {
                statistics.add(run);
                _showLine(run);
            }
            const bool stops = _options.untilFail && run.verdict != Verdict::Passed;
            if (!kept.has_value() || kept->verdict == Verdict::Passed) {
                kept = std::move(run);
            }
            _keepLateLines(&*kept);
            if (stops) {
                break;
            }
        }
        _record.runs.push_back(std::move(*kept));
        if (repeats) {
            _record.repeats.push_back(statistics.record());
        }
    }

    RunRecord _runWithProgress(const RunPlan& plan, std::uint64_t number, std::uint64_t most) {
        std::string prefix;
        if (most != 0) {
            prefix = "run " + std::to_string(number) +
                     (most != UINT64_MAX ? " of " + std::to_string(most) : "") + "  ";
        }
        const Progress progress(plan, *_recorder, std::move(prefix));
        SequenceOutcome outcome = runOnce(
            {ZRLab::defaultLab(), *_recorder, _listeners, _stop, _judge.get()}, plan, number);
        _isGivenUp = outcome.isGivenUp;
        return std::move(outcome.run);
    }

    // Puts late log lines into the record of their run, if that is one that is kept: `kept` or one of the
    // session's.
    void _keepLateLines(RunRecord* kept) {
        for (auto& [tag, line] : _recorder->takeLateLines()) {
            if (kept != nullptr && kept->tag == tag) {
                kept->log.push_back(std::move(line));
                continue;
            }
            for (RunRecord& run : _record.runs) {
                if (run.tag == tag) {
                    run.log.push_back(std::move(line));
                    break;
                }
            }
        }
    }

    // One line per repetition, when a person watches.
    void _showLine(const RunRecord& run) const {
        if (Terminal::shared().progressIsTerminal()) {
            Terminal::shared().line(textLine(
                run, {.colour = Terminal::errorTakesColour(_options.colour), .verbose = false}));
        }
    }

    const SessionOptions& _options;
    SessionRecord _record;
    std::shared_ptr<SessionReports> _reports;
    std::vector<std::shared_ptr<RunListener>> _listeners;  // the reports, then the store
    std::shared_ptr<BenchJudge> _judge;  // null when there are no limits of the bench
    std::shared_ptr<RunRecorder> _recorder;
    std::vector<std::string> _warnings;  // what is missing in the recording that is replayed
    std::stop_token _stop;
    bool _isGivenUp = false;  // the last run
};

}  // namespace

int exitStatusOf(Verdict verdict) {
    static constexpr int kStatuses[] = {kExitPassed, kExitFailed, kExitError};
    return kStatuses[static_cast<std::size_t>(verdict)];
}

int runSession(const SessionOptions& options) {
    return Session(options).run();
}

}  // namespace host
