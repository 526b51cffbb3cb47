#include "host/report/json_value.h"

#include <cmath>
#include <cstdint>
#include <cstdlib>
#include <string>

#include "host/record/run_text.h"

namespace host {

using Json = nlohmann::ordered_json;
using platform::Number;

Json jsonOf(double value) {
    return std::isfinite(value) ? Json(value) : Json(numberText(value));
}

Json jsonOf(const Number& number) {
    switch (number.kind()) {
        case Number::Kind::Absent:
            return nullptr;
        case Number::Kind::Boolean:
            return number.isTrue();
        case Number::Kind::Float:
            // Through its own shortest text, or it would show the digits of the nearest double.
            return jsonOf(std::strtod(number.text().c_str(), nullptr));
        case Number::Kind::Double:
            return jsonOf(number.asDouble());
        default:
            return number.isSigned() ? Json(number.as<std::int64_t>())
                                     : Json(number.as<std::uint64_t>());
    }
}

Json jsonOf(const platform::Value& value) {
    if (const Number* number = value.number()) {
        return jsonOf(*number);
    }
    if (const std::string* text = value.string()) {
        return *text;
    }
    if (const platform::List* list = value.list()) {
        Json array = Json::array();
        for (const platform::Value& element : *list) {
            array.push_back(jsonOf(element));
        }
        return array;
    }
    if (const platform::Dictionary* dictionary = value.dictionary()) {
        Json object = Json::object();
        for (const auto& [key, entry] : dictionary->entries()) {
            object[key] = jsonOf(entry);
        }
        return object;
    }
    return nullptr;
}

}  // namespace host
