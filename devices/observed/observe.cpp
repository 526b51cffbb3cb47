#include "devices/observed/observe.h"

#include <utility>

#include "devices/observed/capture.h"
#include "devices/observed/hid.h"
#include "devices/observed/meterix.h"

namespace observed {

platform::Services observe(platform::Services device, std::weak_ptr<Observer> observer) {
    const Reporter reporter(std::move(observer));
    device.capture = observeCapture(std::move(device.capture), reporter);
    device.meterix = observeMeterix(std::move(device.meterix), reporter);
    device.hid = observeHid(std::move(device.hid), reporter);
    return device;
}

}  // namespace observed
