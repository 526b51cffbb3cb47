// How a recording writes a number whose kind is known, without losing a bit.
#ifndef ZR_DEVICES_RECORDING_NUMBER_FORM_H
#define ZR_DEVICES_RECORDING_NUMBER_FORM_H

#include <nlohmann/json.hpp>

#include "platform/number.h"

namespace recording {

// A boolean, an integer, or a double; of a float its 32 bits as an integer, because MessagePack's writer has
// only doubles. nlohmann/json writes a double with all of its bits, those of a NaN included.
nlohmann::json payloadOf(const platform::Number& number);

// The number of that kind. Throws a Damage when the payload does not fit it.
platform::Number numberOf(platform::Number::Kind kind, const nlohmann::json& payload);

}  // namespace recording

#endif
