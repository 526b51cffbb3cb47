#include "host/report/junit_report.h"

#include <algorithm>
#include <cstddef>
#include <cstdint>
#include <set>
#include <sstream>
#include <string_view>
#include <vector>

#include <fmt/format.h>
#include <pugixml.hpp>

#include "host/record/clean_text.h"
#include "host/record/run_text.h"

namespace host {

namespace {

struct Counts {
    std::uint64_t tests = 0;
    std::uint64_t failures = 0;
    std::uint64_t errors = 0;
    std::uint64_t skipped = 0;
};

void setAttribute(pugi::xml_node node, const char* name, std::string_view value) {
    node.append_attribute(name).set_value(cleanText(value).c_str());
}

void setSeconds(pugi::xml_node node, double seconds) {
    setAttribute(node, "time", fmt::format("{:.3f}", seconds));
}

void setText(pugi::xml_node node, const char* name, std::string_view text) {
    node.append_child(name).text().set(cleanText(text).c_str());
}

void setCounts(pugi::xml_node node, const Counts& counts) {
    node.append_attribute("tests").set_value(counts.tests);
    node.append_attribute("failures").set_value(counts.failures);
    node.append_attribute("errors").set_value(counts.errors);
}

// "DEVICE.NAME": a CI system takes the dots for levels and splits at blanks, so the device has neither.
std::string classNameOf(const SessionRecord& session, std::string_view name) {
    std::string device = session.deviceName;
    std::replace_if(
        device.begin(), device.end(), [](unsigned char c) { return c == '.' || c <= ' '; }, '_');
    return fmt::format("{}.{}", device, name);
}

// The names of the results that a run of this name has in the session.
std::vector<std::string_view> resultNames(const SessionRecord& session, std::string_view name) {
    std::vector<std::string_view> names;
    const auto add = [&names](const auto& results) {
        for (const auto& result : results) {
            if (std::find(names.begin(), names.end(), result.name) == names.end()) {
                names.push_back(result.name);
            }
        }
    };
    for (std::size_t at = 0; at < session.runs.size(); ++at) {
        if (session.runs[at].plan.name == name) {
            const RepeatRecord* repeat = session.repeatOf(at);
            add(session.runs[at].results);
            if (repeat != nullptr) {
                add(repeat->results);
            }
        }
    }
    return names;
}

// Writes the suite of one run.
class Suite {
  public:
    Suite(pugi::xml_node node,
          const SessionRecord& session,
          const RunRecord& run,
          const RepeatRecord* repeat)
        : _node(node)
        , _session(session)
        , _run(run)
        , _repeat(repeat)
        , _className(classNameOf(session, run.plan.name)) {}

    Counts write() {
        setAttribute(_node, "name", _run.plan.name);
        setAttribute(_node, "timestamp", _run.started.timestamp());
        setSeconds(_node, _repeat != nullptr ? _repeat->seconds : _run.seconds);
        _properties = _node.append_child("properties");
        _property("verdict", verdictText(_run.verdict));
        _property("uuid", _run.uuid);
        _identity();
        _property("version", _session.version);
        _property("commandLine", _session.commandLine);
        _property("device", _session.deviceName);
        _property("deviceSummary", _session.deviceSummary);
        for (const auto& [name, text] : _session.deviceFacts) {
            _property("device." + name, text);
        }
        _parameters(Part::Experiment);
        if (_run.analysisSeconds.has_value()) {
            _parameters(Part::Analysis);
        }
        if (_run.framesDelivered > 0) {
            _property("frames", framesText(_run));
        }
        // The results repeat the measurements.
        for (const MeasurementRecord& one : _run.measurements) {
            if (_run.results.empty()) {
                _property("measurement." + one.name, valueText(one.value, one.unit));
            }
        }
        for (const FailureRecord& failure : _run.failures) {
            _failedStep(failure);
        }
        if (_run.verdict == Verdict::Interrupted) {
            _error(_case("run"), "interrupted", headline(_run), headline(_run));
        }
        if (_repeat != nullptr) {
            _repetitions();
        } else {
            _singleRun();
        }
        _bench();
        if (_run.verdict >= Verdict::Error) {
            _missingResults();
        }
        if (_counts.tests == 0) {
            setSeconds(_case("run"), _run.experimentSeconds);
        }
        std::string log;
        for (const LogRecord& line : _run.log) {
            log += fmt::format("{} {}: {}\n", line.time.timestamp(), levelText(line), line.message);
        }
        if (!log.empty()) {
            setText(_node, "system-out", log);
        }
        setCounts(_node, _counts);
        _node.append_attribute("skipped").set_value(_counts.skipped);
        return _counts;
    }

