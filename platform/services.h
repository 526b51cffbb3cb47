// The set of operating-system and device services that the process works with.
//
// The program installs it before any experiment runs (the bench: its simulated device; a product: the
// real ones). The operations of the support library's classes find their facility here; a facility
// that is null counts as not available.
#ifndef ZR_PLATFORM_SERVICES_H
#define ZR_PLATFORM_SERVICES_H

#include <memory>

class WLISPCapturePlugIn;

namespace platform {

class DeviceRegistry;
class DisplayService;
class HidFacility;
class MeterixFacility;

struct Services {
    std::shared_ptr<WLISPCapturePlugIn> capture = nullptr;
    std::shared_ptr<MeterixFacility> meterix = nullptr;
    std::shared_ptr<HidFacility> hid = nullptr;
    std::shared_ptr<DisplayService> display = nullptr;
    std::shared_ptr<DeviceRegistry> registry = nullptr;
};

// Replaces the installed set. Any thread; what runs on the old set keeps it alive and goes on.
void installServices(Services services);

// The installed set. Any thread.
Services services();

}  // namespace platform

#endif
