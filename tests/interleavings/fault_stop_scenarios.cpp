// The fault experiment's stop: every trigger against every other, frames that come after it, a host that
// lets go.
#include <algorithm>
#include <map>
#include <memory>
#include <string>
#include <string_view>
#include <utility>
#include <vector>

#include "platform/log.h"
#include "platform/services.h"
#include "platform/sync.h"
#include "tests/support/one_stream_capture.h"
#include "tools/explore/scenario.h"
#include "tools/explore/scheduler.h"
#include "vantor_fault/fault_experiment.h"
#include "vantor_fault/frame_description.h"

namespace interleavings {

namespace {

enum class Frame { Lit, Unlit, WithoutMetadata };
enum class Trigger { None, LastFrame, UnlitFrame, BadMetadata, TimeOut };

constexpr std::string_view firstIs(Trigger trigger) {
    constexpr std::string_view kNames[] = {"nothing", "last frame first", "unlit frame first",
                                           "bad metadata first", "time-out first"};
    return kNames[static_cast<std::size_t>(trigger)];
}

struct Settings {
    std::vector<Frame> frames;
    int stopCount;
    std::vector<Trigger> frameTriggers;  // that come first in some orders; the time-out in others
    bool hostKeeps = false;              // the experiment, until everything has ended
    bool stopWaits = false;              // for a handler in progress
    bool firstInsideStart = false;  // the service delivers its first frame before start() returns
};

platform::ImageBufferRef makeBuffer(Frame frame) {
    if (frame == Frame::WithoutMetadata) {
        return std::make_shared<const platform::ImageBuffer>(platform::Dictionary());
    }
    static const platform::MutableDictionary& everyColumn = *[] {
        auto* metadata = new platform::MutableDictionary;
        std::string names = ZRVantorFrameDescription::csvRepresentationHeader();
        names.back() = ',';
        for (std::size_t begin = 0; begin < names.size();) {
            const std::size_t end = names.find(',', begin);
            metadata->set(std::string_view(names).substr(begin, end - begin), 1);
            begin = end + 1;
        }
        return metadata;
    }();
    platform::MutableDictionary metadata = everyColumn;
    metadata.set(kRylCaptureStreamMetadata_InfraredLightSource, frame == Frame::Lit ? 1 : 0);
    return test::bufferWith(platform::Dictionary(std::move(metadata)));
}

// What one execution showed. Threads run one at a time: no lock.
struct Witness {
    std::map<unsigned, Trigger> asks;  // what each thread is about to stop the stream for
    Trigger first = Trigger::None;     // whose stop it was
    int stops = 0;
    std::uint64_t counted = 0;
    std::uint64_t notCounted = 0;
    std::uint64_t processed = 0;
    std::vector<std::weak_ptr<const platform::ImageBuffer>> buffers;
    ZRExperimentResultRef result;
    platform::ErrorRef error;
};

class WitnessLog final : public platform::LogSink {
  public:
    explicit WitnessLog(std::shared_ptr<Witness> witness) : _witness(std::move(witness)) {}

    void write(const platform::LogLine& line) override {
        const std::string message(line.message);
        Trigger& asks = _witness->asks[thisThread()];
        unsigned long number = 0;
        if (std::sscanf(message.c_str(), "Received frame %lu.", &number) == 1) {
            expect(number == ++_witness->counted, "a gap: {}", message);
            asks = Trigger::BadMetadata;  // the only one on this thread, and not logged
        } else if (message.starts_with("Received frame that won't be counted")) {
            ++_witness->notCounted;
        } else if (std::sscanf(message.c_str(), "Processing frame %lu.", &number) == 1) {
            expect(number == ++_witness->processed, "a gap: {}", message);
        } else if (message.ends_with("failed projection validation.")) {
            asks = Trigger::UnlitFrame;
        } else if (message.ends_with("is the last frame.")) {
            asks = Trigger::LastFrame;
        } else if (message == "Timeout has been reached.") {
            asks = Trigger::TimeOut;
        }
        note(message);
    }

