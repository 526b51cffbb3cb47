#include "devices/simulator/device.h"

#include <memory>

#include "devices/simulator/capture_service.h"
#include "devices/simulator/display_service.h"
#include "devices/simulator/hid_sensor.h"
#include "devices/simulator/meterix_facility.h"

namespace simulator {

platform::Services makeDevice(const DeviceProfile& profile, double speed) {
    const auto progress = std::make_shared<StreamProgress>();
    return {.capture = makeCapturePlugIn(profile.capture, speed, progress),
            .meterix = makeMeterixFacility(profile.meterix, progress),
            .hid = makeHidFacility(profile.hid, speed),
            .display = makeDisplayService(profile.display),
            .registry = makeDeviceRegistry(profile.display)};
}

}  // namespace simulator
