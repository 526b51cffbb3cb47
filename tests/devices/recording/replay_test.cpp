// The replay: what was recorded, in its order, and nothing else.
#include <atomic>
#include <chrono>
#include <cstdio>
#include <cstdlib>
#include <filesystem>
#include <fstream>
#include <memory>
#include <string>
#include <thread>
#include <vector>

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "devices/recording/kind.h"
#include "devices/recording/replayed.h"
#include "platform/log.h"
#include "platform/run_loop.h"
#include "tests/devices/recording/recordings.h"
#include "tests/support/eventually.h"
#include "tests/support/is_error.h"

namespace test {

namespace {

using namespace recording;
using platform::Dictionary;
using platform::List;
using platform::Value;
using std::chrono::hours;
using std::chrono::milliseconds;
using ::testing::ElementsAre;
using ::testing::HasSubstr;
using ::testing::IsEmpty;

constexpr auto kMode = platform::kRunLoopDefaultMode;
constexpr auto kHandlers = kRylCaptureStreamProperty_VideoOutputHandlers;

Entry called(Operation operation, ObjectId object, Value arguments, Value result) {
    return {.at = {},
            .content = Call{operation, object, std::move(arguments), std::move(result), {}}};
}

Entry frameAt(Microseconds at, int number, Phase phase = {1, false}) {
    return {.at = at, .content = Frame{2, phase, {.value = number}, true, Dictionary()}};
}

// The calls of a client that streams once, without its deliveries.
std::vector<Entry> streaming(std::vector<Entry> deliveries) {
    std::vector<Entry> entries = {
        called(Operation::Device, 0, {}, 1),
        called(Operation::Streams, 1, {}, List{2, Value()}),
        called(Operation::SetValue, 2, List{kHandlers, withoutObjects(handlersWith(nullptr))},
               true),
        called(Operation::Start, 2, {}, true),
    };
    entries.insert(entries.end(), deliveries.begin(), deliveries.end());
    entries.push_back(called(Operation::Stop, 2, {}, true));
    entries.push_back(called(Operation::Invalidate, 1, {}, true));
    return entries;
}

ScriptRef scriptOf(const std::vector<Entry>& entries, double speed = 1) {
    return std::make_shared<Script>(parsed(bytesOf(entries)), speed);
}

// A client of a replayed camera.
class Client {
  public:
    using OnFrame = std::function<void(std::int64_t number)>;

    explicit Client(
        const ScriptRef& script, OnFrame onFrame = [](std::int64_t) {}) {
        plugIn = replayCapture(script);
        device = plugIn->device(nullptr);
        auto streams = device->streams(nullptr);
        EXPECT_EQ(streams->at(1), nullptr);
        stream = streams->at(0);
        WLRylFrameHandler handler = [this, onFrame = std::move(onFrame)](
                                        const platform::ImageBufferRef& /*buffer*/,
                                        platform::MediaTime time) {
            last = time.value;
            ++frames;
            onFrame(time.value);
        };
        EXPECT_TRUE(stream->setValue(handlersWith(std::move(handler)), kHandlers, nullptr));
    }

