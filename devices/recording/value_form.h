// How a value is written: nothing as nil, a boolean and a double as they are, a text that is new as a string,
// everything else as a list that begins with one of these.
#ifndef ZR_DEVICES_RECORDING_VALUE_FORM_H
#define ZR_DEVICES_RECORDING_VALUE_FORM_H

#include <cstddef>

namespace recording {

enum class ValueForm : int {
    List = 0,        // [0, entries...]
    Dictionary = 1,  // [1, shape, entries...]
    Text = 2,        // [2, index]: one of the texts before
    Object = 3,      // [3]: a handler, say, which has no contents
    Number = 4,      // [4, kind, payload]: of another kind
};

// A longer text is written out each time.
inline constexpr std::size_t kLongestKept = 256;

}  // namespace recording

#endif
