// The recorder around devices: what it writes, that it changes nothing, and what it does when the file is slow.
#include "devices/recording/recorder.h"

#include <algorithm>
#include <memory>
#include <semaphore>
#include <string>
#include <vector>

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "devices/recording/kind.h"
#include "tests/devices/recording/recordings.h"
#include "tests/support/hand_fed_sensor.h"
#include "tests/support/is_error.h"
#include "tests/support/one_stream_capture.h"

namespace test {

namespace {

using namespace recording;
using platform::Value;
using ::testing::ElementsAre;

// A stream that is played by the test.
class PlayedCapture final : public OneStreamCapture {
  public:
    bool start(platform::ErrorSlot error) override {
        if (failsToStart) {
            return platform::fail(error, "board", 5, nullptr, "no clock");
        }
        return true;
    }
    bool stop(platform::ErrorSlot /*error*/) override { return stops; }

    void deliver(const platform::ImageBufferRef& buffer, std::int64_t at = 0) const {
        frameHandler()(buffer, {.value = at, .timescale = 30});
    }

    bool failsToStart = false;
    bool stops = true;
};

class RecorderTest : public ::testing::Test {
  protected:
    RecorderTest() {
        _recorder =
            Recorder::start(kSession, [this](std::string_view bytes) { _tape.write(bytes); });
    }
    ~RecorderTest() override { _recorder->finish(); }

    Recording recorded() {
        _recorder->finish();
        return _tape.recording();
    }

    std::shared_ptr<WLRylCaptureStream> openStream() {
        const auto plugIn = _recorder->record({.capture = _capture}).capture;
        _device = plugIn->device(nullptr);
        return _device->streams(nullptr)->at(0);
    }

    Tape _tape;
    RecorderRef _recorder;
    const std::shared_ptr<PlayedCapture> _capture = std::make_shared<PlayedCapture>();
    std::shared_ptr<WLRylCaptureDevice> _device;
};

std::vector<std::string> textsOf(const Recording& recording) {
    std::vector<std::string> texts;
    for (const Call& call : allOf<Call>(recording)) {
        texts.push_back(callText(call.operation, call.arguments));
    }
    return texts;
}

TEST_F(RecorderTest, WritesCallsAndFramesInTheirOrderAndPhase) {
    const auto stream = openStream();
    std::vector<platform::MediaTime> seen;
    const Value handlers = handlersWith([&](const platform::ImageBufferRef& /*buffer*/,
                                            platform::MediaTime time) { seen.push_back(time); });
    constexpr auto kHandlers = kRylCaptureStreamProperty_VideoOutputHandlers;
    EXPECT_TRUE(_device->requestControlOfStreams({stream, nullptr}, nullptr));
    EXPECT_TRUE(stream->setValue(handlers, kHandlers, nullptr));

    _capture->failsToStart = true;
    platform::ErrorRef error;
    EXPECT_FALSE(stream->start(&error));
    EXPECT_THAT(error, IsPlainError("board", 5, "no clock"));
    EXPECT_FALSE(stream->start(nullptr));
    _capture->failsToStart = false;
    EXPECT_TRUE(stream->start(&error));
    auto buffer = bufferWith(platform::Dictionary{{"FrameNumber", 7}});
    const std::weak_ptr<const platform::ImageBuffer> lent = buffer;
    _capture->deliver(buffer, 1);
    buffer = nullptr;
    EXPECT_TRUE(lent.expired());  // the recording holds the metadata only
    _capture->deliver(nullptr, 2);
    EXPECT_TRUE(stream->stop(&error));
    _capture->deliver(bufferWith("text"), 3);
    EXPECT_THAT(error, IsPlainError("board", 5, "no clock"));  // success leaves the slot alone
    EXPECT_EQ(seen.size(), 3U);

    const Recording file = recorded();
    EXPECT_THAT(textsOf(file),
                ElementsAre("device()", "streams()", "requestControlOfStreams([2, nothing])",
                            "setValue([ryl.stream.output-handlers, {ryl.output.primary-scaler: "
                            "{ryl.output.frame-handler: (object)}}])",
                            "start()", "start()", "start()", "stop()"));
    const auto calls = allOf<Call>(file);
    EXPECT_THAT(calls[4].error, IsPlainError("board", 5, "no clock"));
    EXPECT_THAT(calls[5].error, IsPlainError("board", 5, "no clock"));  // also without a slot
    EXPECT_EQ(calls[6].error, nullptr);
    const auto frames = allOf<Frame>(file);
    ASSERT_EQ(frames.size(), 3U);
    for (const Frame& frame : frames) {
        EXPECT_EQ(frame.stream, 2U);
        EXPECT_EQ(frame.phase.start, 1U);  // those that failed do not count
    }
    EXPECT_EQ(frames[0].metadata["FrameNumber"], Value(7));
    EXPECT_FALSE(frames[0].phase.stopped);
    EXPECT_FALSE(frames[1].hasBuffer);
    EXPECT_TRUE(frames[2].phase.stopped);
    EXPECT_EQ(frames[2].metadata, Value("text"));
    EXPECT_EQ(frames[2].time.value, 3);
}

TEST_F(RecorderTest, ObjectsKeepTheirNumberAndWorkAfterTheEnd) {
    const auto stream = openStream();
    EXPECT_EQ(_device->streams(nullptr)->at(0), stream);
    stream->start(nullptr);
    const Recording file = recorded();
    EXPECT_EQ(textsOf(file).size(), 4U);
    EXPECT_TRUE(stream->stop(nullptr));
    EXPECT_EQ(_tape.recording().bytes, file.bytes);
    EXPECT_FALSE(file.isCut);
}

TEST_F(RecorderTest, SensorReportsAndSourcesThatVanish) {
    const auto sensor = std::make_shared<HandFedSensor>();
    const auto hid = _recorder->record({.hid = std::make_shared<OneSensorBus>(sensor)}).hid;
    const auto manager = hid->createManager();
    manager->enumerateDevicesMatching({platform::Dictionary{{"PrimaryUsage", 36}}});
    const auto device = manager->devices().at(0);
    std::size_t received = 0;
    device->setInputReportCallback([&](std::int64_t /*id*/, std::span<const std::byte> /*data*/,
                                       const platform::ErrorRef& /*error*/) { ++received; });
    const auto runLoop = platform::RunLoop::forThisThread();
    const auto source = std::make_shared<platform::RunLoopSource>([] {});
    runLoop->addSource(source, platform::kRunLoopDefaultMode);
    device->scheduleWithRunLoop(runLoop, platform::kRunLoopDefaultMode);
    const std::byte data[] = {std::byte{118}, std::byte{0}};
    sensor->callback(118, data, nullptr);
    sensor->callback(0, {}, std::make_shared<const platform::Error>("board", 1, "gone"));
    runLoop->run(platform::kRunLoopDefaultMode, 0);  // with a source: nothing vanished
    runLoop->removeSource(source, platform::kRunLoopDefaultMode);
    EXPECT_EQ(runLoop->run(platform::kRunLoopDefaultMode, 60), platform::RunLoopOutcome::Finished);
    device->unscheduleFromRunLoop(runLoop, platform::kRunLoopDefaultMode);
    runLoop->run(platform::kRunLoopDefaultMode, 60);  // not watched any more
    EXPECT_EQ(received, 2U);

    const Recording file = recorded();
    const auto reports = allOf<Report>(file);
    ASSERT_EQ(reports.size(), 2U);
    EXPECT_EQ(reports[0].data, std::string("\x76\0", 2));
    EXPECT_EQ(reports[0].schedule, 1U);
    EXPECT_THAT(reports[1].error, IsPlainError("board", 1, "gone"));
    EXPECT_EQ(allOf<Vanished>(file).size(), 1U);
}

// A file that takes nothing until it is let go.
class StuckFile {
  public:
    Recorder::Write write() {
        return [this](std::string_view bytes) {
            _isStuck.release();
            _go.acquire();
            _go.release();
            tape.write(bytes);
        };
    }
    void awaitStuck() { _isStuck.acquire(); }
    void letGo() { _go.release(); }

