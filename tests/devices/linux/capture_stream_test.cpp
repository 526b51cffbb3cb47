#include "devices/linux/capture_stream.h"

#include <atomic>
#include <cerrno>
#include <latch>
#include <thread>

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "devices/linux/capture_service.h"
#include "devices/linux/frame_metadata.h"
#include "tests/devices/linux/fake_video.h"
#include "tests/devices/linux/machine_in_folder.h"
#include "tests/support/eventually.h"
#include "tests/support/is_error.h"

using namespace linux_device;
using platform::Dictionary;
using platform::Number;
using platform::Value;
using test::eventually;
using testing::ElementsAre;
using testing::IsEmpty;

namespace {

NumberSource field(const std::string& name, std::size_t at, const std::string& type) {
    return {.name = name, .source = BufferField{at, *dataTypeOf(type)}};
}

NumberSource control(const std::string& name) {
    return {.name = name, .source = Control{"Gain"}, .atMostEvery = 0};
}

std::vector<std::byte> bytes(std::initializer_list<int> values) {
    std::vector<std::byte> result;
    for (const int value : values) {
        result.push_back(static_cast<std::byte>(value));
    }
    return result;
}

TEST(FramePairs, ComeTogetherByTime) {
    using Clock = std::chrono::steady_clock;
    const auto now = Clock::now();
    FramePairs pairs(true);
    const auto picture = [&](std::int64_t time) {
        pairs.addPicture({.sequence = 9, .microseconds = time}, now);
    };
    // What comes out: times, with a minus where metadata is missing.
    const auto out = [&](Clock::time_point at) {
        std::vector<std::int64_t> times;
        while (const auto frame = pairs.next(at)) {
            times.push_back(frame->metadata.has_value() ? frame->picture.microseconds
                                                        : -frame->picture.microseconds);
        }
        return times;
    };
    EXPECT_EQ(pairs.deadline(), Clock::time_point::max());
    picture(100);
    EXPECT_THAT(out(now), IsEmpty());
    EXPECT_EQ(pairs.deadline(), now + FramePairs::kPatience);
    pairs.addMetadata(100, {});
    EXPECT_THAT(out(now), ElementsAre(100));
    pairs.addMetadata(200, {});  // its picture was lost
    pairs.addMetadata(300, {});
    picture(300);
    picture(400);  // its metadata was lost
    picture(500);
    EXPECT_THAT(out(now), ElementsAre(300));
    pairs.addMetadata(500, {});
    EXPECT_THAT(out(now), ElementsAre(-400, 500));
    picture(600);
    EXPECT_THAT(out(now + FramePairs::kPatience), ElementsAre(-600));
}

TEST(FrameMetadata, IsDecodedAsDescribed) {
    const auto buffer = bytes({0x34, 0x92, 0xFF, 0xFE, 0x00, 0x00, 0x80, 0x3F});
    const struct {
        const char* type;
        std::size_t at;
        Conversion conversion;
        std::string result;
    } cases[] = {
        {"u8", 0, {}, "52"},
        {"i8", 1, {}, "-110"},
        {"u16", 0, {}, "37428"},
        {"u16be", 0, {}, "13458"},
        {"i16be", 2, {}, "-2"},
        {"f32", 4, {}, "1"},
        {"u32", 0, {.mask = 0xF00, .shift = 8}, "2"},
        {"u8", 0, {.mask = 0x10, .shift = 4, .scale = -8192, .add = 8192}, "0"},
        {"i16be", 2, {.scale = 0.5, .add = 3}, "2"},
        {"u64", 1, {}, "(null)"},  // the buffer ends within it
        {"u8", 8, {}, "(null)"},
        {"u8", 99, {}, "(null)"},
    };
    for (const auto& each : cases) {
        std::vector<NumberSource> described = {field("x", each.at, each.type)};
        described[0].conversion = each.conversion;
        described[0].optional = true;
        FrameMetadata metadata(described, Machine(), nullptr);
        EXPECT_EQ(metadata.make(buffer, 7)->number("x").text(), each.result)
            << each.type << " at " << each.at;
    }
}

TEST(FrameMetadata, LacksNoKeyThatIsNotOptional) {
    const test::MachineInFolder files;
    std::vector<NumberSource> described = {field("bytes", 0, "u16"), {.name = "file"}};
    described[1].source = FileNumber{.file = {"/celsius"}};
    described[1].atMostEvery = 0;
    FrameMetadata metadata(described, files.machine(),
                           std::make_shared<test::FakeVideo>("/dev/video0"));
    EXPECT_FALSE(metadata.make(bytes({1, 2}), 1).has_value());
    files.write("/celsius", "25");
    EXPECT_EQ(*metadata.make(bytes({1, 2}), 3), (Dictionary{{"FrameNumber", std::uint64_t{3}},
                                                            {"bytes", std::uint64_t{0x201}},
                                                            {"file", std::int64_t{25}}}));
    EXPECT_FALSE(metadata.make(bytes({1}), 1).has_value());
    described[0].optional = true;
    EXPECT_TRUE(metadata.make(bytes({1}), 1).has_value());
}

class LinuxCapture : public testing::Test {
  protected:
    struct Frame {
        platform::ImageBufferRef buffer;
        std::int64_t microseconds;
    };

