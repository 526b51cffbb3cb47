#include "host/record/uuid.h"

#include <chrono>
#include <set>
#include <string>

#include <gtest/gtest.h>

namespace {

using std::chrono::duration_cast;
using std::chrono::milliseconds;
using std::chrono::system_clock;

long long now() {
    return duration_cast<milliseconds>(system_clock::now().time_since_epoch()).count();
}

// The parts of RFC 9562, figure 11: time, version, random bits, variant, random bits.
TEST(Uuid, HasTheTimeTheVersionAndTheVariant) {
    std::set<std::string> made;
    for (int at = 0; at < 100; ++at) {
        const long long before = now();
        const std::string uuid = host::newUuid();
        const long long time = std::stoll(uuid.substr(0, 8) + uuid.substr(9, 4), nullptr, 16);
        EXPECT_LE(before, time) << uuid;
        EXPECT_LE(time, now()) << uuid;
        ASSERT_EQ(uuid.size(), 36U);
        EXPECT_EQ(uuid.find_first_not_of("0123456789abcdef-"), std::string::npos) << uuid;
        for (const std::size_t hyphen : {8U, 13U, 18U, 23U}) {
            EXPECT_EQ(uuid[hyphen], '-') << uuid;
        }
        EXPECT_EQ(uuid[14], '7') << uuid;
        EXPECT_NE(std::string("89ab").find(uuid[19]), std::string::npos) << uuid;
        EXPECT_TRUE(host::isUuid(uuid)) << uuid;
        made.insert(uuid);
    }
    EXPECT_EQ(made.size(), 100U);
}

TEST(Uuid, IsNotWhatCouldBeAPath) {
    for (const char* text :
         {"", "../../etc/passwd", "019ab7f0-0000-7000-8000-00000000000",
          "019ab7f0-0000-7000-8000-00000000000g", "019ab7f000000-7000-8000-000000000000",
          "019ab7f0-0000-7000-8000-0000000/../x"}) {
        EXPECT_FALSE(host::isUuid(text)) << text;
    }
}

}  // namespace
