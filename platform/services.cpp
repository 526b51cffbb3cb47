#include "platform/services.h"

#include <utility>

#include "platform/sync.h"
#include "platform/welkin/capture.h"
#include "platform/welkin/hid.h"

namespace platform {

namespace {

// Never destroyed: a work item may ask for a service while the process exits.
struct Installed {
    Mutex mutex;
    Services services ZR_GUARDED_BY(mutex);
};

Installed& installed() {
    static Installed& shared = *new Installed;
    return shared;
}

}  // namespace

void installServices(Services services) {
    Installed& shared = installed();
    const MutexLock lock(shared.mutex);
    std::swap(shared.services, services);
}

Services services() {
    Installed& shared = installed();
    const MutexLock lock(shared.mutex);
    return shared.services;
}

}  // namespace platform

std::shared_ptr<WLISPCapturePlugIn> WLISPCapturePlugIn::defaultPlugIn() {
    return platform::services().capture;
}

std::shared_ptr<WLHIDManager> WLHIDManager::create() {
    const auto facility = platform::services().hid;
    return facility != nullptr ? facility->createManager() : nullptr;
}
