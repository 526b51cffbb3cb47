// The nearest of the names that could have been meant.
#ifndef ZR_INPUT_NEAREST_H
#define ZR_INPUT_NEAREST_H

#include <string>
#include <string_view>
#include <vector>

namespace input {

// The name with the fewest edits (insert, delete, replace, swap; case does not count) from `given`, when
// they are few enough to be a slip: one, or at most a third of its length. Otherwise the first name that
// begins with it, if it has three characters. Else empty.
std::string nearest(std::string_view given, const std::vector<std::string>& names);

// "; did you mean NAME?", or nothing when no name is near.
std::string didYouMean(std::string_view given, const std::vector<std::string>& names);

}  // namespace input

#endif