    void SetUp() override {
        _described = {.name = "ir",
                      .portType = "port",
                      .metadataFormat = "UVCH",
                      .buffers = 3,
                      .formats = {{"GREY", 320, 180}, {"GREY", 640, 360}},
                      .metadata = {field("light", 0, "u8")},
                      .events = {{.cause = EventCause::LostFrames, .code = 3},
                                 {.cause = EventCause::ErrorBuffer, .code = 4}}};
        _described.errorCounters = {{.name = "lost", .source = StreamCount::LostFrames},
                                    {.name = "broken", .source = StreamCount::ErrorBuffers}};
        const auto add = [&](const std::string& name, auto target) {
            _described.properties.push_back({.name = name, .target = target});
        };
        add("formatIndex", FormatChoice());
        add("maximumFrameRate", FrameInterval());
        add("lightSource.mode", ExtensionUnit{3, 1, *dataTypeOf("u32")});
        add("lightSource.current", Accepted());
        add("autoExposure", Control{"Auto"});
        _described.properties.back().values = {{"true", 3}, {"false", 1}};
    }

    // The stream, under control.
    void connect() {
        const auto plugIn = makeCapturePlugIn(
            {.streams = {_described},
             .machine = Machine(),
             .starts = _starts,
             .open = [this](const Machine&, const StreamDescription& described) {
                 return Camera{_video, described.metadataFormat.empty() ? nullptr : _metadata};
             }});
        _device = plugIn->device(nullptr);
        _stream = _device->streams(nullptr)->front();
        ASSERT_TRUE(_device->requestControlOfStreams({_stream}, nullptr));
    }
    bool set(std::string_view property, const Value& value) {
        _error = nullptr;
        return _stream->setValue(value, property, &_error);
    }
    void installHandler(WLRylFrameHandler handler) {
        WLRylEventHandler event = [this](std::int32_t code, platform::MediaTime,
                                         std::int64_t info) {
            const platform::MutexLock lock(_mutex);
            _events.emplace_back(code, info);
        };
        ASSERT_TRUE(
            set(kRylCaptureStreamProperty_VideoOutputHandlers,
                Dictionary{{kRylCaptureStreamVideoOutputID_PrimaryScaler,
                            Dictionary{{kRylCaptureStreamVideoOutputHandlerKey_PixelBufferHandler,
                                        Value::opaque(std::move(handler))},
                                       {kRylCaptureStreamVideoOutputHandlerKey_EventHandler,
                                        Value::opaque(std::move(event))}}}}));
    }
    // Keeps what is delivered.
    void startKeeping() {
        installHandler([this](const platform::ImageBufferRef& buffer, platform::MediaTime time) {
            const platform::MutexLock lock(_mutex);
            _frames.push_back({buffer, time.value});
        });
        ASSERT_TRUE(_stream->start(nullptr));
    }
    bool fill(std::uint32_t sequence, bool isBroken = false) {
        const std::int64_t time = std::int64_t{1000} + sequence;
        _metadata->fill(sequence + 77, time, bytes({static_cast<int>(sequence)}), isBroken);
        return _video->fill(sequence, time, {}, isBroken);
    }
    std::vector<Frame> takeFrames(std::size_t count) {
        EXPECT_TRUE(eventually([&] {
            const platform::MutexLock lock(_mutex);
            return _frames.size() >= count;
        }));
        const platform::MutexLock lock(_mutex);
        return std::exchange(_frames, {});
    }
    static std::string metadataText(const Frame& frame) {
        const Value& metadata =
            frame.buffer->attachment(kRylCaptureSampleBufferAttachmentKey_MetadataDictionary);
        return metadata["FrameNumber"].asNumber().text() + ":" +
               metadata["light"].asNumber().text();
    }
    std::string counters() {
        const Value value =
            _stream->valueForProperty(kRylCaptureStreamProperty_ErrorCounters, &_error);
        return value["lost"].asNumber().text() + " " + value["broken"].asNumber().text();
    }

