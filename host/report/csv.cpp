#include "host/report/csv.h"

#include <nlohmann/json.hpp>

#include "host/record/clean_text.h"
#include "host/report/json_value.h"

namespace host {

namespace {

std::string jsonText(const platform::Value& value) {
    using Json = nlohmann::ordered_json;
    return jsonOf(value).dump(-1, ' ', false, Json::error_handler_t::replace);
}

}  // namespace

std::string csvField(std::string_view text) {
    std::string field = cleanText(text);
    if (field.find_first_of(",\"\r\n") == std::string::npos) {
        return field;
    }
    std::string quoted = "\"";
    for (const char c : field) {
        quoted += c == '"' ? "\"\"" : std::string(1, c);
    }
    return quoted + "\"";
}

std::string csvField(const platform::Value& value) {
    if (const platform::Number* number = value.number()) {
        return number->text();
    }
    if (const std::string* text = value.string()) {
        return csvField(std::string_view(*text));
    }
    return value.isPresent() ? csvField(std::string_view(jsonText(value))) : "";
}

std::string csvObject(const platform::MutableDictionary& entries) {
    return entries.size() > 0 ? csvField(std::string_view(jsonText(platform::Dictionary(entries))))
                              : "";
}

}  // namespace host
