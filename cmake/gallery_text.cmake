# Writes OUTPUT, a source file that holds the device profiles of the files PROFILES, in their order:
# cmake -D PROFILES=file;... -D OUTPUT=file -P gallery_text.cmake
set(rows "")
foreach(file IN LISTS PROFILES)
  get_filename_component(name "${file}" NAME_WLE)
  file(READ "${file}" text)
  string(APPEND rows "        {\"${name}\", R\"json(${text})json\"},\n")
endforeach()
file(WRITE "${OUTPUT}" "// Made from profiles/.
#include \"devices/simulator/profile/gallery_text.h\"

namespace simulator {

std::span<const GalleryText> galleryTexts() {
    static constexpr GalleryText kTexts[] = {
${rows}    };
    return kTexts;
}

}  // namespace simulator
")
