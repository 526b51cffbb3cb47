// The report for factory systems: Open Compute Project test-and-validation output, version 2.0, one
// artifact per line, written as it happens.
//
// The session is the test run; each part of each of its runs is a test step of its own. What the
// artifacts hold:
//   testRunStart   the planned runs with their parameters, the device as the unit under test
//   measurement    in an experiment's step what it measured; in an analysis's step each judged result
//                  with its limit as validators, which carry the limit's name
//   measurement    at the end of a run, in its last step, each quantity that a limit of the bench is on, with
//                  its limit as validators and metadata that names the bench; an error of the symptom
//                  "bench-limit-not-measured" when the run does not have it (a log line when the limit is not
//                  part of the verdict)
//   measurementSeries…  in the experiment's step one series per quantity of the frames that the page draws,
//                  side by side, some frames at a time
//   extension      one for each element of a list in the experiment's auxiliary data ("images"); one with
//                  the counts of frames delivered and lost ("frames")
//   error          symptom "domain-code" ("part-step" when there is no error object), the chain of
//                  causes as message; "interrupted" in the run when the program was asked to stop
//   diagnosis      one per diagnostic, and per experiment that the bench judges, in its last step: "NAME-pass", "NAME-fail", "NAME-error",
//                  "NAME-interrupted"
//   log            in the step that is open; in the run between steps, and for a line that came when its
//                  run had ended
// A timestamp is when the artifact is written. Of a session that was over when it began to be told, a stored run,
// it is when that happened: the start or end of the part or the run, the time of the log line before it.
// A name that was not started has one step, which ends with the status SKIP.
// Numbers are written as host/report/json_value.h says.
#ifndef ZR_HOST_REPORT_JSONL_REPORT_H
#define ZR_HOST_REPORT_JSONL_REPORT_H

#include <cstddef>
#include <cstdint>
#include <memory>
#include <optional>
#include <string>
#include <string_view>
#include <utility>
#include <vector>

#include <nlohmann/json_fwd.hpp>

#include "host/record/run_listener.h"
#include "host/report/report_form.h"
#include "platform/sync.h"

namespace host {

class JsonlReport final : public RunListener {
  public:
    // `sink` takes one or more whole lines, their line ends included. It is called on the thread that
    // makes them, one call at a time, with this report's lock held: it must not log.
    explicit JsonlReport(ReportSink sink) : _sink(std::move(sink)) {}

    void sessionStarted(const SessionRecord& session) override;
    void runStarted(const RunRecord& run) override;
    void partStarted(const RunRecord& run, Part part) override;
    // A line that comes after the session's end is dropped: nothing may follow the run's end.
    void logged(const LogRecord& line) override;
    void framesDelivered(const FrameBatch& batch) override;
    void partEnded(const RunRecord& run, Part part) override;
    void runEnded(const RunRecord& run) override;
    void sessionEnded(const SessionRecord& session) override;

  private:
    using Json = nlohmann::ordered_json;

    // Now; of a session that is over when it is told, what is told of then.
    platform::Date _time() const ZR_REQUIRES(_mutex);
    void _passTo(const platform::Date& time) ZR_REQUIRES(_mutex);
    void _write(std::string_view kind, Json artifact) ZR_REQUIRES(_mutex);
    void _writeRun(std::string_view kind, Json content) ZR_REQUIRES(_mutex);
    void _writeStep(std::string_view kind, Json content) ZR_REQUIRES(_mutex);
    // In the step that is open, else in the run.
    void _writeHere(std::string_view kind, Json content) ZR_REQUIRES(_mutex);
    // What the part has found, and its failures.
    void _writePart(const RunRecord& run, Part part) ZR_REQUIRES(_mutex);
    // The frame's elements, not yet to the sink.
    void _writeFrame(const FrameRecord& frame) ZR_REQUIRES(_mutex);
    // Their counts, and the end of their series.
    void _endFrames(const RunRecord& run) ZR_REQUIRES(_mutex);
    std::string _seriesId(std::size_t at) const ZR_REQUIRES(_mutex);
    void _writeFailures(const RunRecord& run) ZR_REQUIRES(_mutex);
    void _writeBenchResults(const RunRecord& run) ZR_REQUIRES(_mutex);
    void _closeStep() ZR_REQUIRES(_mutex);
    // Hands the lines made so far to the sink.
    void _flush() ZR_REQUIRES(_mutex);

    const ReportSink _sink;

    platform::Mutex _mutex;
    std::uint64_t _sequenceNumber ZR_GUARDED_BY(_mutex) = 0;
    std::uint64_t _steps ZR_GUARDED_BY(_mutex) = 0;
    std::string _unwritten ZR_GUARDED_BY(_mutex);  // lines on their way to the sink
    // The step that is open; empty when none is. It stays open until the next one begins or the
    // verdict is known: a diagnosis can only be written in a step.
    std::string _step ZR_GUARDED_BY(_mutex);
    bool _stepFailed ZR_GUARDED_BY(_mutex) = false;
    // The part that has started and not ended.
    std::optional<Part> _part ZR_GUARDED_BY(_mutex);
    std::optional<platform::Date> _past ZR_GUARDED_BY(_mutex);  // of a session that is over
    platform::Date _runStarted ZR_GUARDED_BY(_mutex) = platform::Date::now();
    // Of the frames of the run's experiment: its step as JSON text, the number of its first series, the
    // elements in each series so far, and the last frame written.
    std::string _stepText ZR_GUARDED_BY(_mutex);
    std::uint64_t _firstSeries ZR_GUARDED_BY(_mutex) = 0;
    std::vector<std::uint64_t> _seriesLengths ZR_GUARDED_BY(_mutex);
    std::optional<FrameRecord> _lastFrame ZR_GUARDED_BY(_mutex);
    std::size_t _failuresWritten ZR_GUARDED_BY(_mutex) = 0;
    bool _ended ZR_GUARDED_BY(_mutex) = false;
};

std::shared_ptr<RunListener> openJsonlReport(ReportSink sink, const TextStyle& style);

}  // namespace host

#endif
