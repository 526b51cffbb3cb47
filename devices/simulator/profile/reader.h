// Device profiles as JSON documents: the gallery that is built in, and files.
#ifndef ZR_DEVICES_SIMULATOR_PROFILE_READER_H
#define ZR_DEVICES_SIMULATOR_PROFILE_READER_H

#include <optional>
#include <string>
#include <vector>

#include "devices/simulator/profile/device_profile.h"

namespace simulator {

struct GalleryEntry {
    std::string name;
    std::string summary;  // one line
};

// The built-in profiles: the device without faults first, the others by name.
std::vector<GalleryEntry> gallery();

// The profile of that name in the gallery, or of that file (a name with a slash or a dot is a file).
// A profile may extend another one, which is looked up in the same way; a file's relative to it. On
// failure returns nothing and appends a line to `problems` for each thing that is wrong: the file or the
// profile, a JSON pointer (RFC 6901) where there is one, and the reason. A key that is not known is an error.
// What is wrong with a profile that is extended hides what is wrong with those that extend it.
std::optional<DeviceProfile> loadProfile(const std::string& nameOrFile,
                                         std::vector<std::string>& problems);

}  // namespace simulator

#endif
