#include "host/report/replay.h"

#include <algorithm>
#include <cstddef>
#include <span>
#include <vector>

namespace host {

namespace {

constexpr std::size_t kFramesAtOnce = 32;

void replayRun(const RunRecord& whole, RunListener& listener) {
    RunRecord run = whole;
    run.failures.clear();
    // A misuse of the device is only written down when the run is over.
    const auto fail = [&](Part part, bool device) {
        for (const FailureRecord& failure : whole.failures) {
            if (failure.part == part && (failure.step == kStepDevice) == device) {
                run.failures.push_back(failure);
            }
        }
    };
    listener.runStarted(run);
    listener.partStarted(run, Part::Experiment);
    for (const LogRecord& line : run.log) {
        listener.logged(line);
    }
    for (std::size_t at = 0; at < run.frames.size(); at += kFramesAtOnce) {
        const auto frames =
            std::span(run.frames).subspan(at, std::min(kFramesAtOnce, run.frames.size() - at));
        // A record has no metadata.
        listener.framesDelivered({.frames = {frames.begin(), frames.end()},
                                  .metadata = std::vector<platform::Dictionary>(frames.size()),
                                  .events = {}});
    }
    fail(Part::Experiment, false);
    // What was given up does not end its part.
    if (run.verdict != Verdict::Interrupted) {
        listener.partEnded(run, Part::Experiment);
    }
    if (run.analysisSeconds.has_value()) {
        listener.partStarted(run, Part::Analysis);
        fail(Part::Analysis, false);
        listener.partEnded(run, Part::Analysis);
    }
    fail(Part::Experiment, true);
    listener.runEnded(run);
}

}  // namespace

void replay(const SessionRecord& session, RunListener& listener) {
    listener.sessionStarted(session);
    SessionRecord soFar = session;
    soFar.runs.clear();
    soFar.repeats.clear();
    for (std::size_t at = 0; at < session.runs.size(); ++at) {
        replayRun(session.runs[at], listener);
        soFar.runs.push_back(session.runs[at]);
        if (const RepeatRecord* repeat = session.repeatOf(at)) {
            soFar.repeats.push_back(*repeat);
        }
        listener.nameEnded(soFar);
    }
    listener.sessionEnded(session);
}

}  // namespace host
