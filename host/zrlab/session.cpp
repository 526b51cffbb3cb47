#include "host/zrlab/session.h"

#include <algorithm>
#include <cctype>
#include <charconv>
#include <chrono>
#include <filesystem>
#include <functional>
#include <memory>
#include <optional>
#include <set>
#include <string_view>
#include <utility>

#include "devices/observed/observe.h"
#include "devices/simulator/device.h"
#include "devices/simulator/profile/reader.h"
#include "frame/host_interface.h"
#include "host/report/html/page.h"
#include "host/report/json_report.h"
#include "host/report/jsonl_report.h"
#include "host/report/junit_report.h"
#include "host/report/text_report.h"
#include "host/run/judge.h"
#include "host/run/repeat_statistics.h"
#include "host/run/run_plan.h"
#include "host/run/run_recorder.h"
#include "host/run/sequence.h"
#include "host/zrlab/output_file.h"
#include "host/zrlab/progress.h"
#include "platform/run_loop.h"
#include "platform/services.h"

namespace host {

namespace {

int complain(int status, const std::string& problem) {
    Terminal::shared().complain(problem);
    return status;
}

// Beyond the greatest factor a device could outrun what validates its frames, and a run would depend
// on the machine's load.
constexpr double kLeastSpeed = 0.001;
constexpr double kMaxSpeed = 100;

std::optional<double> readSpeed(std::string_view text) {
    if (text == "max") {
        return kMaxSpeed;
    }
    double speed = 0;
    const auto [end, problem] = std::from_chars(text.data(), text.data() + text.size(), speed);
    const bool whole = problem == std::errc() && end == text.data() + text.size();
    return whole && speed >= kLeastSpeed && speed <= kMaxSpeed ? std::optional(speed)
                                                               : std::nullopt;
}

// A form that a finished session can be written in, and the file endings that ask for it.
struct Form {
    std::string_view name;
    std::string_view ending;
};
constexpr Form kForms[] = {
    {"text", ".txt"}, {"json", ".json"}, {"jsonl", ".jsonl"}, {"junit", ".xml"}, {"html", ".html"}};

std::string formOf(const std::string& file) {
    std::string ending = std::filesystem::path(file).extension().string();
    std::transform(ending.begin(), ending.end(), ending.begin(),
                   [](unsigned char c) { return static_cast<char>(std::tolower(c)); });
    for (const Form& form : kForms) {
        if (form.ending == ending) {
            return std::string(form.name);
        }
    }
    return "";
}

PlannedRecord plannedOf(const RunPlan& plan) {
    const auto partOf = [](const PartPlan& part) {
        return PartRecord{part.name, part.summary, part.parameters, 0};
    };
    return {plan.name, partOf(plan.experiment),
            plan.analysis.has_value() ? std::optional(partOf(*plan.analysis)) : std::nullopt};
}

// Shows log lines on standard error and hands them to the reports that stream.
class LogFanout {
  public:
    explicit LogFanout(bool shown) : _shown(shown) {}

    void addListener(std::shared_ptr<RunListener> listener) {
        _listeners.push_back(std::move(listener));
    }

    void operator()(const LogRecord& line) const {
        static constexpr std::string_view kLevels[] = {"debug", "log", "error"};
        if (_shown) {
            Terminal::shared().line(std::string(kLevels[static_cast<std::size_t>(line.level)]) +
                                    ": " + line.message);
        }
        for (const auto& listener : _listeners) {
            listener->logged(line);
        }
    }

  private:
    const bool _shown;
    // Owned: a time-out that outlives its run may log when the session is gone.
    std::vector<std::shared_ptr<RunListener>> _listeners;
};

class Session {
  public:
    explicit Session(const SessionOptions& options) : _options(options) {
        _record.version = options.version;
        _record.commandLine = options.commandLine;
    }

    int run() {
        if (const auto problem = _prepare()) {
            return complain(problem->first, problem->second);
        }
        const auto start = std::chrono::steady_clock::now();
        for (RunListener* listener : _listeners) {
            listener->sessionStarted(_record);
        }
        for (const RunPlan& plan : _plans) {
            if (!_outputFailed) {
                _repeat(plan);
            }
        }
        _record.seconds =
            std::chrono::duration<double>(std::chrono::steady_clock::now() - start).count();
        for (RunListener* listener : _listeners) {
            listener->sessionEnded(_record);
        }
        return _finish();
    }

