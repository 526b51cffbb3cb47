#include "devices/simulator/device.h"

#include "devices/simulator/capture_service.h"
#include "devices/simulator/display_service.h"
#include "devices/simulator/hid_sensor.h"
#include "devices/simulator/meterix_facility.h"

namespace simulator {

platform::Services makeDevice(const DeviceProfile& profile,
                              double speed,
                              const std::weak_ptr<observed::Observer>& observer) {
    const auto progress = std::make_shared<StreamProgress>();
    return {.capture = makeCapturePlugIn(profile.capture, speed, progress, observer),
            .meterix = makeMeterixFacility(profile.meterix, progress),
            .hid = makeHidFacility(profile.hid, speed, observer),
            .display = makeDisplayService(profile.display),
            .registry = makeDeviceRegistry(profile.display)};
}

}  // namespace simulator
