// Which HID devices an enumeration finds.
#ifndef ZR_DEVICES_USAGE_MATCH_H
#define ZR_DEVICES_USAGE_MATCH_H

#include <algorithm>
#include <cstdint>
#include <vector>

#include "platform/value.h"
#include "platform/welkin/hid.h"

namespace devices {

// Whether a device with this primary usage matches one of the dictionaries: has all of its entries. An entry that
// devices do not have, or that is not a number, matches none.
inline bool matchesAny(std::int64_t usagePage,
                       std::int64_t usage,
                       const std::vector<platform::Dictionary>& matching) {
    const auto hasEntry = [&](const auto& entry) {
        const platform::Number wanted = entry.second.asNumber();
        const auto is = [&](std::int64_t number) {
            return wanted.isPresent() && wanted.as<std::int64_t>() == number;
        };
        return (entry.first == platform::kHidPrimaryUsagePage && is(usagePage)) ||
               (entry.first == platform::kHidPrimaryUsage && is(usage));
    };
    return std::any_of(matching.begin(), matching.end(), [&](const platform::Dictionary& each) {
        const auto& entries = each.entries();
        return std::all_of(entries.begin(), entries.end(), hasEntry);
    });
}

}  // namespace devices

#endif
