// The documents of the built-in device profiles, as the build found them in profiles/.
#ifndef ZR_DEVICES_SIMULATOR_PROFILE_GALLERY_TEXT_H
#define ZR_DEVICES_SIMULATOR_PROFILE_GALLERY_TEXT_H

#include <span>
#include <string_view>

namespace simulator {

struct GalleryText {
    std::string_view name;
    std::string_view text;  // JSON
};

// The device without faults first, the others by name.
std::span<const GalleryText> galleryTexts();

}  // namespace simulator

#endif
