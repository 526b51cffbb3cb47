// The bytes of a recording: what goes in comes out, what is cut or damaged is reported, never more.
#include <bit>
#include <cstdint>
#include <cstdio>
#include <limits>
#include <memory>
#include <string>
#include <utility>
#include <vector>

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "tests/devices/recording/recordings.h"

namespace test {

namespace {

using namespace recording;
using platform::Dictionary;
using platform::List;
using platform::Number;
using platform::Value;
using ::testing::HasSubstr;
using ::testing::StartsWith;

Value throughFile(const Value& value) {
    const auto file =
        parsed(bytesOf({{.at = {}, .content = Call{Operation::Property, 0, value, value, {}}}}));
    const Call call = allOf<Call>(file).at(0);
    EXPECT_EQ(callText(call.operation, call.arguments), callText(call.operation, call.result));
    return call.result;
}

// Every bit of a number, and its kind.
std::pair<Number::Kind, std::uint64_t> bitsOf(const Number& number) {
    const std::uint64_t bits =
        number.kind() == Number::Kind::Float    ? std::bit_cast<std::uint32_t>(number.asFloat())
        : number.kind() == Number::Kind::Double ? std::bit_cast<std::uint64_t>(number.asDouble())
                                                : number.as<std::uint64_t>();
    return {number.kind(), bits};
}

template <class T>
std::vector<Number> edgesOf() {
    using Limits = std::numeric_limits<T>;
    return {Limits::lowest(), Limits::max(), T{0}, T{1}, static_cast<T>(-1)};
}

TEST(RecordingFormat, NumbersKeepTheirKindAndEveryBit) {
    std::vector<Number> numbers = {true,
                                   false,
                                   -0.0,
                                   0.1,
                                   0.1F,
                                   -0.0F,
                                   std::numeric_limits<double>::infinity(),
                                   std::bit_cast<double>(0x7FF8'0000'0000'0001U),  // quiet
                                   std::bit_cast<double>(0xFFF0'0000'DEAD'BEEFU),  // signalling
                                   std::bit_cast<float>(0x7FC0'1234U),
                                   std::numeric_limits<double>::denorm_min()};
    for (const auto& edges :
         {edgesOf<std::int8_t>(), edgesOf<std::int16_t>(), edgesOf<std::int32_t>(),
          edgesOf<std::int64_t>(), edgesOf<std::uint8_t>(), edgesOf<std::uint16_t>(),
          edgesOf<std::uint32_t>(), edgesOf<std::uint64_t>(), edgesOf<float>(),
          edgesOf<double>()}) {
        numbers.insert(numbers.end(), edges.begin(), edges.end());
    }
    for (const Number& number : numbers) {
        SCOPED_TRACE(number.text());
        // On its own and in a dictionary, whose keys keep the kind.
        EXPECT_EQ(bitsOf(throughFile(number).asNumber()), bitsOf(number));
        EXPECT_EQ(bitsOf(throughFile(Dictionary{{"key", number}})["key"].asNumber()),
                  bitsOf(number));
    }
}

TEST(RecordingFormat, ValuesOfEveryForm) {
    const Value long_(std::string(1000, 'x'));
    for (const Value& value : std::vector<Value>{
             Value(), "", "text", long_, std::string("\0\xFF\n", 3), List(), Dictionary(),
             List{1, "text", "text", List{Value(List())}, Value(), long_, long_},
             Dictionary{{"a", 1}, {"b", "text"}, {"c", Dictionary{{"a", 1}, {"b", Value()}}}},
             List{Dictionary{{"a", 1}}, Dictionary{{"a", 2}}, Dictionary{{"a", "text"}},
                  Dictionary{{"a", Dictionary{{"a", 3}}}}}}) {
        EXPECT_EQ(throughFile(value), value) << callText(Operation::Property, value);
    }
    const Value object = throughFile(List{Value::opaque(5)});
    EXPECT_TRUE((*object.list())[0].isPresent());
    EXPECT_EQ(callText(Operation::Property, object), "property([(object)])");
    EXPECT_EQ(withoutObjects(object), Value(List{"(object)"}));
}

TEST(RecordingFormat, EntriesOfEveryKind) {
    const platform::MediaTime time{.value = -5, .timescale = 600, .flags = 3, .epoch = 1LL << 40};
    const auto cause = std::make_shared<const platform::Error>("cause", -7, "why");
    const auto error = std::make_shared<const platform::Error>("domain", 1LL << 40, "text", cause);
    const auto file = parsed(bytesOf({
        {.at = Microseconds(1), .content = recording::Run{"Name", 3}},
        {.at = Microseconds(2), .content = Call{Operation::Open, 9, {}, false, error}},
        {.at = Microseconds(3), .content = Frame{4, {2, true}, time, false, {}}},
        {.at = Microseconds(4), .content = Event{5, {1, false}, time, -1, 1LL << 50}},
        {.at = Microseconds(5), .content = Report{6, 7, 118, std::string("\x76\0", 2), error}},
        {.at = Microseconds(6), .content = Vanished{6, 7}},
        {.at = Microseconds(7), .content = Hole{10, 20}},
        {.at = Microseconds(8), .content = Call{Operation::Open, 9, {}, false, error}},
    }));
    EXPECT_EQ(file.session.facts, kSession.facts);
    EXPECT_EQ(file.session.services, kSession.services);
    EXPECT_EQ(file.session.parameters, kSession.parameters);
    EXPECT_EQ(file.session.started, kSession.started);
    EXPECT_EQ(file.entries[4].at, Microseconds(5));
    EXPECT_EQ(allOf<recording::Run>(file)[0].number, 3U);
    for (const Call& call : allOf<Call>(file)) {
        EXPECT_EQ(call.object, 9U);
        EXPECT_EQ(call.error->code(), 1LL << 40);
        EXPECT_EQ(call.error->underlyingError()->localizedDescription(), "why");
        EXPECT_EQ(call.error->underlyingError()->underlyingError(), nullptr);
    }
    const Frame frame = allOf<Frame>(file)[0];
    EXPECT_EQ(frame.time, time);
    EXPECT_EQ(frame.phase.start, 2U);
    EXPECT_TRUE(frame.phase.stopped);
    EXPECT_FALSE(frame.hasBuffer);
    const Event event = allOf<Event>(file)[0];
    EXPECT_EQ(event.time, time);
    EXPECT_EQ(event.code, -1);
    EXPECT_EQ(event.info, 1LL << 50);
    const Report report = allOf<Report>(file)[0];
    EXPECT_EQ(report.data, std::string("\x76\0", 2));
    EXPECT_EQ(report.error->domain(), "domain");
    EXPECT_EQ(allOf<Vanished>(file)[0].schedule, 7U);
    EXPECT_EQ(file.lost.deliveries, 10U);
    EXPECT_EQ(file.lost.calls, 20U);
    EXPECT_FALSE(file.isCut);
}

// A frame with thirty numbers that need all of their bits.
Entry fullFrame(int number) {
    platform::MutableDictionary metadata;
    for (int key = 0; key < 30; ++key) {
        std::string name = "MetaDataOfProjectorNumber";
        name += std::to_string(key);
        const double measured = (number + key) / 7.0;
        if (key % 3 == 0) {
            metadata.set(name, std::bit_cast<std::uint64_t>(measured));
        } else {
            metadata.set(name, measured);
        }
    }
    return {.at = Microseconds(33'333LL * number),
            .content = Frame{3,
                             {1, false},
                             {.value = 33'333LL * number, .timescale = 1'000'000},
                             true,
                             Dictionary(std::move(metadata))}};
}

TEST(RecordingFormat, AFrameOfThirtyNumbersTakesAtMost400Bytes) {
    constexpr int kFrames = 300;
    std::vector<Entry> entries;
    for (int number = 1; number <= kFrames; ++number) {
        entries.push_back(fullFrame(number));
    }
    const double bytes =
        static_cast<double>(bytesOf(entries).size() - bytesOf({}).size()) / kFrames;
    RecordProperty("bytesPerFrame", std::to_string(bytes));
    std::printf("%.1f bytes per frame\n", bytes);
    EXPECT_LE(bytes, 400);
}

std::vector<Entry> someEntries() {
    std::vector<Entry> entries = {fullFrame(1), fullFrame(2)};
    entries.push_back({.at = {}, .content = recording::Run{"Name", 1}});
    entries.push_back({.at = {}, .content = Call{Operation::Property, 0, "text", "text", {}}});
    entries.push_back({.at = {}, .content = Hole{1, 0}});
    return entries;
}

TEST(RecordingFormat, CutAtEveryByteKeepsWhatWasComplete) {
    const std::vector<Entry> entries = someEntries();
    const std::string bytes = bytesOf(entries);
    // Where each entry is complete: the session, the entries, the end.
    std::vector<std::size_t> ends;
    Encoder encoder;
    ends.push_back(kFileStart.size() + encoder.encode({.at = {}, .content = kSession}).size());
    for (const Entry& entry : entries) {
        ends.push_back(ends.back() + encoder.encode(entry).size());
    }
    for (std::size_t size = 0; size < bytes.size(); ++size) {
        SCOPED_TRACE(size);
        const std::string cut = bytes.substr(0, size);
        if (size < ends.front()) {
            EXPECT_THAT(problemWith(cut), size == 0 ? HasSubstr("not a recording")
                                                    : HasSubstr("cut before its first entry"));
            continue;
        }
        const Recording file = parsed(cut);
        const auto complete = std::upper_bound(ends.begin(), ends.end(), size) - ends.begin() - 1;
        ASSERT_EQ(file.entries.size(), static_cast<std::size_t>(complete));
        EXPECT_EQ(file.bytes, ends[static_cast<std::size_t>(complete)]);
        ASSERT_TRUE(file.isCut);
        EXPECT_THAT(file.warnings().at(0), HasSubstr("is cut"));
    }
    EXPECT_FALSE(parsed(bytes).isCut);
}

TEST(RecordingFormat, EveryDamagedByteIsReadOrReported) {
    const std::string whole = bytesOf(someEntries());
    std::size_t reported = 0;
    for (std::size_t at = 0; at < whole.size(); ++at) {
        for (const int flipped : {0x01, 0x80, 0xFF}) {
            std::string bytes = whole;
            bytes[at] = static_cast<char>(bytes[at] ^ flipped);
            const std::string problem = problemWith(bytes);
            reported += problem.empty() ? 0 : 1;
            EXPECT_TRUE(problem.empty() || problem.starts_with("test.zrr: ")) << problem;
        }
    }
    // A byte of a number or a text is not noticed.
    EXPECT_GT(reported, whole.size() / 4);
}

std::string entryOf(std::string_view payload) {
    std::string bytes;
    for (std::size_t at = 0; at < kLengthSize; ++at) {
        bytes += static_cast<char>(payload.size() >> (8 * at));
    }
    return bytes + std::string(payload);
}

TEST(RecordingFormat, DamageIsNamedWithItsPlace) {
    Encoder encoder;
    const std::string start =
        std::string(kFileStart) + encoder.encode({.at = {}, .content = kSession});
    const std::string place = "test.zrr: damaged at byte " + std::to_string(start.size()) + ": ";
    const struct {
        std::string payload;
        std::string_view what;
    } cases[] = {
        {"", "not an entry"},
        {"\xC1", "not an entry"},                            // no such byte
        {std::string(100'000, '\x91'), "not an entry"},      // lists in lists, never ended
        {std::string(60, '\x91') + "\x90", "does not fit"},  // as many as there may be
        {"\x80", "not an entry"},                            // a map
        {"\xDD\xFF\xFF\xFF\xFF", "not an entry"},            // a list of four billion
        {"\x90", "too few fields"},
        {std::string("\x92\x09\0", 3), "an unknown kind of entry"},
        {std::string("\x93\x08\0\0", 4), "too many fields"},
        {std::string("\x93\x01\0\xA1x", 5), "too few fields"},
        {std::string("\x94\x01\0\xA1x\xFF", 6), "does not fit"},  // a number below 0
        {std::string("\x94\x01\0\0\x01", 5), "not a text"},
        {std::string("\x97\x02\0\x7F\0\xC0\xC0\xC0", 8), "an unknown operation"},
        {std::string("\x97\x02\0\0\0\x92\x02\x05\xC0\xC0", 10), "did not come before"},
        {std::string("\x97\x02\0\0\0\x92\x01\x05\xC0\xC0", 10), "keys that did not come before"},
        {std::string("\x97\x02\0\0\0\x93\x01\x92\xA1k\x02\xC3\xC0\xC0", 14), "does not fit"},
        {std::string("\x97\x02\0\0\0\x92\x01\x92\xA1k\x02\xC0\xC0", 13), "one entry for each"},
        {std::string("\x97\x02\0\0\0\x93\x04\x0C\x01\xC0\xC0", 11), "unknown kind of number"},
        {std::string("\x97\x02\0\0\0\x91\x09\xC0\xC0", 9), "a value of an unknown form"},
        {std::string("\x97\x02\0\0\0\xC0\xC0\x91\xA1x", 10), "not an error"},
    };
    for (const auto& one : cases) {
        const std::string problem = problemWith(start + entryOf(one.payload));
        EXPECT_THAT(problem, StartsWith(place)) << one.what;
        EXPECT_THAT(problem, HasSubstr(one.what));
    }
    EXPECT_THAT(problemWith(start + "\xFF\xFF\xFF\xFF"), HasSubstr("an entry is too long"));
    EXPECT_THAT(problemWith(bytesOf({}) + "x"), HasSubstr("something follows the end"));
}

TEST(RecordingFormat, OtherFilesAreNamed) {
    EXPECT_EQ(problemWith("{\"name\": 1}"), "test.zrr: not a recording");
    EXPECT_EQ(problemWith("zrlab recording 27\n..."),
              "test.zrr: the recording is of version 27, this program reads 1");
    EXPECT_EQ(problemWith("zrlab recording x\n"), "test.zrr: not a recording");
    Encoder encoder;
    EXPECT_EQ(problemWith(std::string(kFileStart) + encoder.encode({.at = {}, .content = End()})),
              "test.zrr: the recording does not begin with its session");
    EXPECT_THROW(readRecording("/does/not/exist.zrr"), RecordingProblem);
}

// What cannot be written leaves the tables as they were.
TEST(RecordingFormat, TooLongAndTooDeepEntriesAreNotWritten) {
    Encoder encoder;
    const auto call = [](Value value) {
        return Entry{.at = {}, .content = Call{Operation::Property, 0, std::move(value), {}, {}}};
    };
    Value deep = "text";
    for (int level = 0; level < kDeepest; ++level) {
        deep = List{deep};
    }
    EXPECT_EQ(encoder.encode(call(deep)), "");
    EXPECT_EQ(
        encoder.encode(call(List{"new", Dictionary{{"key", 1}}, std::string(kLongestEntry, 'x')})),
        "");
    Decoder decoder;
    const std::string next = encoder.encode(call(List{"new", Dictionary{{"key", 1}}}));
    const Entry entry = decoder.decode(std::string_view(next).substr(kLengthSize));
    EXPECT_EQ(std::get<Call>(entry.content).arguments, Value(List{"new", Dictionary{{"key", 1}}}));
}

}  // namespace

}  // namespace test
