// The file descriptors of the process, as tests look at them.
#ifndef ZR_TESTS_SUPPORT_DESCRIPTORS_H
#define ZR_TESTS_SUPPORT_DESCRIPTORS_H

#include <cstddef>
#include <filesystem>
#include <iterator>

namespace test {

// How many are open, the one that lists them among them.
inline std::size_t descriptorCount() {
    return static_cast<std::size_t>(
        std::distance(std::filesystem::directory_iterator("/proc/self/fd"), {}));
}

}  // namespace test

#endif
