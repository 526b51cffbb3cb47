// Runs the three experiments on a device with faults, and looks at what each run left behind.
#ifndef ZR_TESTS_DEVICES_FAULTY_SWEEP_H
#define ZR_TESTS_DEVICES_FAULTY_SWEEP_H

#include <cstdint>
#include <functional>
#include <map>
#include <memory>
#include <string>
#include <string_view>
#include <vector>

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "devices/faulty/faulty_device.h"
#include "frame/host_interface.h"
#include "platform/log.h"
#include "platform/run_loop.h"

namespace test {

// The frames and images that a run asks for. The device goes on sending until it is stopped.
inline constexpr std::uint64_t kAskedFor = 3;

// A small device, as fast as its client: three cameras, a sensor between two other HID devices, a display, two event
// counters and one of another subgroup. The last camera has a projector and sends an event before its first frame.
platform::Services makeSmallDevice();

// An experiment as the host knows it.
struct Subject {
    std::shared_ptr<ZRExperiment> (*make)();
    // The parameters, with a time-out in seconds.
    std::function<platform::Dictionary(double)> parameters;
    double generous;  // a time-out that a run that goes on does not reach
};
extern const Subject kFaultExperiment;
extern const Subject kCounterExperiment;
extern const Subject kImageExperiment;

// What the slots hold where nothing was written.
extern const platform::ErrorRef kUntouched;

// How one run ended, its setup and teardown included.
struct Ending {
    ZRExperimentResultRef result = {};
    platform::ErrorRef error = kUntouched;  // of the setup or of the run
    std::string exception = {};             // that left the run; empty for none
    bool isTornDown = true;                 // true without a teardown
    platform::ErrorRef teardownError = kUntouched;
};

// Whether every run that gets there takes the step: a device sends what is asked for, and possibly more.
inline bool isCertain(const faulty::Step& step) {
    const std::uint64_t certain = step.place.kind == faulty::StepKind::Event ? 1 : kAskedFor;
    return step.place.kind <= faulty::StepKind::Call || step.place.number <= certain;
}

// How many threads there are, by name.
using Threads = std::map<std::string, std::size_t>;

class Sweep : public ::testing::Test {
  protected:
    Sweep();
    // Everything that the runs left behind goes within a generous time.
    ~Sweep() override;

    // Runs the experiment on the device, under the eyes of an observer, and checks what holds after every
    // run: it stopped the stream once if it had started it, broke no rule, holds no buffer and no thread, and
    // did not wait for a generous time-out. `name` stands for the run where one of these does not hold.
    Ending run(const Subject& subject,
               const faulty::FaultyDevice& device,
               double timeout,
               bool withSlot,
               const std::string& name);

  private:
    struct Left {
        std::string name;
        std::weak_ptr<const void> device;
        std::weak_ptr<ZRExperiment> experiment;
    };
    std::shared_ptr<platform::RunLoop> _runLoop = platform::RunLoop::forThisThread();
    Threads _threads;
    std::vector<Left> _left;
};

}  // namespace test

#endif