  private:
    void _property(const std::string& name, std::string_view value) {
        pugi::xml_node property = _properties.append_child("property");
        setAttribute(property, "name", name);
        setAttribute(property, "value", value);
    }

    void _identity() {
        const Identity& identity = _session.identity;
        const auto add = [this](const std::string& name, const std::string& text) {
            if (!text.empty()) {
                _property(name, text);
            }
        };
        for (const auto& [name, text] : kIdentityEntries) {
            add(name, identity.*text);
        }
        for (const auto& [name, text] : identity.metadata) {
            _property("meta." + name, text);
        }
    }

    void _parameters(Part part) {
        for (const auto& [name, value] : partOf(_run, part).parameters) {
            _property(fmt::format("{}.{}", partText(part), name), value.text());
        }
    }

    pugi::xml_node _case(std::string_view name) {
        _cases.insert(std::string(name));
        return _case(name, _className);
    }

    pugi::xml_node _case(std::string_view name, const std::string& className) {
        ++_counts.tests;
        pugi::xml_node node = _node.append_child("testcase");
        setAttribute(node, "name", name);
        setAttribute(node, "classname", className);
        return node;
    }

    void _error(pugi::xml_node node,
                std::string_view type,
                std::string_view message,
                std::string_view text) {
        ++_counts.errors;
        pugi::xml_node error = node.append_child("error");
        setAttribute(error, "type", type);
        setAttribute(error, "message", message);
        error.text().set(cleanText(text).c_str());
    }

    void _failedStep(const FailureRecord& failure) {
        const pugi::xml_node node =
            _case(fmt::format("{} {}", partText(failure.part), failure.step));
        setSeconds(node, failure.part == Part::Analysis ? _run.analysisSeconds.value_or(0)
                                                        : _run.experimentSeconds);
        _error(node, symptomText(failure, " "), failureText(failure),
               fmt::format("{}\n{}", placeText(failure, _run), causeText(failure, "\n")));
    }

    // A measured result: its findings in one line, and whether it failed.
    void _result(pugi::xml_node node, const std::string& finding, bool failed) {
        if (failed) {
            ++_counts.failures;
            pugi::xml_node failure = node.append_child("failure");
            setAttribute(failure, "type", "outside its limit");
            setAttribute(failure, "message", finding);
            failure.text().set(cleanText(finding).c_str());
        } else {
            setText(node, "system-out", finding);
        }
    }

    void _singleRun() {
        for (const ResultRecord& result : _run.results) {
            _result(_case(result.name),
                    fmt::format("{}, {}", valueText(result.value, result.unit),
                                limitLine(result.limit, result.unit)),
                    result.judgement == Judgement::Outside);
        }
    }

    // The bench's limits have cases with a class name of their own. One that is not part of the verdict does
    // not fail; it is skipped when it was not measured.
    void _bench() {
        for (const BenchResult& result : _run.benchResults) {
            pugi::xml_node node = _case(result.name, _className + ".bench");
            const std::string finding = benchLine(result, true);
            if (result.judgement != Judgement::NotMeasured) {
                _result(node, finding, isBenchFinding(result));
            } else if (result.partOfVerdict) {
                _error(node, "not measured", finding, finding);
            } else {
                ++_counts.skipped;
                setAttribute(node.append_child("skipped"), "message", finding);
            }
        }
    }

    // The results that another run of the session shows to belong to this one, which has not got as far.
    void _missingResults() {
        for (const std::string_view name : resultNames(_session, _run.plan.name)) {
            if (_cases.count(std::string(name)) == 0) {
                ++_counts.skipped;
                setAttribute(_case(name).append_child("skipped"), "message",
                             "not known: the run " + headline(_run));
            }
        }
    }

