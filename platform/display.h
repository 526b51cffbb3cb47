// The display framebuffer service and the device registry, as far as the display's power state
// needs them.
//
// Lifetime  A display may go away at any time, on any thread, also between two of these calls. Its ids
//           then stand for nothing: registryObject() returns the empty object, and property() a Value
//           that holds nothing.
#ifndef ZR_PLATFORM_DISPLAY_H
#define ZR_PLATFORM_DISPLAY_H

#include <cstdint>
#include <string_view>

#include "platform/value.h"

namespace platform {

using DisplayId = std::uint32_t;
// An id, not a reference: nothing releases it. 0 is the empty object.
using RegistryObject = std::uint32_t;

// The registry property with a display's power state, and the path in it: a dictionary that holds a
// dictionary that holds a number, zero when the panel is off.
inline constexpr std::string_view kDisplayDebugInfo = "Quorm Debug Info";
inline constexpr std::string_view kDisplayPowerInfo = "Quorm power info";
inline constexpr std::string_view kDisplayPowerInfoPanel = "Quorm power info panel";

// Any thread.
class DisplayService {
  public:
    virtual ~DisplayService() = default;

    // Stores the main display in `display` and returns 0; on failure returns another status and
    // leaves `display` alone.
    virtual int mainDisplay(DisplayId& display) = 0;

    // The registry object behind the display's frame buffer; the empty object when there is none.
    virtual RegistryObject registryObject(DisplayId display) = 0;
};

// Any thread.
class DeviceRegistry {
  public:
    virtual ~DeviceRegistry() = default;

    // The object's property of that name; a Value that holds nothing when there is none.
    virtual Value property(RegistryObject object, std::string_view name) = 0;
};

}  // namespace platform

#endif
