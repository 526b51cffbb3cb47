// The support library's HID manager and device objects.
//
// These are interfaces; the device behind them implements them. Report IDs, report kinds and usage
// pages are those of the USB-IF Device Class Definition for HID 1.11. The data of every report
// begins with its report ID byte, and lengths include it.
//
// Threads  A device is used on one thread, the one whose run loop it is scheduled on; its callback
//          runs there. The last reference to a device may go on any thread, also inside its callback.
//          A manager is used by one thread at a time.
#ifndef ZR_PLATFORM_WELKIN_HID_H
#define ZR_PLATFORM_WELKIN_HID_H

#include <cstddef>
#include <cstdint>
#include <functional>
#include <memory>
#include <span>
#include <string_view>
#include <vector>

#include "platform/error.h"
#include "platform/run_loop.h"
#include "platform/value.h"

// Receives each input report as (report ID, data, null), or an error of the device (the ID and the
// data mean nothing then). The data is valid for the length of the call.
using WLHIDInputReportCallback = std::function<void(
    std::int64_t reportID, std::span<const std::byte> data, const platform::ErrorRef& error)>;

class WLIOHIDDeviceInterface {
  public:
    // Closes the device if it is still open.
    virtual ~WLIOHIDDeviceInterface() = default;

    // Opens the device; false when it is open already. On failure it may supply an error.
    virtual bool open(platform::ErrorSlot error) = 0;

    // Installs the function that receives input reports; an empty one removes it. It may be replaced
    // or removed inside its own call, which then still finishes.
    virtual void setInputReportCallback(WLHIDInputReportCallback callback) = 0;

    // Sends a feature report; `data` begins with the report ID. On failure it may supply an error.
    virtual bool setFeatureReportWithID(std::int64_t reportID,
                                        std::span<const std::byte> data,
                                        platform::ErrorSlot error) = 0;

    // Starts and stops the delivery of callbacks on the run loop in the mode: a report wakes the loop, and
    // a device that is not scheduled calls nothing. Stopping what was not started does nothing. Pass null
    // to unscheduleFromRunLoop() when the run loop no longer exists.
    virtual void scheduleWithRunLoop(const std::shared_ptr<platform::RunLoop>& runLoop,
                                     std::string_view mode) = 0;
    virtual void unscheduleFromRunLoop(const std::shared_ptr<platform::RunLoop>& runLoop,
                                       std::string_view mode) = 0;

    // Closes the device and ends its delivery of callbacks; false when it was not open or could not be
    // closed.
    virtual bool close(platform::ErrorSlot error) = 0;
};

class WLHIDManager {
  public:
    virtual ~WLHIDManager() = default;

    // A manager of the system's HID devices; null when none is available.
    static std::shared_ptr<WLHIDManager> create();

    // Sets the manager's devices to those that match at least one of the dictionaries; a device
    // matches a dictionary when it has every entry of it.
    virtual void enumerateDevicesMatching(const std::vector<platform::Dictionary>& matching) = 0;

    // The matched devices, each once, in no particular order. None is null.
    virtual std::vector<std::shared_ptr<WLIOHIDDeviceInterface>> devices() = 0;
};

namespace platform {

// The entries of a matching dictionary: a device's primary usage, as its report descriptor states it.
inline constexpr std::string_view kHidPrimaryUsagePage = "PrimaryUsagePage";
inline constexpr std::string_view kHidPrimaryUsage = "PrimaryUsage";

// What a device implements: where managers come from. Any thread.
class HidFacility {
  public:
    virtual ~HidFacility() = default;
    virtual std::shared_ptr<WLHIDManager> createManager() = 0;  // null when none is available
};

}  // namespace platform

#endif
