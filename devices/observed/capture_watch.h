// What the decorator around the capture service knows of a plug-in, of its devices and their streams.
//
// Shared by the wrappers, the handlers that lie in the device and the buffers that are out, so that any
// of them may outlive the others. None of these holds an object of the device, of the client, or a
// wrapper.
//
// Threads  Any. The atomic fields are written by the client's and the device's threads; each stands for
//          itself.
#ifndef ZR_DEVICES_OBSERVED_CAPTURE_WATCH_H
#define ZR_DEVICES_OBSERVED_CAPTURE_WATCH_H

#include <atomic>
#include <cstdint>
#include <memory>
#include <utility>

#include "devices/observed/lent_buffers.h"
#include "devices/observed/reporter.h"

namespace observed {

struct PlugInWatch {
    explicit PlugInWatch(Reporter plugInReporter) : reporter(std::move(plugInReporter)) {}

    const Reporter reporter;
    const std::shared_ptr<LentBuffers> lentBuffers = std::make_shared<LentBuffers>();
};

// One client's connection.
struct DeviceWatch {
    explicit DeviceWatch(std::shared_ptr<const PlugInWatch> of) : plugIn(std::move(of)) {}

    const std::shared_ptr<const PlugInWatch> plugIn;
    std::atomic<bool> invalidated{false};  // invalidate() has succeeded and returned
};

struct StreamWatch {
    explicit StreamWatch(std::shared_ptr<const DeviceWatch> of) : device(std::move(of)) {}

    const Reporter& reporter() const { return device->plugIn->reporter; }

    const std::shared_ptr<const DeviceWatch> device;

    // The client's side.
    std::atomic<bool> controlled{false};
    std::atomic<bool> hasFrameHandler{false};
    std::atomic<bool> running{false};  // from the call of start() on, until stop() is called

    // The device's side.
    std::atomic<std::uint64_t> frames{0};     // that reached the client's handler since start()
    std::atomic<int> frameHandlersInside{0};  // frame handlers that have not returned yet
    // Each of these is reported once: a device that does it once does it at every frame.
    std::atomic<bool> overlapReported{false};
    std::atomic<bool> lateHandlerReported{false};
};

}  // namespace observed

#endif
