// The promises of the display and the device registry (platform/display.h).
#include "host/conformance/conformance.h"
#include "platform/display.h"

namespace host {

namespace {

enum Check : std::size_t { Status, NoDisplay, NoObject, NoProperty };

constexpr Promise kPromises[] = {
    {"display stored by a call that failed",
     "mainDisplay() leaves the display alone when it fails"},
    {"registry object of no display",
     "registryObject() of an id that stands for nothing is the empty object"},
    {"property of the empty object", "property() of the empty object holds nothing"},
    {"property of a name that is not there",
     "property() of a name that there is none of holds nothing"},
};

constexpr platform::DisplayId kNoDisplay = 0xFFFF'FFFE;

}  // namespace

std::vector<CheckRecord> checkDisplay(const devices::Device& device) {
    Checks checks(kPromises, device.unanswered);
    platform::DisplayService& service = *device.services.display;
    platform::DeviceRegistry& registry = *device.services.registry;

    platform::DisplayId display = kNoDisplay;
    int status = 0;
    if (checks.answered(Status, [&] { status = service.mainDisplay(display); })) {
        if (status != 0) {
            checks.decide(Status, display == kNoDisplay, "a status other than 0, and a display");
        } else {
            checks.notChecked(Status, "the device has a main display");
        }
    }

    const platform::DisplayId other = display == kNoDisplay ? kNoDisplay - 1 : kNoDisplay;
    platform::RegistryObject object = 0;
    if (checks.answered(NoDisplay, [&] { object = service.registryObject(other); })) {
        checks.decide(NoDisplay, object == 0,
                      platform::format("object %lu", std::uint64_t{object}));
    }

    platform::Value value;
    if (checks.answered(NoObject,
                        [&] { value = registry.property(0, platform::kDisplayDebugInfo); })) {
        checks.decide(NoObject, !value.isPresent(), "the property holds something");
    }

    if (status == 0 && checks.answered([&] { object = service.registryObject(display); }) &&
        object != 0 &&
        checks.answered([&] { value = registry.property(object, "zrlab: no property"); })) {
        checks.decide(NoProperty, !value.isPresent(), "the property holds something");
    } else {
        checks.notChecked(NoProperty, "the main display has no registry object that answers");
    }
    return checks.records();
}

}  // namespace host
