// Deliberately broken devices: each is caught by the check that is named after it, and by no other.
#include "host/conformance/conformance.h"

#include <algorithm>
#include <cctype>
#include <memory>
#include <set>
#include <string>
#include <thread>
#include <utility>
#include <vector>

#include <gmock/gmock.h>

#include "devices/simulator/device.h"
#include "host/record/plugin_data.h"
#include "platform/display.h"
#include "tests/host/conformance/forwarding.h"

namespace {

using platform::Dictionary;
using platform::ImageBufferRef;
using platform::MediaTime;
using platform::Services;
using test::ErrorSlot;
using test::Value;
using testing::ElementsAre;
using testing::IsEmpty;

constexpr std::string_view kScaler = kRylCaptureStreamVideoOutputID_PrimaryScaler;
constexpr std::string_view kFrameHandler =
    kRylCaptureStreamVideoOutputHandlerKey_PixelBufferHandler;
constexpr std::string_view kMetadata = kRylCaptureSampleBufferAttachmentKey_MetadataDictionary;

devices::Device healthyDevice() {
    return {.name = "healthy", .summary = "", .services = simulator::makeDevice({}, 100)};
}

// What came of the checks of all services, by finding.
std::vector<std::string> checksThatAre(host::Finding finding, const devices::Device& device) {
    std::vector<std::string> names;
    for (const host::ServiceChecks& service : host::kServiceChecks) {
        if (service.has(device.services)) {
            for (const host::CheckRecord& check : service.check(device)) {
                if (check.finding == finding) {
                    names.emplace_back(check.promise.check);
                }
            }
        }
    }
    return names;
}

// A stream that puts a handler of its own in front of the client's.
struct Filtering : test::Stream {
    using Filter =
        std::function<void(const WLRylFrameHandler& client, const ImageBufferRef&, MediaTime)>;

    Filtering(std::shared_ptr<WLRylCaptureStream> of, Filter with)
        : Stream(std::move(of)), filter(std::move(with)) {}

    bool setValue(const Value& value, std::string_view property, ErrorSlot error) override {
        if (property != kRylCaptureStreamProperty_VideoOutputHandlers) {
            return Stream::setValue(value, property, error);
        }
        client = *value[kScaler][kFrameHandler].object<WLRylFrameHandler>();
        WLRylFrameHandler mine = [handler = client, with = filter](const ImageBufferRef& buffer,
                                                                   MediaTime time) {
            with(handler, buffer, time);
        };
        return Stream::setValue(
            Dictionary{{kScaler, Dictionary{{kFrameHandler, Value::opaque(std::move(mine))}}}},
            property, error);
    }

