// Compiled once for each misuse; none of them may compile.
#include "platform/text_format.h"

struct NoText {};

std::string formatted() {
#if defined(MISUSE_unknown)
    return platform::format("%x", 1);
#elif defined(MISUSE_dangling)
    return platform::format("100 %");
#elif defined(MISUSE_missing)
    return platform::format("%@ of %lu", "one");
#elif defined(MISUSE_signed_for_unsigned)
    return platform::format("%lu", 1);
#elif defined(MISUSE_unsigned_for_signed)
    return platform::format("%d", 1U);
#elif defined(MISUSE_integer_for_double)
    return platform::format("%lf", 1);
#elif defined(MISUSE_text_for_integer)
    return platform::format("%d", "one");
#elif defined(MISUSE_no_text)
    return platform::format("%@", NoText{});
#else
    return platform::format("%@ %d %lu %lf %%", "one", -1, 1U, 1.0);
#endif
}