    void _repetitions() {
        const RepeatRecord& repeat = *_repeat;
        _property("runs", std::to_string(repeat.runs));
        _property("passed", std::to_string(repeat.passed));
        _property("failed", std::to_string(repeat.failed));
        _property("errors", std::to_string(repeat.errors));
        _property("interrupted", std::to_string(repeat.interrupted));
        _property("run shown", std::to_string(_run.number));
        // A failed step of the run that is shown has a case of its own.
        if (repeat.errors > 0 && _run.failures.empty()) {
            const std::string message = fmt::format("{} of {} did not complete", repeat.errors,
                                                    plural(repeat.runs, "run", "runs"));
            _error(_case("repetitions"), "repetitions in error", message, message);
        }
        for (const ResultStatistics& result : repeat.results) {
            _result(_case(result.name), _spread(result), result.outside > 0);
        }
    }

    static std::string _spread(const ResultStatistics& result) {
        return fmt::format("outside {} of {}: least {}, median {}, greatest {}, {}", result.outside,
                           plural(result.runs, "time", "times"), numberText(result.minimum),
                           numberText(result.median), valueText(result.maximum, result.unit),
                           limitLine(result.limit, result.unit));
    }

    pugi::xml_node _node;
    const SessionRecord& _session;
    const RunRecord& _run;
    const RepeatRecord* const _repeat;  // null when the run was not repeated
    const std::string _className;
    pugi::xml_node _properties;
    std::set<std::string> _cases;
    Counts _counts;
};

// A suite of one case without a run: `outcome` is "skipped" or "error".
void writeSuite(pugi::xml_node suite,
                std::string_view name,
                const std::string& className,
                const char* outcome,
                std::string_view message) {
    const bool isError = std::string_view(outcome) == "error";
    setAttribute(suite, "name", name);
    pugi::xml_node node = suite.append_child("testcase");
    setAttribute(node, "name", "run");
    setAttribute(node, "classname", className);
    pugi::xml_node finding = node.append_child(outcome);
    setAttribute(finding, "type", isError ? "interrupted" : "not started");
    setAttribute(finding, "message", message);
    setCounts(suite, {.tests = 1, .errors = isError ? 1U : 0U});
    suite.append_attribute("skipped").set_value(isError ? 0 : 1);
}

}  // namespace

std::string junitReport(const SessionRecord& session) {
    pugi::xml_document document;
    pugi::xml_node declaration = document.append_child(pugi::node_declaration);
    declaration.append_attribute("version") = "1.0";
    declaration.append_attribute("encoding") = "UTF-8";
    pugi::xml_node root = document.append_child("testsuites");
    setAttribute(root, "name", "zrlab");
    setSeconds(root, session.seconds);
    Counts total;
    for (std::size_t at = 0; at < session.runs.size(); ++at) {
        const Counts counts =
            Suite(root.append_child("testsuite"), session, session.runs[at], session.repeatOf(at))
                .write();
        total.tests += counts.tests;
        total.failures += counts.failures;
        total.errors += counts.errors;
    }
    for (const RunPlan& plan : session.notStarted()) {
        writeSuite(root.append_child("testsuite"), plan.name, classNameOf(session, plan.name),
                   "skipped", "not started");
        ++total.tests;
    }
    // When no run that is shown was interrupted, the session has the error.
    const bool isShown =
        !session.runs.empty() && session.runs.back().verdict == Verdict::Interrupted;
    if (session.verdict == Verdict::Interrupted && !isShown) {
        writeSuite(root.append_child("testsuite"), "session", classNameOf(session, "session"),
                   "error", interruptionText(session));
        ++total.tests;
        ++total.errors;
    }
    setCounts(root, total);
    std::ostringstream out;
    document.save(out, "  ");
    return out.str();
}

std::shared_ptr<RunListener> openJunitReport(ReportSink sink, const TextStyle& /*style*/) {
    return wholeReport(std::move(sink), junitReport);
}

}  // namespace host
