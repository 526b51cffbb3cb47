// MessagePack as a tree of values.
#ifndef ZR_DEVICES_RECORDING_TREE_H
#define ZR_DEVICES_RECORDING_TREE_H

#include <string_view>

#include <nlohmann/json.hpp>

namespace recording {

// The one value that the bytes are. Throws a Damage when they are something else, when values are nested more
// than kDeepest deep, and when there is a map or binary data, which recordings do not use.
nlohmann::json treeOf(std::string_view bytes);

}  // namespace recording

#endif