    std::shared_ptr<WLISPCapturePlugIn> plugIn;
    std::shared_ptr<WLRylCaptureDevice> device;
    std::shared_ptr<WLRylCaptureStream> stream;
    // Written by the replay's thread.
    std::atomic<int> frames{0};
    std::atomic<std::int64_t> last{0};
};

TEST(Replay, DeliversWhatCameBeforeTheStopAndTheRestOnlyAfterIt) {
    Client client(scriptOf(streaming(
        {frameAt({}, 1), frameAt({}, 2), frameAt({}, 3, {1, true}), frameAt({}, 4, {1, true})})));
    EXPECT_TRUE(client.stream->start(nullptr));
    EXPECT_TRUE(eventually([&] { return client.frames == 2; }));
    EXPECT_TRUE(client.stream->stop(nullptr));
    EXPECT_TRUE(eventually([&] { return client.frames == 4; }));
    EXPECT_EQ(client.last, 4);
    EXPECT_TRUE(client.device->invalidate(nullptr));
}

TEST(Replay, AStopAndAnInvalidationBringWhatIsStillDue) {
    Client client(scriptOf(streaming({frameAt({}, 1), frameAt(hours(1), 2), frameAt(hours(2), 3),
                                      frameAt(hours(3), 4, {1, true})})));
    EXPECT_TRUE(client.stream->start(nullptr));
    EXPECT_TRUE(eventually([&] { return client.frames == 1; }));
    EXPECT_TRUE(client.stream->stop(nullptr));
    EXPECT_EQ(client.frames, 3);
    EXPECT_TRUE(client.device->invalidate(nullptr));
    EXPECT_EQ(client.frames, 4);
}

TEST(Replay, DeliversNoEarlierThanRecordedAtItsSpeed) {
    Client client(scriptOf(streaming({frameAt(milliseconds(20), 1)}), 0.5));
    const auto start = std::chrono::steady_clock::now();
    EXPECT_TRUE(client.stream->start(nullptr));
    EXPECT_TRUE(eventually([&] { return client.frames == 1; }));
    EXPECT_GE(std::chrono::steady_clock::now() - start, milliseconds(40));
}

// Inside a handler nothing waits for it.
TEST(Replay, StopsAndEndsInsideAHandler) {
    Client* self = nullptr;
    std::atomic<bool> isDone{false};
    Client client(scriptOf(streaming({frameAt({}, 1), frameAt({}, 2), frameAt({}, 3)})),
                  [&](std::int64_t number) {
                      if (number == 1) {
                          EXPECT_TRUE(self->stream->stop(nullptr));
                      } else if (number == 2) {
                          EXPECT_TRUE(self->device->invalidate(nullptr));
                          isDone = true;
                      }
                  });
    self = &client;
    EXPECT_TRUE(client.stream->start(nullptr));
    EXPECT_TRUE(eventually([&] { return isDone.load(); }));
    EXPECT_EQ(client.frames, 2);
}

TEST(Replay, TheLastReferencesMayGoInsideAHandler) {
    std::vector<Entry> frames;
    for (int number = 1; number <= 50; ++number) {
        frames.push_back(frameAt({}, number));
    }
    for (int round = 0; round < 20; ++round) {
        struct Held {
            std::shared_ptr<WLRylCaptureDevice> device;
            std::shared_ptr<WLRylCaptureStream> stream;
        };
        const auto held = std::make_shared<Held>();
        held->device = replayCapture(scriptOf(streaming(frames)))->device(nullptr);
        auto stream = held->device->streams(nullptr)->at(0);
        held->stream = stream;
        const std::weak_ptr<WLRylCaptureStream> left = stream;
        const WLRylFrameHandler handler = [held](const auto& /*buffer*/, auto time) {
            if (time.value == 10) {
                held->device = nullptr;
                held->stream = nullptr;
            }
        };
        EXPECT_TRUE(stream->setValue(handlersWith(handler), kHandlers, nullptr));
        EXPECT_TRUE(stream->start(nullptr));
        stream = nullptr;
        EXPECT_TRUE(eventually([&] { return left.expired(); }));
    }
}

// What the log gets.
struct Lines final : platform::LogSink {
    void write(const platform::LogLine& line) override { lines.emplace_back(line.message); }
    std::vector<std::string> lines;
};

class ReplayOfCalls : public ::testing::Test {
  protected:
    ReplayOfCalls() { platform::setLogSink(_log, platform::LogLevel::Error); }
    ~ReplayOfCalls() override { platform::setLogSink(nullptr, platform::LogLevel::Error); }

