// Opening the sensor, each step refused in every way; what becomes of reports; closing.
#include "kirra/image_stream.h"

#include <functional>
#include <thread>

#include "platform/internal_inconsistency.h"
#include "platform/services.h"
#include "tests/kirra/kirra_bench.h"
#include "tests/support/hand_fed_sensor.h"

namespace {

using platform::ErrorRef;
using platform::RunLoop;
using platform::RunLoopOutcome;
using simulator::Fault;
using test::IsError;
using test::joined;
using test::Journal;
using test::kClosing;
using test::KirraTest;
using test::kOpening;
using ::testing::ElementsAre;

constexpr std::string_view kMode = platform::kRunLoopDefaultMode;

// Writes what it receives into the journal of the bench, and does something about it.
struct Delegate final : ZRKirraImageStreamDelegate {
    explicit Delegate(Journal& into) : journal(into) {}

    void handleImage(ZRKirraMendraImage image) override {
        journal.push_back("image " + image.frameID().text());
        then();
    }
    void streamDidError(const ErrorRef& error) override {
        journal.push_back("error");
        errors.push_back(error);
        then();
    }

    Journal& journal;
    std::vector<ErrorRef> errors;
    std::function<void()> then = [] {};
};

// A step of opening: how to make it fail, what is reported then, and how far the open had come.
struct Step {
    void (*fail)(simulator::HidProfile&, const Fault&);
    int code;
    std::string_view text;
    int calls;
};

const Step kSteps[] = {
    {[](auto& hid, auto&) { hid.devices[1].usage = 0x25; }, 3, "Kirra device match was ambiguous!",
     0},
    {[](auto& hid, auto&) { hid.devices[1].usagePage = 0xFF01; }, 3,
     "Kirra device match was ambiguous!", 0},
    {[](auto& hid, auto& fault) { hid.devices[1].open = fault; }, 3, "Could not open Kirra device.",
     1},
    {[](auto& hid, auto& fault) { hid.devices[1].featureReports[171] = fault; }, 4,
     "Failed to override power mode to active!", 3},
    {[](auto& hid, auto& fault) { hid.devices[1].featureReports[172] = fault; }, 5,
     "Failed to set streaming mode to images only!", 4},
};

class ImageStream : public KirraTest {
  protected:
    // Opens a stream on a sensor that sends nothing on its own.
    void open() {
        sensor().reportsPerSecond = 0;
        install();
        delegate = std::make_shared<Delegate>(journal());
        stream->setDelegate(delegate);
        ErrorRef untouched = test::sensorError("untouched");
        error = untouched;
        EXPECT_TRUE(stream->openWithRunLoop(runLoop, &error));
        EXPECT_EQ(error, untouched);
        EXPECT_EQ(journal(), kOpening);
        journal().clear();
    }