    Tape tape;

  private:
    std::counting_semaphore<> _isStuck{0};
    std::counting_semaphore<> _go{0};
};

TEST(RecorderOverflow, IsAHoleThatSaysHowMuch) {
    StuckFile file;
    const auto recorder = Recorder::start(kSession, file.write());
    file.awaitStuck();
    constexpr std::size_t kTooMany = 10;
    for (std::size_t number = 1; number <= Recorder::kMostDeliveries + kTooMany; ++number) {
        recorder->add(recorder->now(),
                      Event{1, {1, false}, {}, 0, static_cast<std::int64_t>(number)});
    }
    // Calls have room of their own.
    recorder->add(recorder->now(), Call{Operation::Stop, 1, {}, true, {}});
    file.letGo();
    const Hole lost = recorder->finish();
    EXPECT_EQ(lost.deliveries, kTooMany);
    EXPECT_EQ(lost.calls, 0U);

    const Recording recording = file.tape.recording();
    const auto events = allOf<Event>(recording);
    ASSERT_EQ(events.size(), Recorder::kMostDeliveries);
    EXPECT_EQ(events.back().info, static_cast<std::int64_t>(Recorder::kMostDeliveries));
    EXPECT_TRUE(std::holds_alternative<Call>(recording.entries.back().content));
    EXPECT_EQ(recording.lost.deliveries, kTooMany);
    EXPECT_THAT(recording.warnings(),
                ElementsAre("the recording has holes: 10 deliveries and 0 calls were lost"));
}

TEST(RecorderOverflow, OfCallsIsOneToo) {
    StuckFile file;
    const auto recorder = Recorder::start(kSession, file.write());
    file.awaitStuck();
    for (std::size_t number = 0; number < Recorder::kMostCalls + 2; ++number) {
        recorder->add(recorder->now(), Call{Operation::Stop, 1, {}, true, {}});
    }
    file.letGo();
    EXPECT_EQ(recorder->finish().calls, 2U);
    EXPECT_EQ(file.tape.recording().lost.calls, 2U);
}

TEST(RecorderOverflow, AnEntryThatTheFormatDoesNotTakeIsAHole) {
    Tape tape;
    const auto recorder =
        Recorder::start(kSession, [&](std::string_view bytes) { tape.write(bytes); });
    recorder->add({}, Report{1, 1, 118, std::string(kLongestEntry, 'x'), nullptr});
    EXPECT_EQ(recorder->finish().deliveries, 1U);
    EXPECT_EQ(tape.recording().lost.deliveries, 1U);
}

}  // namespace

}  // namespace test
