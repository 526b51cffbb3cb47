#include "devices/simulator/profile/writer.h"

#include <cstddef>
#include <string_view>

#include "devices/simulator/profile/parts.h"
#include "input/json_reader.h"

namespace simulator {

namespace {

constexpr std::size_t kLongestLine = 160;

// Appends the value in one line. False, with a part of it appended, where the text becomes longer than `longest`.
bool appendLine(const input::Json& json, std::size_t longest, std::string& text) {
    if (!json.is_structured() || json.empty()) {
        text += json.dump();
        return text.size() <= longest;
    }
    text += json.is_object() ? '{' : '[';
    std::string_view separator;
    for (const auto& [key, value] : json.items()) {
        text += separator;
        text += json.is_object() ? input::Json(key).dump() + ": " : "";
        if (!appendLine(value, longest, text)) {
            return false;
        }
        separator = ", ";
    }
    text += json.is_object() ? '}' : ']';
    return text.size() <= longest;
}

// The value, one entry after the other, each of which `lineStart` and two spaces begin.
std::string layOut(const input::Json& json, const std::string& lineStart) {
    if (!json.is_structured() || json.empty()) {
        return json.dump();
    }
    const std::string entryStart = lineStart + "  ";
    std::string text;
    for (const auto& [key, value] : json.items()) {
        text += text.empty() ? "" : ",";
        text += entryStart + (json.is_object() ? input::Json(key).dump() + ": " : "");
        const std::size_t begin = entryStart.size() + key.size();
        std::string line;
        const bool fits = begin <= kLongestLine && appendLine(value, kLongestLine - begin, line);
        text += fits ? line : layOut(value, entryStart);
    }
    text += lineStart;
    return json.is_object() ? "{" + text + "}" : "[" + text + "]";
}

}  // namespace

std::string profileText(const DeviceProfile& device) {
    return layOut(writeProfile(device), "\n") + "\n";
}

}  // namespace simulator
