#include "host/run/lone_run.h"

#include <memory>
#include <utility>

#include "devices/observed/observe.h"
#include "frame/host_interface.h"
#include "host/run/bench_judge.h"
#include "host/run/run_recorder.h"
#include "host/run/sequence.h"
#include "platform/log.h"

namespace host {

RunRecord runAlone(platform::Services services,
                   const RunPlan& plan,
                   const std::vector<BenchLimit>* limits) {
    std::shared_ptr<BenchJudge> judge;
    RunRecorder::FramesDelivered framesDelivered;
    if (limits != nullptr) {
        judge = std::make_shared<BenchJudge>(*limits);
        framesDelivered = [judge](const FrameBatch& batch) { judge->add(batch); };
    }
    const auto recorder =
        std::make_shared<RunRecorder>([](const LogRecord&) {}, false, std::move(framesDelivered));
    platform::setLogSink(recorder, platform::LogLevel::Error);
    platform::installServices(observed::observe(std::move(services), recorder));
    return runOnce({.lab = ZRLab::defaultLab(),
                    .recorder = *recorder,
                    .listeners = {},
                    .judge = judge.get()},
                   plan, 1)
        .run;
}

}  // namespace host