  private:
    const std::shared_ptr<Witness> _witness;
};

// The capture service with one camera: delivers the frames on a thread of its own, also after the stop.
class Camera final : public test::OneStreamCapture {
  public:
    Camera(Settings settings, std::shared_ptr<Witness> witness)
        : _settings(std::move(settings)), _witness(std::move(witness)) {}

    bool invalidate(platform::ErrorSlot error) override {
        step("invalidate");
        return OneStreamCapture::invalidate(error);
    }
    platform::Value valueForProperty(std::string_view property,
                                     platform::ErrorSlot error) override {
        step("valueForProperty");
        return OneStreamCapture::valueForProperty(property, error);
    }
    bool start(platform::ErrorSlot /*error*/) override {
        step("start");
        std::size_t next = 0;
        if (_settings.firstInsideStart) {
            _deliver(next++);
        }
        platform::startThread([this, self = shared_from_this(), next]() mutable {
            while (next < _settings.frames.size()) {
                _deliver(next++);
            }
        });
        return true;
    }
    bool stop(platform::ErrorSlot /*error*/) override {
        step("stop");
        expect(++_witness->stops == 1, "the stream is stopped twice");
        _witness->first = _witness->asks[thisThread()];
        expect(
            _witness->first != Trigger::TimeOut || _settings.frameTriggers.empty() || !stoodStill(),
            "the frames did not stop the stream");
        if (_settings.stopWaits) {
            const platform::MutexLock lock(_mutex);
            while (_inside) {
                _changed.wait(_mutex);
            }
        }
        return true;
    }

  private:
    void _deliver(std::size_t index) {
        const auto buffer = makeBuffer(_settings.frames[index]);
        _witness->buffers.push_back(buffer);
        const auto setInside = [this](bool inside) {
            if (_settings.stopWaits) {
                const platform::MutexLock lock(_mutex);
                _inside = inside;
                _changed.notifyAll();
            }
        };
        setInside(true);
        frameHandler()(buffer, {});
        setInside(false);
    }

