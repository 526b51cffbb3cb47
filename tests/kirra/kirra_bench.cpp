#include "tests/kirra/kirra_bench.h"

#include <utility>

#include "platform/services.h"
#include "platform/text_format.h"

namespace test {

namespace {

// A device that writes down what is done with it and lets it happen.
class RecordingDevice final : public WLIOHIDDeviceInterface {
  public:
    RecordingDevice(std::shared_ptr<WLIOHIDDeviceInterface> device,
                    std::shared_ptr<Journal> journal,
                    std::shared_ptr<WLHIDInputReportCallback> callback)
        : _device(std::move(device))
        , _journal(std::move(journal))
        , _callback(std::move(callback)) {}

    bool open(platform::ErrorSlot error) override {
        _journal->push_back("open");
        return _device->open(error);
    }
    void setInputReportCallback(WLHIDInputReportCallback callback) override {
        _journal->push_back(callback ? "callback" : "no callback");
        if (callback) {
            *_callback = callback;
        }
        _device->setInputReportCallback(std::move(callback));
    }
    bool setFeatureReportWithID(std::int64_t reportID,
                                std::span<const std::byte> data,
                                platform::ErrorSlot error) override {
        std::string line = platform::format("feature %@:", reportID);
        for (const std::byte byte : data) {
            line += platform::format(" %d", std::to_integer<int>(byte));
        }
        _journal->push_back(std::move(line));
        return _device->setFeatureReportWithID(reportID, data, error);
    }
    void scheduleWithRunLoop(const std::shared_ptr<platform::RunLoop>& runLoop,
                             std::string_view mode) override {
        _journal->push_back(platform::format("schedule in %@", mode));
        _device->scheduleWithRunLoop(runLoop, mode);
    }
    void unscheduleFromRunLoop(const std::shared_ptr<platform::RunLoop>& runLoop,
                               std::string_view mode) override {
        _journal->push_back(platform::format("unschedule from %@", mode));
        _device->unscheduleFromRunLoop(runLoop, mode);
    }
    bool close(platform::ErrorSlot error) override {
        _journal->push_back(error == nullptr ? "close" : "close with a slot");
        return _device->close(error);
    }

  private:
    const std::shared_ptr<WLIOHIDDeviceInterface> _device;
    const std::shared_ptr<Journal> _journal;
    const std::shared_ptr<WLHIDInputReportCallback> _callback;
};

class RecordingManager final : public WLHIDManager {
  public:
    RecordingManager(std::shared_ptr<WLHIDManager> manager,
                     std::shared_ptr<Journal> journal,
                     std::shared_ptr<WLHIDInputReportCallback> callback)
        : _manager(std::move(manager))
        , _journal(std::move(journal))
        , _callback(std::move(callback)) {}

    void enumerateDevicesMatching(const std::vector<platform::Dictionary>& matching) override {
        _manager->enumerateDevicesMatching(matching);
    }
    std::vector<std::shared_ptr<WLIOHIDDeviceInterface>> devices() override {
        auto devices = _manager->devices();
        for (auto& device : devices) {
            device = std::make_shared<RecordingDevice>(std::move(device), _journal, _callback);
        }
        return devices;
    }

  private:
    const std::shared_ptr<WLHIDManager> _manager;
    const std::shared_ptr<Journal> _journal;
    const std::shared_ptr<WLHIDInputReportCallback> _callback;
};

class RecordingFacility final : public platform::HidFacility {
  public:
    RecordingFacility(std::shared_ptr<platform::HidFacility> facility,
                      std::shared_ptr<Journal> journal,
                      std::shared_ptr<WLHIDInputReportCallback> callback)
        : _facility(std::move(facility))
        , _journal(std::move(journal))
        , _callback(std::move(callback)) {}

    std::shared_ptr<WLHIDManager> createManager() override {
        auto manager = _facility->createManager();
        return manager != nullptr
                   ? std::make_shared<RecordingManager>(std::move(manager), _journal, _callback)
                   : nullptr;
    }

  private:
    const std::shared_ptr<platform::HidFacility> _facility;
    const std::shared_ptr<Journal> _journal;
    const std::shared_ptr<WLHIDInputReportCallback> _callback;
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

class KirraTest::Witness final : public simulator::Observer {
  public:
    void misused(std::string_view what) override { ADD_FAILURE() << what; }
};

KirraTest::KirraTest()
    : _witness(std::make_shared<Witness>())
    , _callback(std::make_shared<WLHIDInputReportCallback>()) {}

KirraTest::~KirraTest() {
    platform::installServices({});
}

void KirraTest::install() {
    journal = std::make_shared<Journal>();
    platform::installServices(
        {.hid = std::make_shared<RecordingFacility>(simulator::makeHidFacility(hid, 0, _witness),
                                                    journal, _callback),
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