    const std::shared_ptr<Lines> _log = std::make_shared<Lines>();
};

TEST_F(ReplayOfCalls, ACallThatWasNotRecordedIsNamed) {
    const auto error = std::make_shared<const platform::Error>("board", 5, "refused");
    const auto script = scriptOf({
        called(Operation::Device, 0, {}, 1),
        called(Operation::Streams, 1, {}, List{2}),
        {.at = {}, .content = Call{Operation::SetValue, 2, List{"rate", 30}, false, error}},
        called(Operation::SetValue, 2, List{"rate", 30}, true),
        called(Operation::MainDisplay, 0, {}, List{0, 17}),
        called(Operation::RegistryObject, 0, 17, 81),
        called(Operation::Property, 0, List{81, "power"}, Dictionary{{"on", true}}),
    });
    const auto plugIn = replayCapture(script);
    const auto stream = plugIn->device(nullptr)->streams(nullptr)->at(0);
    const auto display = replayDisplay(script);
    const auto registry = replayRegistry(script);
    platform::DisplayId id = 3;
    EXPECT_EQ(display->mainDisplay(id), 0);
    EXPECT_EQ(id, 17U);
    EXPECT_EQ(display->registryObject(17), 81U);
    EXPECT_EQ(registry->property(81, "power")["on"], Value(true));

    // Each answer once, in its order.
    platform::ErrorRef slot;
    EXPECT_FALSE(stream->setValue(30, "rate", &slot));
    EXPECT_THAT(slot, IsPlainError("board", 5, "refused"));
    slot = nullptr;
    EXPECT_TRUE(stream->setValue(30, "rate", &slot));
    EXPECT_EQ(slot, nullptr);
    EXPECT_THAT(_log->lines, IsEmpty());

    EXPECT_FALSE(stream->setValue(30, "rate", &slot));
    EXPECT_THAT(
        slot,
        IsPlainError("replay", 1, "setValue([rate, 30]) was not recorded more often than 2 times"));
    EXPECT_FALSE(stream->setValue(60, "rate", &slot));
    EXPECT_THAT(slot, IsPlainError("replay", 1, "setValue([rate, 60]) was not recorded"));
    EXPECT_FALSE(stream->start(&slot));
    EXPECT_THAT(slot, IsPlainError("replay", 1, "start() was not recorded"));
    EXPECT_FALSE(stream->valueForProperty("rate", &slot).isPresent());
    EXPECT_EQ(plugIn->device(&slot), nullptr);
    EXPECT_EQ(replayMeterix(script)->simpleChannels(&slot), nullptr);
    EXPECT_THAT(slot, IsPlainError("replay", 1, "simpleChannels() was not recorded"));
    // Without a slot the log says it.
    _log->lines.clear();
    EXPECT_NE(display->mainDisplay(id), 0);
    EXPECT_EQ(display->registryObject(18), 0U);
    EXPECT_FALSE(registry->property(81, "other").isPresent());
    EXPECT_EQ(replayHid(script)->createManager(), nullptr);
    EXPECT_THAT(_log->lines, ElementsAre("mainDisplay() was not recorded more often than 1 times",
                                         "registryObject(18) was not recorded",
                                         "property([81, other]) was not recorded",
                                         "createManager() was not recorded"));
}

TEST_F(ReplayOfCalls, SnapshotsAnswerForTheirChannelsAndCounts) {
    const List first{"group", "subgroup", "first"};
    const List second{"group", "subgroup", "second"};
    const auto script = scriptOf({
        called(Operation::SimpleChannels, 0, {}, List{first, second}),
        called(Operation::Sample, 0, List{Value(second)}, List{Value(List{second, 5})}),
        called(Operation::Sample, 0, List{Value(second)}, List{Value(List{second, Value()})}),
        called(Operation::Difference, 0, List{List{Value()}, List{5}},
               List{Value(List{second, -5})}),
    });
    const auto meterix = replayMeterix(script);
    const auto channels = meterix->simpleChannels(nullptr);
    ASSERT_EQ(channels->size(), 2U);
    EXPECT_EQ(channels->at(1)->name(), "second");
    EXPECT_EQ(channels->at(1)->subGroupName(), "subgroup");
    EXPECT_EQ(meterix->sample(*channels, nullptr), nullptr);  // of both: not recorded
    const platform::MeterixChannels one = {channels->at(1)};
    const auto before = meterix->sample(one, nullptr);
    EXPECT_EQ(before->at(0).channel().count(), platform::Number(5));
    const auto after = meterix->sample(one, nullptr);
    EXPECT_FALSE(after->at(0).channel().count().isPresent());
    platform::ErrorRef slot;
    EXPECT_EQ(meterix->difference(*before, *after, &slot), nullptr);  // the wrong way round
    EXPECT_THAT(slot, IsPlainError("replay", 1, "difference([[5], [nothing]]) was not recorded"));
    EXPECT_EQ(meterix->difference(*after, *before, nullptr)->at(0).channel().count(),
              platform::Number(-5));
}

// The calls of a client of one sensor, and what it sends.
ScriptRef sensorScript(const std::vector<Content>& sent) {
    std::vector<Entry> entries = {
        called(Operation::CreateManager, 0, {}, 1),
        called(Operation::Enumerate, 1, List(), {}),
        called(Operation::Devices, 1, {}, List{2}),
        called(Operation::Open, 2, {}, true),
        called(Operation::SetCallback, 2, true, {}),
        called(Operation::SetFeatureReport, 2, List{171, std::string("\xAB\x01")}, true),
        called(Operation::Schedule, 2, kMode, {}),
    };
    for (const Content& content : sent) {
        entries.push_back({.at = {}, .content = content});
    }
    entries.push_back(called(Operation::SetCallback, 2, false, {}));
    entries.push_back(called(Operation::Unschedule, 2, kMode, {}));
    entries.push_back(called(Operation::Close, 2, {}, true));
    return scriptOf(entries);
}

Report reportOf(std::string data, platform::ErrorRef error = nullptr) {
    return {.sensor = 2, .schedule = 1, .reportID = 118, .data = std::move(data), .error = error};
}

class ReplayOfASensor : public ::testing::Test {
  protected:
    void open(const ScriptRef& script) {
        _manager = replayHid(script)->createManager();
        _manager->enumerateDevicesMatching({});
        _sensor = _manager->devices().at(0);
        EXPECT_TRUE(_sensor->open(nullptr));
        _sensor->setInputReportCallback([this](std::int64_t id, std::span<const std::byte> data,
                                               const platform::ErrorRef& error) {
            EXPECT_EQ(platform::RunLoop::current(), _runLoop);
            EXPECT_EQ(id, 118);
            _received.emplace_back(error != nullptr ? error->localizedDescription()
                                                    : std::to_string(data.size()));
            if (_received.size() == _stopAfter) {
                _runLoop->stop();
            }
        });
        const std::byte mode[] = {std::byte{171}, std::byte{1}};
        EXPECT_TRUE(_sensor->setFeatureReportWithID(171, mode, nullptr));
        _sensor->scheduleWithRunLoop(_runLoop, kMode);
    }
    void close() {
        _sensor->setInputReportCallback({});
        _sensor->unscheduleFromRunLoop(_runLoop, kMode);
        EXPECT_TRUE(_sensor->close(nullptr));
    }

