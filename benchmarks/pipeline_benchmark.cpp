// Frames through receipt, description, hand-over and validation, as fast as a camera of eight buffers gets
// them back: the fault experiment itself, and the same steps on other queues and another map. In both the
// receiving thread asks for nice -5 and the processing thread for nice 10.
#include <atomic>
#include <memory>
#include <semaphore>
#include <string>
#include <thread>
#include <utility>

#include <benchmark/benchmark.h>

#include "benchmarks/metadata.h"
#include "benchmarks/queues.h"
#include "devices/simulator/meterix_facility.h"
#include "platform/log.h"
#include "platform/services.h"
#include "tests/support/hand_fed_camera.h"
#include "vantor_fault/fault_experiment.h"

namespace {

using test::Camera;

void reportPerFrame(benchmark::State& state, double switchesBefore) {
    const auto frames = state.iterations() * state.range(0);
    state.SetItemsProcessed(frames);
    state.counters["switches"] =
        (queues::contextSwitches() - switchesBefore) / static_cast<double>(frames);
}

void here(benchmark::State& state) {
    platform::setLogSink(nullptr, platform::LogLevel::Error);
    const auto image = test::bufferWith(metadata::Here::build(metadata::frameEntries()));
    const double switches = queues::contextSwitches();
    for (auto _ : state) {
        platform::installServices(
            {.capture =
                 std::make_shared<test::HandFedCapture>([image](std::int64_t) { return image; }),
             .meterix = simulator::makeMeterixFacility(
                 simulator::healthyMeterix(), std::make_shared<simulator::StreamProgress>())});
        const auto experiment = std::make_shared<ZRVantorFaultExperiment>();
        experiment->setupWithParameters({{"frameCount", state.range(0)}, {"timeout", 3600}},
                                        nullptr, nullptr);
        if (experiment->run(nullptr) == nullptr) {
            state.SkipWithError("the run failed");
            break;
        }
        // The pending time-out keeps the experiment; the camera ends here.
        experiment->setStream(nullptr);
        experiment->setDevice(nullptr);
        platform::installServices({});
    }
    reportPerFrame(state, switches);
}

// The same road on other queues, with metadata in a flat_hash_map. The last reference may go inside an item,
// so the camera and the queues, which join their threads, belong to its caller.
template <class Queue>
class Pipeline : public std::enable_shared_from_this<Pipeline<Queue>> {
  public:
    using Contender = metadata::FlatHashMap;
    using Image = metadata::FlatTextMap<Contender::Metadata>;
    using Buffer = Camera<Image>::Buffer;

    Pipeline(std::int64_t frames, Camera<Image>& camera, Queue& receiving, Queue& processing)
        : _frames(static_cast<std::uint64_t>(frames))
        , _camera(camera)
        , _receiving(receiving)
        , _processing(processing) {}

    void run() {
        _camera.start([weak = this->weak_from_this()](const Buffer& buffer, auto time) {
            if (const auto self = weak.lock()) {
                self->_handle(buffer, time);
            }
        });
        _done.acquire();
    }

  private:
    void _handle(Buffer buffer, platform::MediaTime time) {
        _receiving.async(
            [weak = this->weak_from_this(), buffer = std::move(buffer), time]() mutable {
                if (const auto self = weak.lock()) {
                    self->_receive(std::move(buffer), time);
                }
            });
    }
    void _receive(Buffer buffer, platform::MediaTime time) {
        if (_stop.load()) {
            return;
        }
        const std::uint64_t ordinal = ++_count;
        const auto attachment =
            buffer->find(kRylCaptureSampleBufferAttachmentKey_MetadataDictionary);
        if (attachment == buffer->end()) {
            return;
        }
        std::shared_ptr<const metadata::PlainDescription> description =
            Contender::describe(ordinal, time, attachment->second);
        if (description == nullptr) {
            return;
        }
        buffer.reset();
        _processing.async([self = this->shared_from_this(), description = std::move(description),
                           ordinal] { self->_process(*description, ordinal); });
    }
    void _process(const metadata::PlainDescription& description, std::uint64_t ordinal) {
        const auto source = description.infraredLightSource().template as<std::int32_t>();
        if ((source == 1 || source == 2) && ordinal >= _frames && !_stop.exchange(true)) {
            _camera.stop();
            _done.release();
        }
    }

    const std::uint64_t _frames;
    std::atomic<bool> _stop{false};
    std::atomic<std::uint64_t> _count{0};
    std::binary_semaphore _done{0};
    Camera<Image>& _camera;
    Queue& _receiving;
    Queue& _processing;
};

template <class Queue>
void peer(benchmark::State& state) {
    using Image = typename Pipeline<Queue>::Image;
    using Contender = typename Pipeline<Queue>::Contender;
    const auto image = std::make_shared<const Image>(
        Image{{std::string(kRylCaptureSampleBufferAttachmentKey_MetadataDictionary),
               Contender::build(metadata::frameEntries())}});
    const double switches = queues::contextSwitches();
    for (auto _ : state) {
        Queue processing(queues::kBackground);
        Queue receiving(queues::kUserInteractive);
        Camera<Image> camera([image](std::int64_t) { return image; });
        std::make_shared<Pipeline<Queue>>(state.range(0), camera, receiving, processing)->run();
    }
    reportPerFrame(state, switches);
}

[[maybe_unused]] const bool registered = [] {
    const auto add = [](const std::string& name, void (*function)(benchmark::State&)) {
        return benchmark::RegisterBenchmark(name.c_str(), function)->UseRealTime();
    };
    add("pipeline/here", here)->Arg(100'000);
    queues::visitEach<queues::LockedDeque, queues::AsioContext, queues::ConcurrentQueue>(
        [&add]<class Queue>(Queue*) {
            add(std::string("pipeline/") + Queue::kName, peer<Queue>)->Arg(100'000);
        });
    // For the memory of a whole process.
    for (const std::int64_t frames : {10, 300, 1000, 10'000, 30'000, 1'000'000}) {
        add("frames/here", here)->Arg(frames)->Iterations(1);
    }
    return true;
}();

}  // namespace
