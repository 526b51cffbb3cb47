// What a fuzz target finds wrong ends it, so that libFuzzer keeps the input.
#ifndef ZR_FUZZ_EXPECT_H
#define ZR_FUZZ_EXPECT_H

#include <cstdio>
#include <cstdlib>

namespace fuzz {

inline void expect(bool holds, const char* what) {
    if (!holds) {
        std::fprintf(stderr, "does not hold: %s\n", what);
        std::abort();
    }
}

}  // namespace fuzz

#endif