  private:
    using Problem = std::pair<int, std::string>;

    std::optional<Problem> _prepare() {
        std::string problem;
        std::vector<ParameterSetting> settings;
        for (const std::string& text : _options.settings) {
            const auto setting = readSetting(text, problem);
            if (!setting.has_value()) {
                return Problem{kExitUsage, problem};
            }
            settings.push_back(*setting);
        }
        const auto speed = readSpeed(_options.speed);
        if (!speed.has_value()) {
            return Problem{kExitUsage, "--speed " + _options.speed +
                                           ": neither \"max\" nor a factor from 0.001 to 100"};
        }
        if (!_options.output.empty()) {
            const std::string told = formOf(_options.output);
            if (!told.empty() && told != _options.format) {
                return Problem{kExitUsage, "--output " + _options.output + ": its ending says " +
                                               told + ", the format is " + _options.format +
                                               "; a further report is asked for with --report"};
            }
            _files.emplace_back(_options.format, _options.output);
        }
        for (const std::string& file : _options.reports) {
            const std::string form = formOf(file);
            if (form.empty()) {
                return Problem{kExitUsage,
                               "--report " + file +
                                   ": its ending is none of .html, .json, .jsonl, .txt, .xml"};
            }
            _files.emplace_back(form, file);
        }
        if (const auto clash = _clashOfFiles()) {
            return Problem{kExitUsage, *clash};
        }
        auto plans = planRuns(ZRLab::defaultLab(), _options.names, settings, problem);
        if (!plans.has_value()) {
            return Problem{kExitUsage, problem};
        }
        _plans = std::move(*plans);
        for (const RunPlan& plan : _plans) {
            _record.planned.push_back(plannedOf(plan));
        }
        const auto profile = simulator::loadProfile(_options.device, problem);
        if (!profile.has_value()) {
            return Problem{kExitError, problem};
        }
        for (const auto& [form, file] : _files) {
            if (const auto cannot = cannotWrite(file)) {
                return Problem{kExitError, *cannot};
            }
        }
        _record.deviceName = profile->name;
        _record.deviceSummary = profile->summary;
        _openReports();
        _recorder = std::make_shared<RunRecorder>(_log, _wants("html"));
        _startLog();
        platform::installServices(
            observed::observe(simulator::makeDevice(*profile, *speed), _recorder));
        platform::RunLoop::forThisThread();  // some experiments need one
        return std::nullopt;
    }

    // Two reports in one file, or a report over the profile that it is made with.
    std::optional<std::string> _clashOfFiles() const {
        std::set<std::filesystem::path> seen;
        const auto add = [&seen](const std::string& file) {
            std::error_code none;
            const auto path = std::filesystem::weakly_canonical(file, none);
            const bool special = std::filesystem::exists(path, none) &&
                                 !std::filesystem::is_regular_file(path, none);
            return special || seen.insert(path).second;
        };
        add(_options.device);
        for (const auto& [form, file] : _files) {
            if (!add(file)) {
                return file + ": it cannot take this report, it is used for something else already";
            }
        }
        return std::nullopt;
    }

    bool _wants(std::string_view form) const {
        for (const auto& [wanted, file] : _files) {
            if (wanted == form) {
                return true;
            }
        }
        return false;
    }

    bool _writesToOutput(std::string_view form) const {
        return _options.output.empty() && _options.format == form;
    }

    // The forms that stream get a report of their own for each place they go to.
    void _openReports() {
        if (_writesToOutput("jsonl")) {
            _stream([this](std::string_view line) {
                _outputFailed |= !Terminal::shared().output(line);
            });
        }
        if (_wants("jsonl")) {
            _spool.emplace();
            _stream([this](std::string_view line) { _spool->append(line); });
        }
    }

    void _stream(std::function<void(std::string_view)> sink) {
        auto report = std::make_shared<JsonlReport>(std::move(sink));
        _listeners.push_back(report.get());
        _log.addListener(std::move(report));
    }

    void _startLog() {
        using platform::LogLevel;
        static constexpr std::pair<std::string_view, LogLevel> kLevels[] = {
            {"debug", LogLevel::Debug},
            {"default", LogLevel::Default},
            {"error", LogLevel::Error},
            {"off", LogLevel::Error}};
        for (const auto& [name, level] : kLevels) {
            if (name == _options.logLevel) {
                platform::setLogSink(_recorder, level);
            }
        }
    }