    const Filter filter;
    WLRylFrameHandler client;
};

void breakCamera(Services& services, test::PlugIn::Wrap wrap) {
    services.capture = std::make_shared<test::PlugIn>(services.capture, std::move(wrap));
}
void breakStreams(Services& services, const test::Camera::Wrap& wrap) {
    breakCamera(services,
                [wrap](auto device) { return std::make_shared<test::Camera>(device, wrap); });
}
void breakFrames(Services& services, const Filtering::Filter& filter) {
    breakStreams(services,
                 [filter](auto stream) { return std::make_shared<Filtering>(stream, filter); });
}

template <class Broken>
void breakSensor(Services& services) {
    services.hid =
        std::make_shared<test::Hid>(services.hid, [](const test::Manager::Devices& devices) {
            test::Manager::Devices wrapped;
            for (const auto& device : devices) {
                wrapped.push_back(std::make_shared<Broken>(device));
            }
            return wrapped;
        });
}

ImageBufferRef numbered(std::int64_t number) {
    return std::make_shared<platform::ImageBuffer>(
        Dictionary{{kMetadata, Dictionary{{host::kSensorFrameNumber, number}}}});
}

struct StoresErrorOnSuccess : test::Stream {
    using Stream::Stream;
    bool start(ErrorSlot error) override {
        static_cast<void>(platform::fail(error, "Board", 1, nullptr, "Nothing."));
        return Stream::start(error);
    }
};

struct CallsWhenItGoes : test::Camera {
    using Camera::Camera;
    ~CallsWhenItGoes() override {
        for (const auto& stream : wrapped) {
            if (const auto& client = static_cast<Filtering&>(*stream).client) {
                client(nullptr, {});
            }
        }
    }
};

struct TurnsStreamsRound : test::Camera {
    using Camera::Camera;
    std::optional<WLRylCaptureStreamList> streams(ErrorSlot error) override {
        std::reverse(wrapped.begin(), wrapped.end());
        return Camera::streams(error);
    }
};

struct WrongWayRound : test::Meterix {
    using Meterix::Meterix;
    std::shared_ptr<const platform::MeterixSamples> difference(
        const platform::MeterixSamples& later,
        const platform::MeterixSamples& baseline,
        ErrorSlot error) override {
        return Meterix::difference(baseline, later, error);
    }
};

struct OwnOrder : test::Meterix {
    using Meterix::Meterix;
    std::shared_ptr<const platform::MeterixSamples> sample(
        const platform::MeterixChannels& channels, ErrorSlot error) override {
        platform::MeterixSamples samples = *Meterix::sample(channels, error);
        std::sort(samples.begin(), samples.end(), [](const auto& a, const auto& b) {
            return a.channel().channelDescription().name() <
                   b.channel().channelDescription().name();
        });
        return std::make_shared<platform::MeterixSamples>(std::move(samples));
    }
};

struct LeavesOneOut : test::Meterix {
    using Meterix::Meterix;
    std::shared_ptr<const platform::MeterixSamples> sample(
        const platform::MeterixChannels& channels, ErrorSlot error) override {
        platform::MeterixSamples samples = *Meterix::sample(channels, error);
        samples.pop_back();
        return std::make_shared<platform::MeterixSamples>(std::move(samples));
    }
};

struct OpensTwice : test::Sensor {
    using Sensor::Sensor;
    bool open(ErrorSlot error) override { return Sensor::open(error) || true; }
};

struct ClosesTwice : test::Sensor {
    using Sensor::Sensor;
    bool close(ErrorSlot error) override { return Sensor::close(error) || true; }
};

// Its reports come in place of the sensor's.
struct ReportsItself : test::Sensor {
    using Sensor::Sensor;
    void setInputReportCallback(WLHIDInputReportCallback callback) override {
        client = std::move(callback);
    }
    void report(std::byte first = std::byte{118}) const {
        if (client) {
            const std::vector<std::byte> data(792, first);
            client(118, data, nullptr);
        }
    }
    WLHIDInputReportCallback client;
};

struct ReportsUnscheduled : test::Sensor {
    using Sensor::Sensor;
    void setInputReportCallback(WLHIDInputReportCallback callback) override {
        if (callback) {
            const std::vector<std::byte> data(792, std::byte{118});
            callback(118, data, nullptr);
        }
        Sensor::setInputReportCallback(std::move(callback));
    }
};

struct ReportsElsewhere : ReportsItself {
    using ReportsItself::ReportsItself;
    void scheduleWithRunLoop(const std::shared_ptr<platform::RunLoop>& runLoop,
                             std::string_view mode) override {
        Sensor::scheduleWithRunLoop(runLoop, mode);
        std::jthread([this] {
            for (int count = 0; count < 3; ++count) {
                report();
            }
        }).join();
        // The loop was stopped before it ran.
        source = std::make_shared<platform::RunLoopSource>([runLoop] { runLoop->stop(); });
        runLoop->addSource(source, mode);
        source->signal();
    }
    std::shared_ptr<platform::RunLoopSource> source;
};

// A report waits for a turn that begins for another reason.
struct LosesWakeUps : ReportsItself {
    using ReportsItself::ReportsItself;
    void scheduleWithRunLoop(const std::shared_ptr<platform::RunLoop>& runLoop,
                             std::string_view mode) override {
        source = std::make_shared<platform::RunLoopSource>([] {});
        runLoop->addSource(source, mode);
        observer = std::make_shared<platform::RunLoopObserver>(
            platform::RunLoopObserver{platform::RunLoopEntry, 0, [this](std::uint32_t) {
                                          if (++runs > 1) {
                                              report();
                                          }
                                      }});
        runLoop->addObserver(observer, mode);
    }
    void unscheduleFromRunLoop(const std::shared_ptr<platform::RunLoop>& runLoop,
                               std::string_view mode) override {
        runLoop->removeSource(source, mode);
        runLoop->removeObserver(observer, mode);
    }
    int runs = 0;
    std::shared_ptr<platform::RunLoopSource> source;
    std::shared_ptr<platform::RunLoopObserver> observer;
};

struct HidesTheId : test::Sensor {
    using Sensor::Sensor;
    void setInputReportCallback(WLHIDInputReportCallback callback) override {
        Sensor::setInputReportCallback(
            callback == nullptr
                ? WLHIDInputReportCallback()
                : [client = std::move(callback)](std::int64_t id, std::span<const std::byte> data,
                                                 const platform::ErrorRef& error) {
                      client(id, data.subspan(1), error);
                  });
    }
};

struct NullChannel : test::Meterix {
    using Meterix::Meterix;
    std::shared_ptr<const platform::MeterixChannels> simpleChannels(ErrorSlot error) override {
        platform::MeterixChannels channels = *Meterix::simpleChannels(error);
        channels.front() = nullptr;
        return std::make_shared<platform::MeterixChannels>(std::move(channels));
    }
};

struct StoresADisplay : platform::DisplayService {
    int mainDisplay(platform::DisplayId& display) override {
        display = 1;
        return -1;
    }
    platform::RegistryObject registryObject(platform::DisplayId /*display*/) override { return 0; }
};

struct InventsObjects : platform::DisplayService {
    explicit InventsObjects(std::shared_ptr<DisplayService> of) : inner(std::move(of)) {}
    int mainDisplay(platform::DisplayId& display) override { return inner->mainDisplay(display); }
    platform::RegistryObject registryObject(platform::DisplayId display) override {
        const platform::RegistryObject object = inner->registryObject(display);
        return object != 0 ? object : 7;
    }
    const std::shared_ptr<DisplayService> inner;
};

// Of the empty object, or of all others.
struct InventsProperties : platform::DeviceRegistry {
    InventsProperties(std::shared_ptr<DeviceRegistry> of, bool empty)
        : inner(std::move(of)), ofEmpty(empty) {}
    Value property(platform::RegistryObject object, std::string_view name) override {
        return (object == 0) == ofEmpty ? Value(true) : inner->property(object, name);
    }
    const std::shared_ptr<DeviceRegistry> inner;
    const bool ofEmpty;
};

struct BrokenDevice {
    const char* check;
    void (*breakIt)(Services& services);
};

const BrokenDevice kBroken[] = {
    {"error slot written on success",
     [](Services& services) {
         breakStreams(services,
                      [](auto stream) { return std::make_shared<StoresErrorOnSuccess>(stream); });
     }},
    {"streams in another order",
     [](Services& services) {
         breakCamera(services, [](auto device) {
             return std::make_shared<TurnsStreamsRound>(
                 device, [](auto stream) { return std::make_shared<test::Stream>(stream); });
         });
     }},
    {"frame handlers that overlap",
     [](Services& services) {
         breakFrames(services, [](const auto& client, const auto& buffer, MediaTime time) {
             std::jthread other([&] { client(nullptr, time); });
             client(buffer, time);
         });
     }},
    {"time going backwards",
     [](Services& services) {
         breakFrames(services, [](const auto& client, const auto& buffer, MediaTime time) {
             time.value = -time.value;
             client(buffer, time);
         });
     }},
    {"frames out of order",
     [](Services& services) {
         breakFrames(services, [count = std::make_shared<std::int64_t>(100)](
                                   const auto& client, const auto&, MediaTime time) {
             client(numbered(--*count), time);
         });
     }},
    {"buffer reused while referenced",
     [](Services& services) {
         breakFrames(services,
                     [only = std::make_shared<platform::ImageBuffer>(Dictionary())](
                         const auto& client, const auto&, MediaTime time) { client(only, time); });
     }},
    {"buffer changed while referenced",
     [](Services& services) {
         breakFrames(services, [last = std::make_shared<std::shared_ptr<platform::ImageBuffer>>()](
                                   const auto& client, const auto& buffer, MediaTime time) {
             const auto copy = std::make_shared<platform::ImageBuffer>(*buffer);
             if (*last != nullptr) {
                 **last = *copy;
             }
             *last = copy;
             client(copy, time);
         });
     }},
    {"handler called after invalidation",
     [](Services& services) {
         breakCamera(services, [](auto device) {
             return std::make_shared<CallsWhenItGoes>(device, [](auto stream) {
                 return std::make_shared<Filtering>(
                     stream, [](const auto& client, const auto& buffer, MediaTime time) {
                         client(buffer, time);
                     });
             });
         });
     }},
    {"difference the wrong way round",
     [](Services& services) {
         services.meterix = std::make_shared<WrongWayRound>(services.meterix);
     }},
    {"channel that is null",
     [](Services& services) {
         services.meterix = std::make_shared<NullChannel>(services.meterix);
     }},
    {"samples in another order than the channels",
     [](Services& services) { services.meterix = std::make_shared<OwnOrder>(services.meterix); }},
    {"samples missing or too many",
     [](Services& services) {
         services.meterix = std::make_shared<LeavesOneOut>(services.meterix);
     }},
    {"manager that returns a device twice",
     [](Services& services) {
         services.hid =
             std::make_shared<test::Hid>(services.hid, [](test::Manager::Devices devices) {
                 if (!devices.empty()) {
                     devices.push_back(devices.front());
                 }
                 return devices;
             });
     }},
    {"device that does not match",
     [](Services& services) {
         services.hid = std::make_shared<test::Hid>(
             services.hid, [all = std::make_shared<test::Manager::Devices>()](
                               const test::Manager::Devices& devices) {
                 *all = devices.empty() ? *all : devices;
                 return *all;
             });
     }},
    {"reports delivered while not scheduled", breakSensor<ReportsUnscheduled>},
    {"reports on another thread", breakSensor<ReportsElsewhere>},
    {"lost wake-up", breakSensor<LosesWakeUps>},
    {"report without its ID", breakSensor<HidesTheId>},
    {"open that succeeds twice", breakSensor<OpensTwice>},
    {"close that succeeds twice", breakSensor<ClosesTwice>},
    {"display stored by a call that failed",
     [](Services& services) { services.display = std::make_shared<StoresADisplay>(); }},
    {"registry object of no display",
     [](Services& services) {
         services.display = std::make_shared<InventsObjects>(services.display);
     }},
    {"property of the empty object",
     [](Services& services) {
         services.registry = std::make_shared<InventsProperties>(services.registry, true);
     }},
    {"property of a name that is not there",
     [](Services& services) {
         services.registry = std::make_shared<InventsProperties>(services.registry, false);
     }},
};

TEST(Conformance, OfAHealthyDeviceIsCheckedAndKept) {
    const devices::Device device = healthyDevice();
    EXPECT_THAT(checksThatAre(host::Finding::Broken, device), IsEmpty());
    // A device that has a display shows nothing of a call that fails.
    EXPECT_THAT(checksThatAre(host::Finding::NotChecked, device),
                ElementsAre("display stored by a call that failed"));
}

TEST(Conformance, HasABrokenDeviceForEachCheck) {
    std::set<std::string> checks;
    for (const host::Finding finding : {host::Finding::Kept, host::Finding::NotChecked}) {
        for (std::string& name : checksThatAre(finding, healthyDevice())) {
            checks.insert(std::move(name));
        }
    }
    std::set<std::string> caught;
    for (const BrokenDevice& broken : kBroken) {
        caught.insert(broken.check);
    }
    EXPECT_EQ(caught, checks);
}

class Broken : public testing::TestWithParam<BrokenDevice> {};

TEST_P(Broken, IsCaughtByItsOwnCheckAndNoOther) {
    devices::Device device = healthyDevice();
    GetParam().breakIt(device.services);
    EXPECT_THAT(checksThatAre(host::Finding::Broken, device), ElementsAre(GetParam().check));
}

INSTANTIATE_TEST_SUITE_P(Devices, Broken, testing::ValuesIn(kBroken), [](const auto& info) {
    std::string name = info.param.check;
    std::replace_if(
        name.begin(), name.end(), [](unsigned char c) { return std::isalnum(c) == 0; }, '_');
    return name;
});

// Such a device is silent in any case, so silence shows nothing.
TEST(Conformance, CountsWhatADeviceRefusesAsNotChecked) {
    const auto busy =
        simulator::Fault::failing(std::make_shared<platform::Error>("Board", 5, "Busy.", nullptr));
    simulator::DeviceProfile profile;
    profile.capture.streams.back().start = busy;
    for (simulator::HidDeviceProfile& sensor : profile.hid.devices) {
        sensor.featureReports[171] = busy;
    }
    const devices::Device device{
        .name = "", .summary = "", .services = simulator::makeDevice(profile, 100)};
    EXPECT_THAT(checksThatAre(host::Finding::Broken, device), IsEmpty());
    EXPECT_THAT(
        checksThatAre(host::Finding::NotChecked, device),
        ElementsAre("display stored by a call that failed", "reports delivered while not scheduled",
                    "reports on another thread", "lost wake-up", "report without its ID",
                    "frame handlers that overlap", "time going backwards", "frames out of order",
                    "buffer reused while referenced", "buffer changed while referenced",
                    "handler called after invalidation"));

    const host::RunRecord run = host::runOfChecks(host::kServiceChecks[3], device);
    EXPECT_EQ(run.verdict, host::Verdict::Passed);
    ASSERT_THAT(run.benchResults, testing::SizeIs(6));
    EXPECT_EQ(run.benchResults.front().note, "not checked: start() failed: Busy.");
}

}  // namespace