    const Settings _settings;
    const std::shared_ptr<Witness> _witness;
    platform::Mutex _mutex;
    platform::Condition _changed;
    bool _inside = false;  // a handler is in progress
};

// Counts nothing.
class NoCounters final : public platform::MeterixFacility {
  public:
    std::shared_ptr<const platform::MeterixChannels> simpleChannels(
        platform::ErrorSlot /*error*/) override {
        return std::make_shared<const platform::MeterixChannels>();
    }
    std::shared_ptr<const platform::MeterixSamples> sample(
        const platform::MeterixChannels& /*channels*/, platform::ErrorSlot /*error*/) override {
        step("sample");
        return std::make_shared<const platform::MeterixSamples>();
    }
    std::shared_ptr<const platform::MeterixSamples> difference(
        const platform::MeterixSamples& later,
        const platform::MeterixSamples& /*baseline*/,
        platform::ErrorSlot /*error*/) override {
        return std::make_shared<const platform::MeterixSamples>(later);
    }
};

void expectOutcome(const Witness& seen, std::uint64_t stopCount) {
    const auto expectError = [&](std::string_view end) {
        expect(seen.result == nullptr && seen.error != nullptr && seen.error->code() == 206 &&
                   seen.error->localizedDescription().ends_with(end),
               "not the first trigger's outcome: {}",
               seen.error != nullptr ? seen.error->localizedDescription() : "no error");
    };
    const auto expectResult = [&](double atLeast) {
        expect(seen.error == nullptr && seen.result != nullptr, "not the first trigger's outcome");
        const double count = (*seen.result->measurements().find("FrameCount"))->doubleValue();
        expect(count >= atLeast && count <= static_cast<double>(seen.counted),
               "the result counts {} frames", count);
        expect(seen.result->measurements().contains("Projector"), "error counters are missing");
    };
    switch (seen.first) {
        case Trigger::LastFrame:
            return expectResult(static_cast<double>(stopCount));
        case Trigger::TimeOut:
            return expectResult(0);
        case Trigger::UnlitFrame:
            return expectError("is not illuminated for unknown reason!");
        case Trigger::BadMetadata:
            return expectError("Frame metadata is missing!");
        case Trigger::None:
            break;
    }
    expect(false, "a stop that nothing asked for");
}

std::function<void()> run(const Settings& settings) {
    const auto witness = std::make_shared<Witness>();
    platform::setLogSink(std::make_shared<WitnessLog>(witness), platform::LogLevel::Debug);
    platform::installServices({.capture = std::make_shared<Camera>(settings, witness),
                               .meterix = std::make_shared<NoCounters>()});
    leaveOutApart();  // nothing replaces the sink or the services meanwhile
    auto experiment = std::make_shared<ZRVantorFaultExperiment>();
    experiment->setupWithParameters({{"frameCount", settings.stopCount}, {"timeout", 1}}, nullptr,
                                    nullptr);
    witness->result = experiment->run(&witness->error);
    experiment->teardown(nullptr);
    platform::installServices({});  // nothing asks for them any more
    const std::weak_ptr<ZRVantorFaultExperiment> weak = experiment;
    if (!settings.hostKeeps) {
        experiment = nullptr;
    }
    return [=]() mutable {
        platform::setLogSink(nullptr, platform::LogLevel::Error);
        expect(witness->stops == 1, "{} stops", witness->stops);
        expectOutcome(*witness, static_cast<std::uint64_t>(settings.stopCount));
        const std::uint64_t received = witness->counted + witness->notCounted;
        expect(settings.hostKeeps ? received == settings.frames.size()
                                  : received <= settings.frames.size(),
               "{} frames were received", received);
        const auto whole =
            std::count_if(settings.frames.begin(),
                          settings.frames.begin() + static_cast<std::ptrdiff_t>(witness->counted),
                          [](Frame frame) { return frame != Frame::WithoutMetadata; });
        expect(witness->processed == static_cast<std::uint64_t>(whole),
               "{} of {} counted frames were processed", witness->processed, whole);
        reach(firstIs(witness->first));
        for (const auto& buffer : witness->buffers) {
            expect(buffer.expired(), "a buffer is kept");
        }
        experiment = nullptr;
        expect(weak.expired(), "the experiment is kept");
    };
}

}  // namespace

std::vector<Scenario> faultStopScenarios() {
    const auto scenario = [](std::string_view name, const Settings& settings) {
        Scenario made{name, [settings] { return run(settings); }, 1, {firstIs(Trigger::TimeOut)}};
        for (const Trigger trigger : settings.frameTriggers) {
            made.reaches.push_back(firstIs(trigger));
        }
        return made;
    };
    using enum Frame;
    using enum Trigger;
    return {
        scenario("fault-stop.last-frame",
                 {.frames = {Lit}, .stopCount = 1, .frameTriggers = {LastFrame}}),
        scenario("fault-stop.unlit-frame",
                 {.frames = {Unlit}, .stopCount = 1, .frameTriggers = {UnlitFrame}}),
        scenario("fault-stop.bad-metadata",
                 {.frames = {WithoutMetadata}, .stopCount = 1, .frameTriggers = {BadMetadata}}),
        scenario("fault-stop.time-out", {.frames = {Lit}, .stopCount = 9, .frameTriggers = {}}),
        scenario("fault-stop.last-frame-and-bad-metadata",
                 {.frames = {Lit, WithoutMetadata},
                  .stopCount = 1,
                  .frameTriggers = {LastFrame, BadMetadata}}),
        scenario("fault-stop.unlit-frame-and-bad-metadata",
                 {.frames = {Lit, Unlit, WithoutMetadata, Lit},
                  .stopCount = 2,
                  .frameTriggers = {UnlitFrame, BadMetadata}}),
        scenario("fault-stop.frames-after", {.frames = {Lit, Lit, Lit},
                                             .stopCount = 1,
                                             .frameTriggers = {LastFrame},
                                             .hostKeeps = true}),
        scenario("fault-stop.bad-frame-inside-start", {.frames = {WithoutMetadata, Lit},
                                                       .stopCount = 2,
                                                       .frameTriggers = {BadMetadata},
                                                       .firstInsideStart = true}),
        scenario("fault-stop.stop-waits-for-handler", {.frames = {Lit, WithoutMetadata, Unlit},
                                                       .stopCount = 2,
                                                       .frameTriggers = {BadMetadata},
                                                       .stopWaits = true}),
    };
}

}  // namespace interleavings