    std::shared_ptr<ZRKirraImageStream> stream = std::make_shared<ZRKirraImageStream>();
    std::shared_ptr<Delegate> delegate;
};

TEST_F(ImageStream, OpensUpToTheStepThatFails) {
    const simulator::HidProfile healthy = hid;
    for (const auto& [fail, code, text, calls] : kSteps) {
        for (const ErrorRef& reported : {ErrorRef(), test::sensorError("this step")}) {
            hid = healthy;
            fail(hid, Fault::failing(reported));
            const auto expected = IsError(ZRKirraImageExperimentErrorDomain, code, text,
                                          calls > 0 ? reported : nullptr);
            const Journal made(kOpening.begin(), kOpening.begin() + calls);
            install();
            EXPECT_FALSE(stream->openWithRunLoop(runLoop, &error));
            EXPECT_THAT(error, expected);
            EXPECT_EQ(journal(), made);
            // The experiment hands the error on, and cleans up no further.
            EXPECT_EQ(run(1, 60), std::nullopt);
            EXPECT_THAT(error, expected);
            EXPECT_EQ(journal(), made);
            EXPECT_EQ(runLoop->run(kMode, 60), RunLoopOutcome::Finished);  // nothing is scheduled
        }
    }
}

// A sensor that leaves an error behind in calls that succeed: none of it is put down to a later call.
TEST_F(ImageStream, AFailureWithoutAnErrorHasNone) {
    struct Sensor final : test::HandFedSensor {
        bool open(platform::ErrorSlot slot) override {
            *slot = test::sensorError("left by open");
            return true;
        }
        bool setFeatureReportWithID(std::int64_t reportID,
                                    std::span<const std::byte> /*data*/,
                                    platform::ErrorSlot slot) override {
            if (reportID == refused) {
                return false;
            }
            *slot = test::sensorError("left by a report");
            return true;
        }
        std::int64_t refused = 171;
    };
    const auto misleading = std::make_shared<Sensor>();
    platform::installServices({.hid = std::make_shared<test::OneSensorBus>(misleading)});
    for (const int code : {4, 5}) {
        EXPECT_FALSE(stream->openWithRunLoop(runLoop, &error));
        EXPECT_EQ(error->code(), code);
        EXPECT_EQ(error->underlyingError(), nullptr);
        misleading->refused = 172;
    }
}

TEST_F(ImageStream, ThrowsWithoutHid) {
    platform::installServices({});
    EXPECT_THAT(
        [&] { stream->openWithRunLoop(runLoop, &error); },
        ::testing::ThrowsMessage<platform::InternalInconsistency>("No HID Manager available?!"));
    EXPECT_EQ(error, nullptr);
}

TEST_F(ImageStream, HandsOnImagesAndNothingElse) {
    open();
    constexpr std::int64_t kTurned = 118 + (std::int64_t{1} << 32);
    const struct {
        std::int64_t id;
        std::size_t size;
        bool isImage;
    } kCases[] = {
        {118, 792, true},  {118, 5000, true},     {118, 791, false},
        {117, 792, false}, {kTurned, 792, false},
    };
    for (const auto& [id, size, isImage] : kCases) {
        // Exactly that long, so that a read beyond it is seen.
        const std::vector<std::byte> data(size, std::byte{1});
        callback()(id, data, nullptr);
        EXPECT_EQ(journal(), isImage ? Journal{"image 16843009"} : Journal{}) << id << ' ' << size;
        journal().clear();
    }
}

TEST_F(ImageStream, ClosesBeforeItTellsOfAnError) {
    open();
    const ErrorRef reported = test::sensorError("overheated");
    callback()(118, std::vector<std::byte>(792), reported);
    EXPECT_EQ(journal(), joined(kClosing, Journal{"error"}));
    EXPECT_THAT(delegate->errors, ElementsAre(reported));  // the same object
}

TEST_F(ImageStream, ClosesAnyNumberOfTimes) {
    stream->close();  // before it was opened
    open();
    stream->close();
    stream->close();
    EXPECT_EQ(journal(), joined(kClosing, kClosing));
    EXPECT_EQ(runLoop->run(kMode, 60), RunLoopOutcome::Finished);

    // On a run loop that has gone meanwhile.
    install();
    const auto orphan = std::make_shared<ZRKirraImageStream>();
    std::thread([&] { orphan->openWithRunLoop(RunLoop::forThisThread(), nullptr); }).join();
    journal().clear();
    orphan->close();
    EXPECT_THAT(journal(), ElementsAre("no callback", kClosing[1] + " of no loop", "close"));
}

TEST_F(ImageStream, ReportsWithoutADelegateGoNowhere) {
    open();
    EXPECT_EQ(stream->delegate(), delegate);
    delegate = nullptr;
    EXPECT_EQ(stream->delegate(), nullptr);
    callback()(118, std::vector<std::byte>(792), nullptr);
    callback()(118, {}, test::sensorError("late"));
    EXPECT_EQ(journal(), kClosing);
}

// A delegate that drops the stream and itself in the middle of a call.
TEST_F(ImageStream, MayDieInsideItsOwnCallback) {
    for (const ErrorRef& reported : {ErrorRef(), test::sensorError("fatal")}) {
        stream = std::make_shared<ZRKirraImageStream>();
        open();
        delegate->then = [this] {
            stream = nullptr;
            delegate = nullptr;
        };
        callback()(118, std::vector<std::byte>(792), reported);
        EXPECT_EQ(stream, nullptr);
        EXPECT_EQ(runLoop->run(kMode, 60), RunLoopOutcome::Finished);
    }
}

// The last reference goes on another thread while reports are coming: the run loop loses its source.
TEST_F(ImageStream, MayDieOnAnotherThreadWhileImagesCome) {
    install();
    delegate = std::make_shared<Delegate>(journal());
    stream->setDelegate(delegate);
    ASSERT_TRUE(stream->openWithRunLoop(runLoop, nullptr));
    std::thread other;
    delegate->then = [&] {
        if (stream != nullptr) {
            other = std::thread([last = std::move(stream)]() mutable { last = nullptr; });
        }
    };
    EXPECT_EQ(runLoop->run(kMode, 60), RunLoopOutcome::Finished);
    other.join();
}

}  // namespace
