// Conformance: whether a device keeps the promises of the interfaces that it implements.
//
// Each service that the device has is used as its client would use it, and each promise of its header that a
// client can see kept or broken is a check. What cannot be checked on a device, because it refuses a call or was
// recorded without it, is not checked, and never counts as kept.
#ifndef ZR_HOST_CONFORMANCE_CONFORMANCE_H
#define ZR_HOST_CONFORMANCE_CONFORMANCE_H

#include <string>
#include <string_view>
#include <vector>

#include "devices/device.h"
#include "host/conformance/checks.h"
#include "host/record/run_record.h"

namespace host {

// A service, and what checks it: uses it on this thread, which must have no run loop in use.
struct ServiceChecks {
    std::string_view
        name;  // of the service in platform::Services; "display" is display and registry
    std::string_view summary;
    bool (*has)(const platform::Services& services);
    std::vector<CheckRecord> (*check)(const devices::Device& device);
};

// In the order in which to bring a device up: the one that needs least first.
inline constexpr std::size_t kServiceCount = 4;
extern const ServiceChecks kServiceChecks[kServiceCount];

std::vector<CheckRecord> checkMeterix(const devices::Device& device);
std::vector<CheckRecord> checkDisplay(const devices::Device& device);
std::vector<CheckRecord> checkHid(const devices::Device& device);
std::vector<CheckRecord> checkCapture(const devices::Device& device);

// The checks of a service as the record of a run, so that every form of report shows them: a check that was made
// is a result, how often it was broken, with a limit of zero that is named after the promise; one that was not is
// listed as not measured, with the reason. The run passes when every promise that was checked is kept; its results
// are empty when none was.
RunRecord runOfChecks(const ServiceChecks& service, const devices::Device& device);

}  // namespace host

#endif
