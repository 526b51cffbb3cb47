// What a client makes of a device that fails. The client adds up the event counters of a device: once
// without a fault, then once for each step of that run and each way in which the step can fail. Either it
// returns the total, or it reports an error and keeps nothing of the device. The exit status is 1 if it did
// neither.
#include <cstdint>
#include <iostream>
#include <memory>
#include <optional>

#include "devices/faulty/faulty_device.h"
#include "platform/error.h"
#include "platform/services.h"
#include "platform/welkin/meterix.h"

namespace {

constexpr std::int64_t kTotal = 5;

// The device: two counters, which do not move.
class TwoCounters final : public platform::MeterixFacility {
  public:
    std::shared_ptr<const platform::MeterixChannels> simpleChannels(
        platform::ErrorSlot /*error*/) override {
        return _channels;
    }

    std::shared_ptr<const platform::MeterixSamples> sample(
        const platform::MeterixChannels& channels, platform::ErrorSlot /*error*/) override {
        auto samples = std::make_shared<platform::MeterixSamples>();
        for (const WLMeterixChannelDescriptionRef& channel : channels) {
            const std::int64_t count = channel->name() == "warm" ? 2 : kTotal - 2;
            samples->emplace_back(WLMeterixChannel(channel, count));
        }
        return samples;
    }

    std::shared_ptr<const platform::MeterixSamples> difference(
        const platform::MeterixSamples& /*later*/,
        const platform::MeterixSamples& /*baseline*/,
        platform::ErrorSlot error) override {
        return platform::fail(error, "TwoCounters", 1, nullptr, "There are no differences.");
    }

  private:
    const std::shared_ptr<const platform::MeterixChannels> _channels =
        std::make_shared<platform::MeterixChannels>(platform::MeterixChannels{
            std::make_shared<const WLMeterixChannelDescription>("warm", "Board", "Events"),
            std::make_shared<const WLMeterixChannelDescription>("cold", "Board", "Events")});
};

platform::Services makeServices() {
    return {.meterix = std::make_shared<TwoCounters>()};
}

// The client: the events of all counters of the installed device.
std::optional<std::int64_t> totalEvents(platform::ErrorSlot error) {
    const WLMeterix report = WLMeterix::reportWithOnlySimpleChannels(error);
    const WLMeterixSnapshot snapshot = report.snapshot(error);
    if (snapshot.samples().empty()) {
        const platform::ErrorRef cause = error != nullptr ? *error : nullptr;
        return platform::fail(error, "TotalEvents", 1, cause, "No counter was read.");
    }
    std::int64_t total = 0;
    for (const WLMeterixSample& sample : snapshot.samples()) {
        const WLMeterixChannel& counter = sample.channel();
        if (!counter.count().isPresent()) {
            return platform::fail(error, "TotalEvents", 2, nullptr, "%@ has no count.",
                                  counter.channelDescription().name());
        }
        total += counter.count().as<std::int64_t>();
    }
    return total;
}

// Runs the client on a device and says what came of it; whether that is right.
bool run(const platform::Services& device) {
    platform::installServices(device);
    platform::ErrorRef error;
    const std::optional<std::int64_t> total = totalEvents(&error);
    platform::installServices({});

    if (total.has_value()) {
        std::cout << "    " << *total << " events\n";
        return *total == kTotal && error == nullptr;
    }
    if (error == nullptr) {
        std::cout << "    failed without an error\n";
        return false;
    }
    std::cout << "    " << error->localizedDescription();
    if (error->underlyingError() != nullptr) {
        std::cout << " Because: " << error->underlyingError()->localizedDescription();
    }
    std::cout << "\n";
    return true;
}

// The same with one fault; nothing of the device may be left afterwards.
bool runWithFault(const faulty::Fault& fault) {
    std::weak_ptr<const void> lifetime;
    bool isRight = false;
    {
        const faulty::FaultyDevice device(makeServices, {fault});
        lifetime = device.lifetime();
        isRight = run(device.services());
    }
    if (!lifetime.expired()) {
        std::cout << "    something of the device is left\n";
        return false;
    }
    return isRight;
}

}  // namespace

int main() {
    const faulty::FaultyDevice healthy(makeServices);
    std::cout << "without a fault\n";
    bool isRight = run(healthy.services());
    for (const faulty::Step& step : healthy.steps()) {
        for (const faulty::Way way : step.ways) {
            std::cout << step.text(way) << "\n";
            isRight &= runWithFault({step.place, way});
        }
    }
    return isRight ? 0 : 1;
}