    void _repeat(const RunPlan& plan) {
        const bool repeats = _options.repeat > 0 || _options.untilFail;
        // Until a run fails, unless a number is given too.
        const std::uint64_t most =
            _options.repeat > 0 ? _options.repeat : (_options.untilFail ? UINT64_MAX : 1);
        RepeatStatistics statistics(plan.name);
        std::optional<RunRecord> kept;
        for (std::uint64_t number = 1; number <= most; ++number) {
            RunRecord run = _runWithProgress(plan, number, repeats ? most : 0);
            _record.verdict = worse(_record.verdict, run.verdict);
            if (repeats) {
                statistics.add(run);
                if (Terminal::shared().progressIsTerminal()) {
                    Terminal::shared().line(textLine(
                        run,
                        {.colour = Terminal::errorTakesColour(_options.colour), .verbose = false}));
                }
            }
            // Nor does a report go on that nobody can read any more.
            const bool stops =
                _outputFailed || (_options.untilFail && run.verdict != Verdict::Passed);
            if (!kept.has_value() || kept->verdict == Verdict::Passed) {
                kept = std::move(run);
            }
            if (stops) {
                break;
            }
        }
        _record.runs.push_back(std::move(*kept));
        if (repeats) {
            _record.repeats.push_back(statistics.record());
        }
        if (_writesToOutput("text")) {
            _outputFailed |= !Terminal::shared().output(_textOf(
                _record.runs.size() - 1, {.colour = Terminal::outputTakesColour(_options.colour),
                                          .verbose = _options.verbose}));
        }
    }

    RunRecord _runWithProgress(const RunPlan& plan, std::uint64_t number, std::uint64_t most) {
        std::string prefix;
        if (most != 0) {
            prefix = "run " + std::to_string(number) +
                     (most != UINT64_MAX ? " of " + std::to_string(most) : "") + "  ";
        }
        const Progress progress(plan, *_recorder, std::move(prefix));
        return runOnce(ZRLab::defaultLab(), plan, number, *_recorder, _listeners);
    }

    // The text of one name that was asked for; between two of them a blank line.
    std::string _textOf(std::size_t at, const TextStyle& style) const {
        std::string text = at > 0 ? "\n" : "";
        if (at < _record.repeats.size()) {
            text += textReport(_record.repeats[at], style) + "\n";
            text += "run " + std::to_string(_record.runs[at].number) + ":\n";
        }
        return text + textReport(_record.runs[at], style);
    }

    std::string _written(std::string_view form) const {
        if (form == "json") {
            return jsonReport(_record);
        }
        if (form == "junit") {
            return junitReport(_record);
        }
        if (form == "html") {
            return htmlReport(_record);
        }
        std::string text;
        for (std::size_t at = 0; at < _record.runs.size(); ++at) {
            text += _textOf(at, {.colour = false, .verbose = _options.verbose});
        }
        return text;
    }

    int _finish() {
        for (const std::string_view form : {"json", "junit"}) {
            if (_writesToOutput(form)) {
                _outputFailed |= !Terminal::shared().output(_written(form));
            }
        }
        bool failed = false;
        for (const auto& [form, file] : _files) {
            const auto problem =
                form == "jsonl" ? _spool->writeTo(file) : writeFile(file, _written(form));
            if (problem.has_value()) {
                complain(kExitError, *problem);
                failed = true;
            }
        }
        if (_outputFailed) {
            complain(kExitError, "cannot write standard output");
        }
        if (failed || _outputFailed) {
            return kExitError;
        }
        switch (_record.verdict) {
            case Verdict::Passed:
                return kExitPassed;
            case Verdict::Failed:
                return kExitFailed;
            case Verdict::Error:
                break;
        }
        return kExitError;
    }

    const SessionOptions& _options;
    SessionRecord _record;
    std::vector<RunPlan> _plans;
    std::vector<std::pair<std::string, std::string>> _files;  // form, path
    // The streamed form for files. Like `_outputFailed` it is touched by the report that streams, one
    // line at a time, and by this session once the report has ended.
    std::optional<Spool> _spool;
    std::vector<RunListener*> _listeners;  // owned by the log fan-out
    LogFanout _log{_options.logLevel != "off"};
    std::shared_ptr<RunRecorder> _recorder;
    bool _outputFailed = false;
};

}  // namespace

int runSession(const SessionOptions& options) {
    return Session(options).run();
}

}  // namespace host
