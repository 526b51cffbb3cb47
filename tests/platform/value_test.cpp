#include "platform/value.h"

#include <array>
#include <bit>
#include <cmath>
#include <limits>
#include <map>
#include <memory>
#include <random>
#include <string>

#include <gtest/gtest.h>

#include "platform/shared_block.h"

namespace {

using platform::Dictionary;
using platform::List;
using platform::MutableDictionary;
using platform::Number;
using platform::Value;
using Kind = platform::Number::Kind;

constexpr double kNan = std::numeric_limits<double>::quiet_NaN();
constexpr double kInfinity = std::numeric_limits<double>::infinity();
constexpr std::int64_t kMin64 = std::numeric_limits<std::int64_t>::min();
constexpr std::int64_t kMax64 = std::numeric_limits<std::int64_t>::max();
constexpr std::uint64_t kMaxU64 = std::numeric_limits<std::uint64_t>::max();

TEST(Number, KeepsItsKindAndConvertsTotally) {
    constexpr std::int32_t kMin32 = std::numeric_limits<std::int32_t>::min();
    constexpr std::int32_t kMax32 = std::numeric_limits<std::int32_t>::max();
    constexpr std::uint32_t kMaxU32 = std::numeric_limits<std::uint32_t>::max();
    const struct {
        Number number;
        Kind kind;
        std::uint16_t u16;
        std::int32_t i32;
        std::uint32_t u32;
        std::int64_t i64;
        std::uint64_t u64;
        double real;
        const char* text;
    } rows[] = {
        {{}, Kind::Absent, 0, 0, 0, 0, 0, 0, "(null)"},
        {true, Kind::Boolean, 1, 1, 1, 1, 1, 1, "1"},
        {std::int8_t{-1}, Kind::Int8, 65535, -1, kMaxU32, -1, kMaxU64, -1, "-1"},
        {std::int16_t{-32768}, Kind::Int16, 32768, -32768, 0xFFFF8000, -32768, kMaxU64 - 32767,
         -32768, "-32768"},
        {65536, Kind::Int32, 0, 65536, 65536, 65536, 65536, 65536, "65536"},
        {kMin64, Kind::Int64, 0, 0, 0, kMin64, 1ULL << 63, -0x1p63, "-9223372036854775808"},
        {std::uint8_t{255}, Kind::UInt8, 255, 255, 255, 255, 255, 255, "255"},
        {std::uint16_t{65535}, Kind::UInt16, 65535, 65535, 65535, 65535, 65535, 65535, "65535"},
        {0x80000000U, Kind::UInt32, 0, kMin32, 0x80000000U, 0x80000000, 0x80000000, 0x1p31,
         "2147483648"},
        {kMaxU64, Kind::UInt64, 65535, -1, kMaxU32, -1, kMaxU64, 0x1p64, "18446744073709551615"},
        {0.1F, Kind::Float, 0, 0, 0, 0, 0, 0.1F, "0.1"},
        {-1.9, Kind::Double, 0, -1, 0, -1, 0, -1.9, "-1.9"},
        {65535.9, Kind::Double, 65535, 65535, 65535, 65535, 65535, 65535.9, "65535.9"},
        {2147483648.0, Kind::Double, 65535, kMax32, 0x80000000U, 0x80000000, 0x80000000, 0x1p31,
         "2147483648"},
        {0x1p63, Kind::Double, 65535, kMax32, kMaxU32, kMax64, 1ULL << 63, 0x1p63,
         "9223372036854775808"},
        {0x1p64, Kind::Double, 65535, kMax32, kMaxU32, kMax64, kMaxU64, 0x1p64,
         "18446744073709551616"},
        {kInfinity, Kind::Double, 65535, kMax32, kMaxU32, kMax64, kMaxU64, kInfinity, "inf"},
        {-kInfinity, Kind::Double, 0, kMin32, 0, kMin64, 0, -kInfinity, "-inf"},
        {1e5, Kind::Double, 65535, 100000, 100000, 100000, 100000, 1e5, "100000"},
        {-1e5F, Kind::Float, 0, -100000, 0, -100000, 0, -1e5, "-100000"},
        {-0x1p53, Kind::Double, 0, kMin32, 0, -(1LL << 53), 0, -0x1p53, "-9007199254740992"},
        {1e16, Kind::Double, 65535, kMax32, kMaxU32, 10000000000000000, 10000000000000000, 1e16,
         "1e+16"},
        {1e16F, Kind::Float, 65535, kMax32, kMaxU32, 10000000272564224, 10000000272564224, 1e16F,
         "1e+16"},
        {1e300, Kind::Double, 65535, kMax32, kMaxU32, kMax64, kMaxU64, 1e300, "1e+300"},
    };
    for (const auto& row : rows) {
        SCOPED_TRACE(row.text);
        EXPECT_EQ(row.number.kind(), row.kind);
        EXPECT_EQ(row.number.as<std::uint16_t>(), row.u16);
        EXPECT_EQ(row.number.as<std::int32_t>(), row.i32);
        EXPECT_EQ(row.number.as<std::uint32_t>(), row.u32);
        EXPECT_EQ(row.number.as<std::int64_t>(), row.i64);
        EXPECT_EQ(row.number.as<std::uint64_t>(), row.u64);
        EXPECT_EQ(row.number.asDouble(), row.real);
        EXPECT_EQ(row.number.isTrue(), row.real != 0);
        EXPECT_EQ(row.number.text(), row.text);
        EXPECT_EQ(row.number.isSigned(), row.kind == Kind::Int8 || row.kind == Kind::Int16 ||
                                             row.kind == Kind::Int32 || row.kind == Kind::Int64);
        EXPECT_EQ(row.number, Number(row.number));
    }
}

TEST(Number, NanIsZeroAsAnIntegerTrueAndEqualToNothing) {
    const Number nan(kNan);
    EXPECT_EQ(nan.as<std::int64_t>(), 0);
    EXPECT_EQ(nan.as<std::uint8_t>(), 0);
    EXPECT_TRUE(std::isnan(nan.asDouble()));
    EXPECT_TRUE(nan.isTrue());
    EXPECT_FALSE(nan == nan);
    EXPECT_EQ(nan.text(), "nan");
    EXPECT_EQ(Number(-kNan).text(), "nan");
}

// A signalling NaN would become a quiet one on its way through a double.
TEST(Number, KeepsTheBitsOfAFloat) {
    for (const std::uint32_t bits : {0x7F800001U, 0xFFC00002U, 0x80000000U, 0x3DCCCCCDU}) {
        const Number number(std::bit_cast<float>(bits));
        EXPECT_EQ(std::bit_cast<std::uint32_t>(Number(number).asFloat()), bits);
        EXPECT_EQ(number.isTrue(), bits != 0x80000000U);
    }
    EXPECT_EQ(Number(7).asFloat(), 7.0F);
    EXPECT_EQ(Number(0.1).asFloat(), 0.1F);
}

TEST(Number, EqualityIsByKindToo) {
    EXPECT_NE(Number(1), Number(1U));
    EXPECT_NE(Number(1), Number(1.0));
    EXPECT_NE(Number(1.0F), Number(1.0));
    EXPECT_NE(Number(), Number(0));
    EXPECT_EQ(Number(0.0), Number(-0.0));
}

TEST(Value, YieldsNothingForWhatItDoesNotHold) {
    const Dictionary inner{{"count", 5}, {"name", "x"}};
    const Dictionary outer{{"inner", inner}, {"list", List{1, "two"}}};
    const Value value(outer);

    EXPECT_EQ(value["inner"]["count"].asNumber(), Number(5));
    EXPECT_FALSE(value["inner"]["count"]["deeper"].isPresent());
    EXPECT_FALSE(value["missing"]["count"].isPresent());
    EXPECT_FALSE(value["list"]["count"].isPresent());
    EXPECT_FALSE(Value()["count"].isPresent());
    EXPECT_FALSE(Value(Number()).isPresent());
    EXPECT_EQ(value["inner"]["name"].number(), nullptr);
    EXPECT_EQ(value["inner"]["count"].string(), nullptr);
    EXPECT_EQ(value["list"].dictionary(), nullptr);
    EXPECT_EQ(value.list(), nullptr);
    EXPECT_FALSE(inner.number("name").isPresent());
    EXPECT_FALSE(inner.number("missing").isPresent());
    EXPECT_EQ(List().begin(), List().end());
}

TEST(Value, EqualityLooksIntoListsAndDictionaries) {
    const auto make = [](auto leaf) {
        return Value(Dictionary{{"a", List{1, leaf}}, {"b", "text"}});
    };
    EXPECT_EQ(make(2), make(2));
    EXPECT_NE(make(2), make(2U));
    EXPECT_NE(make(2), make("2"));
    EXPECT_NE(make("2"), make(2));
    EXPECT_NE(make(2), Value());
    EXPECT_NE(Dictionary({{"a", 1}}), Dictionary({{"b", 1}}));
    EXPECT_NE(Dictionary({{"a", 1}}), Dictionary({{"a", 1}, {"b", 1}}));
    EXPECT_NE(Dictionary({{"a", 1}, {"b", 1}}), Dictionary({{"a", 1}}));
    EXPECT_TRUE(List().empty());
    EXPECT_FALSE(List({Value()}).empty());
    EXPECT_EQ(Value("text"), Value(std::string("text")));
}

TEST(Dictionary, IsSortedByKeyAndTheLastValueOfAKeyHolds) {
    MutableDictionary growing;
    for (const char* key : {"b", "", "ab", "B", "\xC3\xA9", "a", "b"}) {
        growing.set(key, static_cast<int>(growing.size()));
    }
    const Dictionary dictionary(growing);
    growing.set("later", 1);  // a copy was taken
    std::string keys;
    for (const auto& [key, value] : dictionary) {
        keys.append(key) += ',';
    }
    EXPECT_EQ(keys, ",B,a,ab,b,\xC3\xA9,");
    EXPECT_EQ(dictionary["b"], Value(6));
    EXPECT_TRUE(dictionary.contains(""));
    EXPECT_FALSE(dictionary.contains("later"));
}

// Sets, replaces and removes at random, iterating in between; keys of every length around a word's.
TEST(StringMap, HoldsWhatATreeHolds) {
    std::mt19937 random(1);
    platform::StringMap<std::string> map;
    std::map<std::string, std::string, std::less<>> tree;
    for (int step = 0; step < 5000; ++step) {
        const std::string key = std::string(random() % 20, 'k') + std::to_string(random() % 40);
        if (random() % 3 == 0) {
            map.remove(key);
            tree.erase(key);
        } else {
            map.set(key, std::to_string(step));
            tree[key] = std::to_string(step);
        }
        ASSERT_EQ(map.contains(key), tree.count(key) == 1);
        if (step % 50 != 0) {
            continue;
        }
        ASSERT_EQ(map.size(), tree.size());
        const auto copy = map;
        EXPECT_TRUE(copy == map);
        auto expected = tree.begin();
        for (const auto& [name, value] : copy) {
            ASSERT_EQ(name, expected->first);
            ASSERT_EQ(value, (expected++)->second);
            ASSERT_EQ(*map.find(name), value);
        }
    }
}

TEST(StringMap, GoesOnWhereTheOneThatItTookWas) {
    platform::StringMap<std::string> map;
    platform::StringMap<std::string> other;
    other.set("first", "1");
    map = std::move(other);
    map.set("second", "2");
    EXPECT_EQ(*map.find("first"), "1");
    EXPECT_EQ(*map.find("second"), "2");
    EXPECT_EQ(map.size(), 2U);
}

TEST(StringMap, TellsKeysOfOneHashApart) {
    std::map<std::uint32_t, std::string> seen;
    std::string key;
    std::string twin;
    for (int number = 0; twin.empty(); ++number) {  // some 80,000, by the birthday of 32 bits
        const std::string name = std::to_string(number);
        const auto [place, isNew] = seen.emplace(platform::StringKey(name).hash(), name);
        if (!isNew) {
            key = place->second;
            twin = name;
        }
    }
    platform::StringMap<std::string> map;
    map.set(key, "a");
    EXPECT_FALSE(map.contains(twin));
    map.set(twin, "b");
    EXPECT_EQ(*map.find(key), "a");
    EXPECT_EQ(*map.find(twin), "b");
}

// A map that grows moves what its keys and values are read from.
TEST(StringMap, TakesAPartOfItselfAsItGrows) {
    platform::StringMap<std::string> map;
    map.set(std::string(200, 'k'), std::string(30, 'v'));
    for (int more = 1; more < 200; ++more) {
        const auto [key, value] = *map.begin();  // the shortest key
        map.set(key.substr(1), value);
    }
    EXPECT_EQ(map.size(), 200U);
    for (const auto& [key, value] : map) {
        EXPECT_EQ(key, std::string(key.size(), 'k'));
        EXPECT_EQ(value, std::string(30, 'v'));
    }
}

TEST(StringKey, HasOneHashAtCompileTimeAndAtRunTime) {
    constexpr platform::StringKey kKeys[] = {"",         "a",         "1234567",
                                             "12345678", "123456789", "\xC3\xA9 345678901234567"};
    for (const platform::StringKey& key : kKeys) {
        EXPECT_EQ(platform::StringKey(std::string(key.text())).hash(), key.hash());
    }
}

TEST(List, OfOneKindBoxesWhatItHolds) {
    const auto check = [](const auto& numbers) {
        const List packed(numbers);
        const List boxed(platform::MutableList(numbers.begin(), numbers.end()));
        EXPECT_EQ(packed, boxed);
        EXPECT_EQ(boxed, packed);
        EXPECT_EQ(packed.size(), numbers.size());
    };
    check(std::array{true, false});
    check(std::array<std::int8_t, 2>{-1, 127});
    check(std::array{std::numeric_limits<std::int32_t>::min(), -1});
    check(std::array{kMaxU64});
    check(std::array{0.1, -0.0});
    check(std::array<std::int32_t, 0>());
    EXPECT_EQ(List(std::array<std::int32_t, 0>()), List());
    EXPECT_NE(List(std::array{1, 2}), (List{1, 2U}));
    EXPECT_NE(List(std::array{1, 2}), (List{1}));

    constexpr std::uint32_t kSignalling = 0x7F800001U;
    const Number nan = List(std::array{1.0F, std::bit_cast<float>(kSignalling)})[1].asNumber();
    EXPECT_EQ(nan.kind(), Kind::Float);
    EXPECT_EQ(std::bit_cast<std::uint32_t>(nan.asFloat()), kSignalling);
}

TEST(SharedBlock, KeepsAnObjectWhoseSiblingsAndMakerAreGone) {
    std::shared_ptr<const std::string> kept;
    std::weak_ptr<const std::string> first;
    {
        platform::SharedBlock<std::string> block(2);
        first = block.make("first");
        kept = block.make("second");
        EXPECT_EQ(*block.make("in another block"), "in another block");
        EXPECT_EQ(*first.lock(), "first");
    }
    EXPECT_EQ(*kept, "second");
    kept.reset();
    EXPECT_TRUE(first.expired());
}

}  // namespace