    StreamDescription _described;
    const std::shared_ptr<test::FakeVideo> _video =
        std::make_shared<test::FakeVideo>("/dev/video0");
    const std::shared_ptr<test::FakeVideo> _metadata =
        std::make_shared<test::FakeVideo>("/dev/video1");
    const std::shared_ptr<StreamStarts> _starts = std::make_shared<StreamStarts>(0);
    platform::ErrorRef _error;
    platform::Mutex _mutex;
    std::vector<Frame> _frames ZR_GUARDED_BY(_mutex);
    std::vector<std::pair<std::int32_t, std::int64_t>> _events ZR_GUARDED_BY(_mutex);
    std::shared_ptr<WLRylCaptureDevice> _device;
    std::shared_ptr<WLRylCaptureStream> _stream;
};

TEST_F(LinuxCapture, WritesPropertiesAsDescribed) {
    connect();
    const auto light = [](std::string_view key, int value) -> Value {
        return Dictionary{{key, value}};
    };
    const auto mode = kRylCaptureStreamInfraredLightSourceConfigurationKey_Mode;
    const auto current =
        kRylCaptureStreamInfraredLightSourceConfigurationKey_StructuredLightCurrent;
    const auto pattern =
        kRylCaptureStreamInfraredLightSourceConfigurationKey_StructuredLightPattern;
    const auto source = kRylCaptureStreamProperty_InfraredLightSourceConfiguration;
    EXPECT_TRUE(set(kRylCaptureStreamProperty_FormatIndex, 1));
    EXPECT_TRUE(set(kRylCaptureStreamProperty_MaximumFrameRate, 30));
    EXPECT_TRUE(set(kRylCaptureStreamProperty_AEEnabled, false));
    EXPECT_TRUE(set(source, light(mode, 2)));
    EXPECT_TRUE(set(source, light(current, 9)));
    EXPECT_THAT(_video->settings(), ElementsAre("GREY 640", "rate 30", "Auto 1", "unit 3 2"));

    _video->failing = "Auto 3";
    const struct {
        std::string_view property;
        Value value;
        std::string problem;
    } refused[] = {
        {kRylCaptureStreamProperty_FormatIndex, 2, "formatIndex: 2 is none of 2 formats"},
        {kRylCaptureStreamProperty_AEEnabled, true,
         "/dev/video0: Auto 3: Input/output error (EIO)"},
        {kRylCaptureStreamProperty_AEEnabled, 7,
         "autoExposure: the description has no value for 7"},
        {kRylCaptureStreamProperty_MinimumFrameRate, 30,
         "minimumFrameRate: the description does not say what sets it"},
        {source, light(pattern, 1),
         "lightSource.pattern: the description does not say what sets it"},
        {source, light(mode, 1), ""},
        {source, 1, "lightSource: not a dictionary"},
        {"ryl.stream.other", 1, "ryl.stream.other: the device has no such property"},
    };
    for (const auto& each : refused) {
        EXPECT_EQ(set(each.property, each.value), each.problem.empty());
        EXPECT_EQ(_error != nullptr ? _error->localizedDescription() : "", each.problem);
    }
    EXPECT_TRUE(_device->invalidate(nullptr));
    EXPECT_FALSE(set(kRylCaptureStreamProperty_FormatIndex, 1));
    EXPECT_THAT(_error, test::IsPlainError("linux", EPERM, "ir: no control of the stream"));
}

TEST_F(LinuxCapture, DeliversFramesWithTheirMetadata) {
    connect();
    startKeeping();
    for (const std::uint32_t sequence : {0xFFFFFFFEU, 0xFFFFFFFFU, 0U}) {
        EXPECT_TRUE(fill(sequence));
    }
    auto frames = takeFrames(3);
    EXPECT_EQ(metadataText(frames[0]), "1:254");
    EXPECT_EQ(metadataText(frames[1]), "2:255");
    EXPECT_EQ(frames[0].microseconds, 1000 + std::int64_t{0xFFFFFFFE});
    EXPECT_EQ(metadataText(frames[2]), "3:0");
    EXPECT_EQ(*_starts, 1U);
    EXPECT_TRUE(_stream->stop(nullptr));
    EXPECT_FALSE(_stream->stop(nullptr));
}

TEST_F(LinuxCapture, StarvesWithAClientThatHoldsItsBuffers) {
    connect();
    startKeeping();
    EXPECT_TRUE(fill(0) && fill(1) && fill(2));
    auto frames = takeFrames(3);
    EXPECT_FALSE(fill(3));
    EXPECT_FALSE(fill(4));
    EXPECT_EQ(metadataText(frames[0]), "1:0");
    frames.clear();
    EXPECT_EQ(_video->queued(), 3U);
    EXPECT_TRUE(fill(5));
    frames = takeFrames(1);
    EXPECT_EQ(metadataText(frames[0]), "6:5");
    EXPECT_EQ(counters(), "2 0");
    EXPECT_TRUE(fill(6, true));
    EXPECT_TRUE(fill(7));
    EXPECT_EQ(metadataText(takeFrames(1)[0]), "8:7");
    EXPECT_EQ(counters(), "2 1");
    EXPECT_TRUE(_stream->stop(nullptr));
    const platform::MutexLock lock(_mutex);
    EXPECT_THAT(_events, ElementsAre(std::pair(3, 2), std::pair(4, 6)));
}

// A frame that is held outlives the run, and its buffer is not given to the next one.
TEST_F(LinuxCapture, StartsAgain) {
    connect();
    startKeeping();
    fill(0);
    auto held = takeFrames(1);
    EXPECT_TRUE(_stream->stop(nullptr));
    EXPECT_TRUE(_stream->start(nullptr));
    EXPECT_EQ(_video->queued(), 3U);
    held.clear();
    EXPECT_EQ(_video->queued(), 3U);
    fill(9);
    EXPECT_EQ(metadataText(takeFrames(1)[0]), "1:9");
    EXPECT_FALSE(_stream->start(&_error));
    EXPECT_THAT(_error, test::IsPlainError("linux", EBUSY, "ir: cannot start now"));
}

TEST_F(LinuxCapture, SaysWhatItsStartFailedWith) {
    for (const auto& [node, operation] : {std::pair(_video, "makeBuffers"),
                                          {_metadata, "makeBuffers"},
                                          {_video, "streamOn"},
                                          {_metadata, "streamOn"},
                                          {_metadata, "UVCH"}}) {
        connect();
        installHandler([](const platform::ImageBufferRef&, platform::MediaTime) {});
        node->failing = operation;
        EXPECT_FALSE(_stream->start(&_error));
        EXPECT_EQ(_error->localizedDescription(),
                  node->path() + ": " + operation + ": Input/output error (EIO)");
        EXPECT_FALSE(_video->isOn() || _metadata->isOn());
        node->failing.clear();
        EXPECT_TRUE(_stream->start(nullptr));
        EXPECT_TRUE(_stream->stop(nullptr));
        EXPECT_TRUE(_device->invalidate(nullptr));
    }
}

TEST_F(LinuxCapture, StopFailsAfterTheStreamBroke) {
    connect();
    startKeeping();
    fill(0);
    takeFrames(1);
    _video->breakWith(ENODEV);
    EXPECT_TRUE(eventually([&] { return !_video->isOn(); }));
    EXPECT_FALSE(_stream->stop(&_error));
    EXPECT_THAT(_error,
                test::IsPlainError("linux", ENODEV, "/dev/video0: No such device (ENODEV)"));
    EXPECT_TRUE(_device->invalidate(nullptr));
}

// The time-out stops a stream whose camera does not answer.
TEST_F(LinuxCapture, StopDoesNotWaitForTheCamera) {
    _described.metadata.push_back(control("slow"));
    std::latch reading(1);
    std::latch answered(1);
    _video->readControl = [&] {
        reading.count_down();
        answered.wait();
        return 1;
    };
    connect();
    startKeeping();
    fill(0);
    reading.wait();
    EXPECT_TRUE(_stream->stop(nullptr));
    answered.count_down();
    EXPECT_TRUE(_device->invalidate(nullptr));
    const platform::MutexLock lock(_mutex);
    EXPECT_THAT(_frames, IsEmpty());
}

TEST_F(LinuxCapture, MayBeGivenUpInsideItsHandler) {
    for (const bool byInvalidation : {true, false}) {
        for (int round = 0; round < 20; ++round) {
            connect();
            std::atomic<int> calls{0};
            installHandler([&](const platform::ImageBufferRef&, platform::MediaTime) {
                if (++calls == 1) {
                    EXPECT_TRUE(_stream->stop(nullptr));
                    if (byInvalidation) {
                        EXPECT_TRUE(_device->invalidate(nullptr));
                    }
                    _stream.reset();
                    _device.reset();
                }
            });
            ASSERT_TRUE(_stream->start(nullptr));
            fill(0);
            fill(1);
            EXPECT_TRUE(eventually([&] { return calls == 1 && !_video->isOn(); }));
        }
    }
}

// Frames, a stop, a read of the counters and the invalidation, all at once.
TEST_F(LinuxCapture, StandsCallsFromEveryThread) {
    for (int round = 0; round < 20; ++round) {
        connect();
        startKeeping();
        std::atomic<bool> isOver{false};
        std::thread camera([&] {
            for (std::uint32_t sequence = 0; !isOver; ++sequence) {
                fill(sequence);
                const platform::MutexLock lock(_mutex);
                _frames.clear();
            }
        });
        std::thread reader([&] {
            while (!isOver) {
                counters();
            }
        });
        std::thread stopper([stream = _stream] { stream->stop(nullptr); });
        takeFrames(0);
        EXPECT_TRUE(_device->invalidate(nullptr));
        isOver = true;
        camera.join();
        reader.join();
        stopper.join();
        EXPECT_FALSE(_video->isOn());
    }
}

}  // namespace
