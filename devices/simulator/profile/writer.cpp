#include "devices/simulator/profile/writer.h"

#include <cstddef>
#include <string_view>

#include "devices/simulator/profile/parts.h"
#include "input/json_reader.h"

namespace simulator {

namespace {

constexpr std::size_t kLongestLine = 160;

// What an object or an array holds, one entry after the other; `lineStart` begins each, "" for all of it in
// one line.
std::string layOut(const input::Json& json, const std::string& lineStart) {
    if (!json.is_structured() || json.empty()) {
        return json.dump();
    }
    const std::string entryStart = lineStart.empty() ? "" : lineStart + "  ";
    std::string text;
    for (const auto& [key, value] : json.items()) {
        text += text.empty() ? "" : lineStart.empty() ? ", " : ",";
        text += entryStart + (json.is_object() ? input::Json(key).dump() + ": " : "");
        const std::string line = layOut(value, "");
        text += entryStart.size() + key.size() + line.size() <= kLongestLine
                    ? line
                    : layOut(value, entryStart);
    }
    text += lineStart;
    return json.is_object() ? "{" + text + "}" : "[" + text + "]";
}

}  // namespace

std::string profileText(const DeviceProfile& device) {
    return layOut(writeProfile(device), "\n") + "\n";
}

}  // namespace simulator