    const std::shared_ptr<platform::RunLoop> _runLoop = platform::RunLoop::forThisThread();
    std::shared_ptr<WLHIDManager> _manager;
    std::shared_ptr<WLIOHIDDeviceInterface> _sensor;
    std::size_t _stopAfter = 0;
    std::vector<std::string> _received;
};

TEST_F(ReplayOfASensor, ReportsComeOnTheRunLoopUntilTheSensorVanishes) {
    const auto gone = std::make_shared<const platform::Error>("board", 1, "gone");
    open(sensorScript({reportOf("a"), reportOf("ab"), reportOf("", gone), Vanished{2, 1}}));
    EXPECT_EQ(_runLoop->run(kMode, 60), platform::RunLoopOutcome::Finished);
    EXPECT_THAT(_received, ElementsAre("1", "2", "gone"));
    close();
}

TEST_F(ReplayOfASensor, NothingComesOnceItIsUnscheduled) {
    _stopAfter = 1;
    open(sensorScript({reportOf("a"), reportOf("ab")}));
    EXPECT_EQ(_runLoop->run(kMode, 60), platform::RunLoopOutcome::Stopped);
    close();
    EXPECT_EQ(_runLoop->run(kMode, 60), platform::RunLoopOutcome::Finished);
    EXPECT_THAT(_received, ElementsAre("1"));
}

TEST_F(ReplayOfASensor, ASensorThatIsDroppedLeavesTheRunLoop) {
    open(sensorScript({reportOf("a")}));
    _sensor = nullptr;
    _manager = nullptr;
    EXPECT_EQ(_runLoop->run(kMode, 60), platform::RunLoopOutcome::Finished);
}

class ReplayKind : public ::testing::Test {
  protected:
    ~ReplayKind() override { std::filesystem::remove(_path); }

    std::string file(const std::string& bytes) {
        std::ofstream(_path, std::ios::binary) << bytes;
        return _path;
    }
    std::string problemOf(const std::string& what) {
        try {
            kind().open({.what = what});
            return "";
        } catch (const std::invalid_argument& problem) {
            return problem.what();
        }
    }

    const std::string _path =
        ::testing::TempDir() + "replay_kind_" + std::to_string(getpid()) + ".zrr";
};

TEST_F(ReplayKind, ADeviceIsWhatWasRecorded) {
    const std::string whole = bytesOf(streaming({frameAt({}, 1)}));
    const devices::Device device = kind().open({.what = file(whole)});
    EXPECT_EQ(device.name, "board");
    EXPECT_EQ(device.facts.front(), kSession.facts.front());
    EXPECT_EQ(device.facts.back().first, "recorded");
    EXPECT_NE(device.services.capture, nullptr);
    EXPECT_EQ(device.services.display, nullptr);
    EXPECT_THAT(serviceNames(device.services), kSession.services);

    const devices::Device cut = kind().open({.what = file(whole.substr(0, whole.size() - 1))});
    EXPECT_EQ(cut.facts.back().first, "missing");
    EXPECT_THAT(cut.facts.back().second, HasSubstr("is cut"));
    EXPECT_NE(cut.services.capture->device(nullptr), nullptr);
}

TEST_F(ReplayKind, WhatCannotBeReplayedIsRefused) {
    EXPECT_THAT(problemOf(""), HasSubstr("name the file"));
    EXPECT_THAT(problemOf(_path), HasSubstr("cannot be read"));
    EXPECT_THAT(problemOf(file("text")), HasSubstr(_path + ": not a recording"));
    EXPECT_EQ(problemOf(file(bytesOf({{.at = {}, .content = Hole{3, 0}}}))), "");
    EXPECT_THAT(problemOf(file(bytesOf({{.at = {}, .content = Hole{0, 3}}}))),
                HasSubstr("3 calls were lost"));
}

}  // namespace

}  // namespace test
