// Devices that hand every call on to another one: a broken device changes one thing.
#ifndef ZR_TESTS_HOST_CONFORMANCE_FORWARDING_H
#define ZR_TESTS_HOST_CONFORMANCE_FORWARDING_H

#include <functional>
#include <memory>
#include <utility>
#include <vector>

#include "platform/welkin/capture.h"
#include "platform/welkin/hid.h"
#include "platform/welkin/meterix.h"

namespace test {

using platform::ErrorSlot;
using platform::Value;

struct Stream : WLRylCaptureStream {
    explicit Stream(std::shared_ptr<WLRylCaptureStream> of) : inner(std::move(of)) {}
    Value valueForProperty(std::string_view property, ErrorSlot error) override {
        return inner->valueForProperty(property, error);
    }
    bool setValue(const Value& value, std::string_view forProperty, ErrorSlot error) override {
        return inner->setValue(value, forProperty, error);
    }
    bool start(ErrorSlot error) override { return inner->start(error); }
    bool stop(ErrorSlot error) override { return inner->stop(error); }

    const std::shared_ptr<WLRylCaptureStream> inner;
};

// Its streams are made by `wrap`, each once.
struct Camera : WLRylCaptureDevice {
    using Wrap = std::function<std::shared_ptr<Stream>(std::shared_ptr<WLRylCaptureStream>)>;

    Camera(std::shared_ptr<WLRylCaptureDevice> of, const Wrap& wrap) : inner(std::move(of)) {
        const WLRylCaptureStreamList list =
            inner->streams(nullptr).value_or(WLRylCaptureStreamList());
        for (const auto& stream : list) {
            wrapped.push_back(wrap(stream));
        }
    }
    std::optional<WLRylCaptureStreamList> streams(ErrorSlot /*error*/) override {
        return WLRylCaptureStreamList(wrapped.begin(), wrapped.end());
    }
    bool requestControlOfStreams(const WLRylCaptureStreamList& list, ErrorSlot error) override {
        WLRylCaptureStreamList inside;
        for (const auto& stream : list) {
            inside.push_back(static_cast<Stream&>(*stream).inner);
        }
        return inner->requestControlOfStreams(inside, error);
    }
    bool invalidate(ErrorSlot error) override { return inner->invalidate(error); }

    const std::shared_ptr<WLRylCaptureDevice> inner;
    std::vector<std::shared_ptr<Stream>> wrapped;
};

// Its device is made by `wrap`.
struct PlugIn : WLISPCapturePlugIn {
    using Wrap =
        std::function<std::shared_ptr<WLRylCaptureDevice>(std::shared_ptr<WLRylCaptureDevice>)>;

    PlugIn(std::shared_ptr<WLISPCapturePlugIn> of, Wrap with)
        : inner(std::move(of)), wrap(std::move(with)) {}
    std::shared_ptr<WLRylCaptureDevice> device(ErrorSlot error) override {
        return wrap(inner->device(error));
    }

    const std::shared_ptr<WLISPCapturePlugIn> inner;
    const Wrap wrap;
};

struct Meterix : platform::MeterixFacility {
    explicit Meterix(std::shared_ptr<platform::MeterixFacility> of) : inner(std::move(of)) {}
    std::shared_ptr<const platform::MeterixChannels> simpleChannels(ErrorSlot error) override {
        return inner->simpleChannels(error);
    }
    std::shared_ptr<const platform::MeterixSamples> sample(
        const platform::MeterixChannels& channels, ErrorSlot error) override {
        return inner->sample(channels, error);
    }
    std::shared_ptr<const platform::MeterixSamples> difference(
        const platform::MeterixSamples& later,
        const platform::MeterixSamples& baseline,
        ErrorSlot error) override {
        return inner->difference(later, baseline, error);
    }

    const std::shared_ptr<platform::MeterixFacility> inner;
};

struct Sensor : WLIOHIDDeviceInterface {
    explicit Sensor(std::shared_ptr<WLIOHIDDeviceInterface> of) : inner(std::move(of)) {}
    bool open(ErrorSlot error) override { return inner->open(error); }
    void setInputReportCallback(WLHIDInputReportCallback callback) override {
        inner->setInputReportCallback(std::move(callback));
    }
    bool setFeatureReportWithID(std::int64_t id,
                                std::span<const std::byte> data,
                                ErrorSlot error) override {
        return inner->setFeatureReportWithID(id, data, error);
    }
    void scheduleWithRunLoop(const std::shared_ptr<platform::RunLoop>& runLoop,
                             std::string_view mode) override {
        inner->scheduleWithRunLoop(runLoop, mode);
    }
    void unscheduleFromRunLoop(const std::shared_ptr<platform::RunLoop>& runLoop,
                               std::string_view mode) override {
        inner->unscheduleFromRunLoop(runLoop, mode);
    }
    bool close(ErrorSlot error) override { return inner->close(error); }

    const std::shared_ptr<WLIOHIDDeviceInterface> inner;
};

// Its devices are made by `wrap` from those that match.
struct Manager : WLHIDManager {
    using Devices = std::vector<std::shared_ptr<WLIOHIDDeviceInterface>>;
    using Wrap = std::function<Devices(const Devices&)>;

    Manager(std::shared_ptr<WLHIDManager> of, Wrap with)
        : inner(std::move(of)), wrap(std::move(with)) {}
    void enumerateDevicesMatching(const std::vector<platform::Dictionary>& matching) override {
        inner->enumerateDevicesMatching(matching);
    }
    Devices devices() override { return wrap(inner->devices()); }

    const std::shared_ptr<WLHIDManager> inner;
    const Wrap wrap;
};

struct Hid : platform::HidFacility {
    Hid(std::shared_ptr<platform::HidFacility> of, Manager::Wrap with)
        : inner(std::move(of)), wrap(std::move(with)) {}
    std::shared_ptr<WLHIDManager> createManager() override {
        return std::make_shared<Manager>(inner->createManager(), wrap);
    }

    const std::shared_ptr<platform::HidFacility> inner;
    const Manager::Wrap wrap;
};

}  // namespace test

#endif
