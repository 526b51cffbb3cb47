#include "host/report/junit_report.h"

#include <cstdint>
#include <sstream>
#include <string_view>

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

// Writes the suite of one run.
class Suite {
  public:
    Suite(pugi::xml_node node, const SessionRecord& session, const RunRecord& run)
        : _node(node), _session(session), _run(run) {}

    Counts write(const RepeatRecord* repeat) {
        setAttribute(_node, "name", _run.plan.name);
        setAttribute(_node, "timestamp", _run.started.timestamp());
        setSeconds(_node, repeat != nullptr ? repeat->seconds : _run.seconds);
        _properties = _node.append_child("properties");
        _property("device", _session.deviceName);
        _property("commandLine", _session.commandLine);
        for (const auto& [name, text] : _session.deviceFacts) {
            _property("device." + name, text);
        }
        _parameters(Part::Experiment);
        if (_run.analysisSeconds.has_value()) {
            _parameters(Part::Analysis);
        }
        for (const FailureRecord& failure : _run.failures) {
            _failedStep(failure);
        }
        if (repeat != nullptr) {
            _repetitions(*repeat);
        } else {
            _singleRun();
        }
        if (_counts.tests == 0) {
            setSeconds(_case("run"), _run.experimentSeconds);
        }
        std::string log;
        for (const LogRecord& line : _run.log) {
            log += fmt::format("{} {}: {}\n", line.time.timestamp(), levelText(line.level),
                               line.message);
        }
        if (!log.empty()) {
            setText(_node, "system-out", log);
        }
        setCounts(_node, _counts);
        _node.append_attribute("skipped").set_value(0);
        return _counts;
    }

  private:
    void _property(const std::string& name, std::string_view value) {
        pugi::xml_node property = _properties.append_child("property");
        setAttribute(property, "name", name);
        setAttribute(property, "value", value);
    }

    void _parameters(Part part) {
        for (const auto& [name, value] : partOf(_run, part).parameters) {
            _property(fmt::format("{}.{}", partText(part), name), value.text());
        }
    }

    pugi::xml_node _case(std::string_view name) {
        ++_counts.tests;
        pugi::xml_node node = _node.append_child("testcase");
        setAttribute(node, "name", name);
        setAttribute(node, "classname", _run.plan.name);
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
    void _result(std::string_view name, const std::string& finding, bool failed) {
        pugi::xml_node node = _case(name);
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
            _result(result.name,
                    fmt::format("{}, {}", valueText(result.value, result.unit),
                                limitLine(result.limit, result.unit)),
                    result.judgement == Judgement::Outside);
        }
        if (!_run.plan.isDiagnostic()) {
            for (const MeasurementRecord& one : _run.measurements) {
                _property("measurement." + one.name, valueText(one.value, one.unit));
            }
        }
    }

    void _repetitions(const RepeatRecord& repeat) {
        _property("runs", std::to_string(repeat.runs));
        _property("passed", std::to_string(repeat.passed));
        _property("failed", std::to_string(repeat.failed));
        _property("errors", std::to_string(repeat.errors));
        _property("run shown", std::to_string(_run.number));
        // A failed step of the run that is shown has a case of its own.
        if (repeat.errors > 0 && _run.failures.empty()) {
            const std::string message = fmt::format("{} of {} did not complete", repeat.errors,
                                                    plural(repeat.runs, "run", "runs"));
            _error(_case("repetitions"), "repetitions in error", message, message);
        }
        for (const ResultStatistics& result : repeat.results) {
            _result(result.name,
                    fmt::format("outside {} of {}: least {}, median {}, greatest {}, {}",
                                result.outside, plural(result.runs, "time", "times"),
                                numberText(result.minimum), numberText(result.median),
                                valueText(result.maximum, result.unit),
                                limitLine(result.limit, result.unit)),
                    result.outside > 0);
        }
    }

    pugi::xml_node _node;
    const SessionRecord& _session;
    const RunRecord& _run;
    pugi::xml_node _properties;
    Counts _counts;
};

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
        const RepeatRecord* repeat = at < session.repeats.size() ? &session.repeats[at] : nullptr;
        const Counts counts =
            Suite(root.append_child("testsuite"), session, session.runs[at]).write(repeat);
        total.tests += counts.tests;
        total.failures += counts.failures;
        total.errors += counts.errors;
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
