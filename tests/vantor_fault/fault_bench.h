// What the fault experiment's tests stand on: a simulated device, a log that can be waited for, and
// a check after every test that nothing was misused or left behind.
#ifndef ZR_TESTS_VANTOR_FAULT_FAULT_BENCH_H
#define ZR_TESTS_VANTOR_FAULT_FAULT_BENCH_H

#include <algorithm>
#include <functional>
#include <memory>
#include <string>
#include <string_view>
#include <utility>
#include <vector>

#include <pthread.h>
#include <sys/resource.h>
#include <unistd.h>

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "devices/observed/capture.h"
#include "devices/simulator/capture_service.h"
#include "devices/simulator/meterix_facility.h"
#include "platform/log.h"
#include "platform/services.h"
#include "tests/support/capture_witness.h"
#include "tests/support/eventually.h"
#include "tests/support/is_error.h"
#include "vantor_fault/fault_experiment.h"

namespace test {

// Seconds that are never over within a test. What a time-out that long logs belongs to no test: in a
// process that runs many it may appear in the log of a later one.
inline constexpr double kLate = 20;

// Records the log's lines, and can hold a thread in one of them.
class LogRecorder final : public platform::LogSink {
  public:
    void write(const platform::LogLine& line) override {
        EXPECT_EQ(line.subsystem, "net.zerith-bench.diagnostics");
        EXPECT_EQ(line.category, "zerith");
        Thread thread{getpriority(PRIO_PROCESS, static_cast<id_t>(gettid())),
                      std::string(15, '\0')};
        pthread_getname_np(pthread_self(), thread.name.data(), thread.name.size() + 1);
        const platform::MutexLock lock(_mutex);
        _lines.push_back({line.level, std::string(line.message), std::move(thread)});
        while (!_held.empty() && line.message.starts_with(_held)) {
            _changed.wait(_mutex);
        }
    }

    // The next threads that log a line with this beginning stay in it until release().
    void hold(std::string beginning) {
        const platform::MutexLock lock(_mutex);
        _held = std::move(beginning);
    }
    void release() {
        hold("");
        _changed.notifyAll();
    }

    // How many lines of that level have this beginning.
    std::size_t count(platform::LogLevel level, std::string_view beginning) {
        const platform::MutexLock lock(_mutex);
        return static_cast<std::size_t>(
            std::count_if(_lines.begin(), _lines.end(), [&](const Line& line) {
                return line.level == level && line.message.starts_with(beginning);
            }));
    }
    // Whether such a line comes in a generous time.
    bool waitFor(platform::LogLevel level, std::string_view beginning) {
        return eventually([&] { return count(level, beginning) > 0; });
    }
    // The lines of that level.
    std::vector<std::string> messages(platform::LogLevel level) {
        const platform::MutexLock lock(_mutex);
        std::vector<std::string> messages;
        for (const Line& line : _lines) {
            if (line.level == level) {
                messages.push_back(line.message);
            }
        }
        return messages;
    }

    // The thread that logged the first line with this beginning.
    struct Thread {
        int nice;
        std::string name;
    };
    Thread threadOf(std::string_view beginning) {
        const platform::MutexLock lock(_mutex);
        return std::find_if(_lines.begin(), _lines.end(),
                            [&](const Line& line) { return line.message.starts_with(beginning); })
            ->thread;
    }

  private:
    struct Line {
        platform::LogLevel level;
        std::string message;
        Thread thread;
    };

    platform::Mutex _mutex;
    platform::Condition _changed;
    std::vector<Line> _lines ZR_GUARDED_BY(_mutex);
    std::string _held ZR_GUARDED_BY(_mutex);
};

// An error as a device service would report it.
platform::ErrorRef serviceError(std::string_view text);

// The infrared camera's stream without a device behind it: it accepts everything, and delivers what
// `onStart` delivers.
struct HandFedStream final : WLRylCaptureStream {
    HandFedStream();

    platform::Value valueForProperty(std::string_view property,
                                     platform::ErrorSlot /*error*/) override {
        asked.emplace_back(property);
        const platform::Value* value = values.find(property);
        return value != nullptr ? *value : platform::Value();
    }
    bool setValue(const platform::Value& value,
                  std::string_view forProperty,
                  platform::ErrorSlot /*error*/) override {
        values.set(forProperty, value);
        written.emplace_back(forProperty, value);
        return true;
    }
    bool start(platform::ErrorSlot /*error*/) override {
        onStart();
        return true;
    }
    bool stop(platform::ErrorSlot /*error*/) override {
        asked.emplace_back("stop");
        return true;
    }

    std::function<void()> onStart = [] {};
    platform::MutableDictionary values;  // the properties
    std::vector<std::pair<std::string, platform::Value>> written;
    std::vector<std::string> asked;  // the properties that were read, and "stop"
};

class FaultTest : public ::testing::Test {
  protected:
    using Experiment = ZRVantorFaultExperiment;

    FaultTest();
    ~FaultTest() override;

    // The infrared camera of the profile.
    simulator::StreamProfile& camera() { return capture.streams.back(); }
    // What is different in a frame.
    simulator::FrameOverride& at(std::uint64_t frame);

    // Makes the profiles the installed device. The one before must have all its buffers back.
    void install();
    // Makes a device of these streams the installed one.
    void install(WLRylCaptureStreamList streams);
    // An experiment that was set up.
    std::shared_ptr<Experiment> make(
        double frameCount,
        double timeout,
        std::string_view port = kRylCapturePortType_FrontFacingInfraredCamera);
    // Installs, runs an experiment and tears it down; the run's error ends up in `error`.
    ZRExperimentResultRef run(double frameCount, double timeout);

    // The handlers that a run installed: their caller plays the capture service.
    static WLRylFrameHandler frameHandler(const Experiment& experiment);
    static WLRylEventHandler eventHandler(const Experiment& experiment);
    static platform::ImageBufferRef buffer();  // of a lit frame

    std::size_t liveBuffers() const;

    simulator::CaptureProfile capture;  // one camera without jitter, a stream as fast as it goes
    simulator::MeterixProfile meterix = simulator::healthyMeterix();
    double speed = 0;
    platform::ErrorRef error;
    std::shared_ptr<LogRecorder> log = std::make_shared<LogRecorder>();

  private:
    std::shared_ptr<CaptureWitness> _witness = std::make_shared<CaptureWitness>();
    std::shared_ptr<observed::ObservedCapture> _plugIn;
    struct Made {
        std::weak_ptr<Experiment> experiment;
        long pending;  // references that stay after the test: the time-out's
    };
    std::vector<Made> _made;
};

}  // namespace test

#endif
