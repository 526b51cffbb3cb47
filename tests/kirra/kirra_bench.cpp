#include "tests/kirra/kirra_bench.h"

#include <utility>

#include "devices/observed/hid.h"
#include "platform/text_format.h"

namespace test {

namespace {

// A device that notes down what is done with it, and lets it happen.
struct TappedDevice final : WLIOHIDDeviceInterface {
    TappedDevice(std::shared_ptr<WLIOHIDDeviceInterface> tapped, std::shared_ptr<Tap> into)
        : device(std::move(tapped)), tap(std::move(into)) {}

    bool open(platform::ErrorSlot error) override {
        tap->journal.push_back("open");
        return device->open(error);
    }
    void setInputReportCallback(WLHIDInputReportCallback callback) override {
        tap->journal.push_back(callback ? "callback" : "no callback");
        if (callback) {
            tap->callback = callback;
        }
        device->setInputReportCallback(std::move(callback));
    }
    bool setFeatureReportWithID(std::int64_t reportID,
                                std::span<const std::byte> data,
                                platform::ErrorSlot error) override {
        std::string line = platform::format("feature %@:", reportID);
        for (const std::byte byte : data) {
            line += platform::format(" %d", std::to_integer<int>(byte));
        }
        tap->journal.push_back(std::move(line));
        return device->setFeatureReportWithID(reportID, data, error);
    }
    void scheduleWithRunLoop(const std::shared_ptr<platform::RunLoop>& runLoop,
                             std::string_view mode) override {
        tap->journal.push_back(platform::format("schedule in %@", mode));
        device->scheduleWithRunLoop(runLoop, mode);
    }
    void unscheduleFromRunLoop(const std::shared_ptr<platform::RunLoop>& runLoop,
                               std::string_view mode) override {
        tap->journal.push_back(platform::format("unschedule from %@%@", mode,
                                                runLoop != nullptr ? "" : " of no loop"));
        device->unscheduleFromRunLoop(runLoop, mode);
    }
    bool close(platform::ErrorSlot error) override {
        tap->journal.push_back(error == nullptr ? "close" : "close with a slot");
        return device->close(error);
    }

    const std::shared_ptr<WLIOHIDDeviceInterface> device;
    const std::shared_ptr<Tap> tap;
};

// The bus, and a manager of it.
struct TappedBus final : platform::HidFacility, WLHIDManager {
    TappedBus(std::shared_ptr<platform::HidFacility> tapped,
              std::shared_ptr<WLHIDManager> itsManager,
              std::shared_ptr<Tap> into)
        : bus(std::move(tapped)), manager(std::move(itsManager)), tap(std::move(into)) {}

    std::shared_ptr<WLHIDManager> createManager() override {
        auto made = bus->createManager();
        return made != nullptr ? std::make_shared<TappedBus>(bus, std::move(made), tap) : nullptr;
    }
    void enumerateDevicesMatching(const std::vector<platform::Dictionary>& matching) override {
        manager->enumerateDevicesMatching(matching);
    }
    std::vector<std::shared_ptr<WLIOHIDDeviceInterface>> devices() override {
        auto devices = manager->devices();
        for (auto& device : devices) {
            device = std::make_shared<TappedDevice>(std::move(device), tap);
        }
        return devices;
    }

    const std::shared_ptr<platform::HidFacility> bus;
    const std::shared_ptr<WLHIDManager> manager;
    const std::shared_ptr<Tap> tap;
};

}  // namespace

const Journal kOpening = {"open", "callback", "feature 171: 171 1", "feature 172: 172 1",
                          "schedule in platform.run-loop.default"};
const Journal kClosing = {"no callback", "unschedule from platform.run-loop.default", "close"};

Journal joined(Journal first, const Journal& second) {
    first.insert(first.end(), second.begin(), second.end());
    return first;
}

platform::ErrorRef sensorError(std::string_view text) {
    return std::make_shared<const platform::Error>("sensor", 7, std::string(text));
}

void KirraTest::install() {
    _tap = std::make_shared<Tap>();
    platform::installServices(
        {.hid = std::make_shared<TappedBus>(
             observed::observeHid(simulator::makeHidFacility(hid, 0), observed::Reporter(_witness)),
             nullptr, _tap),
         .display = simulator::makeDisplayService(display),
         .registry = simulator::makeDeviceRegistry(display)});
}

std::shared_ptr<ZRKirraImageExperiment> KirraTest::make(platform::Number images,
                                                        platform::Number timeout) {
    auto experiment = std::make_shared<ZRKirraImageExperiment>();
    EXPECT_TRUE(experiment->setupWithParameters({{"images", images}, {"timeout", timeout}}, nullptr,
                                                nullptr));
    return experiment;
}

std::optional<platform::List> KirraTest::run(platform::Number images, platform::Number timeout) {
    install();
    error = nullptr;
    const auto result = make(images, timeout)->run(&error);
    EXPECT_EQ(result == nullptr, error != nullptr);
    if (result == nullptr) {
        return std::nullopt;
    }
    EXPECT_TRUE(result->measurements().empty());
    EXPECT_EQ(result->auxiliaryData().size(), 1U);
    return *result->auxiliaryData().find("images")->list();
}

}  // namespace test
