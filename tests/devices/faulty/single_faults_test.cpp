// Every step of every experiment fails in every way in turn: what the run comes to.
#include <algorithm>
#include <optional>
#include <set>

#include "tests/devices/faulty/sweep.h"
#include "tests/support/is_error.h"

namespace {

using faulty::FaultyDevice;
using faulty::Step;
using faulty::Strike;
using faulty::Way;
using test::Ending;
using test::kUntouched;

constexpr auto kCapture = ZRCapturePlugInErrorDomain;
constexpr auto kMeterix = ZRMeterixErrorDomain;
constexpr auto kKirra = ZRKirraImageExperimentErrorDomain;

// What is looked at in a result: how many measurements it has or, of three at most, images; and the sum of
// the measurements, without the frame count, or of the images' frame numbers.
struct Digest {
    std::size_t entries;
    double sum;
    friend bool operator==(const Digest& a, const Digest& b) = default;
};

Digest digestOf(ZRExperimentResult& result) {
    Digest digest{result.measurements().size(), 0};
    for (const auto& [name, measurement] : result.measurements()) {
        if (name != "FrameCount") {
            digest.sum += measurement->doubleValue();
        } else {
            EXPECT_GE(measurement->doubleValue(), test::kAskedFor);
        }
    }
    if (const platform::Value* images = result.auxiliaryData().find("images")) {
        digest.entries = std::min(images->list()->size(), std::size_t{test::kAskedFor});
        for (std::size_t image = 0; image < digest.entries; ++image) {
            digest.sum += (*images->list())[image]["frameID"].asNumber().asDouble();
        }
    }
    return digest;
}

// The underlying error: never one, or the one of the fault, when it has one.
enum class Underlying { Never, OfTheFault };

struct ExpectedError {
    std::string_view domain;
    int code;
    std::string_view text;
    Underlying underlying = Underlying::OfTheFault;
};

struct Outcome {
    std::optional<Digest> result = {};
    std::optional<ExpectedError> error = {};  // in the slot
    bool isHandedOn = false;                  // the slot holds the error of the fault itself
    std::string_view exception = {};
    std::optional<ExpectedError> teardown = {};
    bool timesOut = false;
};

Outcome fails(std::string_view domain,
              int code,
              std::string_view text,
              Underlying underlying = Underlying::OfTheFault) {
    return {.error = ExpectedError{domain, code, text, underlying}};
}
Outcome yields(std::size_t entries, double sum) {
    return {.result = Digest{entries, sum}};
}

// The outcome of a step that fails in one of these ways, or in any that no row before has.
struct Row {
    std::string_view step;
    std::vector<Way> ways;
    Outcome outcome;
};
using Table = std::vector<Row>;

const Row* rowOf(const Table& table, const Step& step, Way way) {
    const std::string text = step.text();
    const auto row = std::find_if(table.begin(), table.end(), [&](const Row& one) {
        return one.step == text && (one.ways.empty() || std::find(one.ways.begin(), one.ways.end(),
                                                                  way) != one.ways.end());
    });
    return row != table.end() ? &*row : nullptr;
}

void expectSlot(const platform::ErrorRef& slot,
                const std::optional<ExpectedError>& expected,
                const platform::ErrorRef& ofTheFault) {
    if (!expected.has_value()) {
        EXPECT_EQ(slot, kUntouched) << slot->localizedDescription();
        return;
    }
    const auto& [domain, code, text, underlying] = *expected;
    EXPECT_THAT(slot, test::IsError(domain, code, text,
                                    underlying == Underlying::OfTheFault ? ofTheFault : nullptr));
}

void expectEnding(const Ending& ending,
                  const Outcome& expected,
                  const platform::ErrorRef& ofTheFault,
                  bool withSlot) {
    EXPECT_EQ(ending.exception, expected.exception);
    EXPECT_EQ(ending.result != nullptr, expected.result.has_value());
    if (ending.result != nullptr && expected.result.has_value()) {
        const Digest digest = digestOf(*ending.result);
        EXPECT_TRUE(digest == *expected.result) << digest.entries << ", " << digest.sum;
    }
    EXPECT_EQ(ending.isTornDown, !expected.teardown.has_value());
    if (!withSlot) {
        return;  // there is nothing to look at: a write would have ended the process
    }
    if (expected.isHandedOn) {
        EXPECT_EQ(ending.error, ofTheFault);
    } else {
        expectSlot(ending.error, expected.error, ofTheFault);
    }
    expectSlot(ending.teardownError, expected.teardown, ofTheFault);
}

class SingleFaults : public test::Sweep {
  protected:
    void sweep(const test::Subject& subject, const Outcome& healthy, const Table& table) {
        const auto runHealthy = [&](const std::string& name) {
            const FaultyDevice device(test::makeSmallDevice);
            SCOPED_TRACE(name);
            expectEnding(run(subject, device, subject.generous, true, name), healthy, nullptr,
                         true);
            return device.steps();
        };
        std::set<const Row*> used;
        std::size_t faults = 0;
        for (const Step& step : runHealthy("no fault")) {
            for (const Way way : test::isCertain(step) ? step.ways : std::span<const Way>()) {
                const Row* row = rowOf(table, step, way);
                ASSERT_NE(row, nullptr) << "no outcome for: " << step.text(way);
                used.insert(row);
                ++faults;
                for (const bool withSlot : {true, false}) {
                    const std::string name =
                        step.text(way) + (withSlot ? ", error slot" : ", no error slot");
                    SCOPED_TRACE(name);
                    const FaultyDevice device(test::makeSmallDevice, {{step.place, way}});
                    const Ending ending =
                        run(subject, device, row->outcome.timesOut ? 0 : subject.generous, withSlot,
                            name);
                    const std::vector<Strike> strikes = device.strikes();
                    ASSERT_EQ(strikes.size(), 1U);
                    expectEnding(ending, row->outcome, strikes.front().error, withSlot);
                    runHealthy("without a fault after: " + name);
                }
            }
        }
        for (const Row& row : table) {
            EXPECT_TRUE(used.contains(&row)) << "no run for the row: " << row.step;
        }
        std::printf("%zu faults\n", faults);
    }
};

TEST_F(SingleFaults, OfTheFaultExperiment) {
    const Outcome kHealthy = yields(9, 26);  // the frame count; 1 to 6 errors; 5 events
    Outcome noDevice = fails(kCapture, 200, "Failed to get the capture plugin!");
    noDevice.teardown =
        ExpectedError{kCapture, 200, "Failed to invalidate the capture device.", Underlying::Never};
    // Another stream may be the one.
    Outcome passedOver = kHealthy;
    passedOver.error = ExpectedError{kCapture, 202, "Failed to get stream port type!"};
    Outcome notInvalidated = kHealthy;
    notInvalidated.teardown =
        ExpectedError{kCapture, 200, "Failed to invalidate the capture device."};
    const Outcome kNoStream = fails(kCapture, 202, "Failed to find stream!", Underlying::Never);
    const auto frame = [](std::string_view text) {
        return fails(kCapture, 206, text, Underlying::Never);
    };
    const Outcome kMissing = frame("Frame metadata is missing!");
    const Outcome kNoDictionary = frame("Frame metadata is not a dictionary!");

    sweep(
        test::kFaultExperiment, kHealthy,
        {
            {"1st service: capture", {}, noDevice},
            {"2nd service: meterix",
             {},
             fails(kMeterix, 100, "Cannot get Meterix before streaming.")},
            {"3rd service: hid", {}, kHealthy},
            {"4th service: display", {}, kHealthy},
            {"5th service: registry", {}, kHealthy},
            {"1st call: device", {}, noDevice},
            {"2nd call: streams", {Way::AbsentObject, Way::Empty}, kNoStream},
            {"2nd call: streams", {}, fails(kCapture, 202, "Failed to get streams!")},
            {"3rd call: valueForProperty PortType", {Way::WrongKind}, kHealthy},
            {"3rd call: valueForProperty PortType", {}, passedOver},
            {"4th call: valueForProperty PortType", {Way::WrongKind}, kHealthy},
            {"4th call: valueForProperty PortType", {}, passedOver},
            {"5th call: valueForProperty PortType", {}, kNoStream},
            {"6th call: requestControlOfStreams",
             {},
             fails(kCapture, 203, "Failed to request the zorvel stream!")},
            {"7th call: setValue InfraredLightSourceConfiguration",
             {},
             fails(kCapture, 212, "Failed to configure structured light!")},
            {"8th call: setValue MultipleOutputSupportEnabled",
             {},
             fails(kCapture, 208, "Failed to enable multiple outputs.")},
            {"9th call: setValue FormatIndex",
             {},
             fails(kCapture, 209, "Failed to set format index 0.")},
            {"10th call: setValue MinimumFrameRate",
             {},
             fails(kCapture, 207, "Failed to set min frame rate.")},
            {"11th call: setValue MaximumFrameRate",
             {},
             fails(kCapture, 207, "Failed to set max frame rate.")},
            {"12th call: setValue VideoOutputConfigurations",
             {},
             fails(kCapture, 208, "Failed to configure primary scalar.")},
            {"13th call: setValue VideoOutputsEnabled",
             {},
             fails(kCapture, 208, "Failed to enable primary scalar.")},
            {"14th call: setValue AEEnabled", {}, fails(kCapture, 211, "Failed to diable AE.")},
            {"15th call: setValue VideoOutputHandlers",
             {},
             fails(kCapture, 208, "Failed to set callback handlers.")},
            {"16th call: simpleChannels", {Way::Empty}, yields(7, 21)},
            {"16th call: simpleChannels",
             {},
             fails(kMeterix, 100, "Cannot get Meterix before streaming.")},
            {"17th call: sample", {Way::Empty}, yields(9, 126)},  // all of the count is new
            {"17th call: sample", {Way::AbsentValue}, yields(9, 21)},
            {"17th call: sample", {}, fails(kMeterix, 100, "Cannot get Meterix before streaming.")},
            {"18th call: start", {}, fails(kCapture, 204, "Failed to start streaming zorvel.")},
            {"19th call: valueForProperty ErrorCounters",
             {Way::Empty, Way::WrongEntries},
             yields(9, 5)},
            {"19th call: valueForProperty ErrorCounters",
             {},
             fails(kCapture, 210, "Failed to get error counters from zorvel.", Underlying::Never)},
            {"20th call: stop",
             {},
             fails(kCapture, 205, "Failed to stop stream!", Underlying::Never)},
            {"21st call: sample", {Way::Empty}, yields(7, 21)},
            {"21st call: sample", {Way::AbsentValue}, yields(9, 21)},
            {"21st call: sample",
             {},
             fails(kMeterix, 100, "Cannot get Meterix delta after streaming.")},
            {"22nd call: difference", {Way::Empty}, yields(7, 21)},
            {"22nd call: difference", {Way::AbsentValue}, yields(9, 21)},
            {"22nd call: difference",
             {},
             fails(kMeterix, 100, "Cannot get Meterix delta after streaming.")},
            {"23rd call: invalidate", {}, notInvalidated},
            {"1st event", {}, kHealthy},
            {"1st frame", {Way::AbsentObject, Way::AbsentValue}, kMissing},
            {"1st frame", {Way::WrongKind}, kNoDictionary},
            {"1st frame", {Way::Lost}, kHealthy},
            {"1st frame", {}, frame("Could not create a frame description of frame 1!")},
            {"2nd frame", {Way::AbsentObject, Way::AbsentValue}, kMissing},
            {"2nd frame", {Way::WrongKind}, kNoDictionary},
            {"2nd frame", {Way::Lost}, kHealthy},
            {"2nd frame", {}, frame("Could not create a frame description of frame 2!")},
            {"3rd frame", {Way::AbsentObject, Way::AbsentValue}, kMissing},
            {"3rd frame", {Way::WrongKind}, kNoDictionary},
            {"3rd frame", {Way::Lost}, kHealthy},
            {"3rd frame", {}, frame("Could not create a frame description of frame 3!")},
        });
}

TEST_F(SingleFaults, OfTheCounterExperiment) {
    const Outcome kHealthy = yields(2, 100);
    sweep(test::kCounterExperiment, kHealthy,
          {
              {"1st service: capture", {}, kHealthy},
              {"2nd service: meterix", {}, fails(kMeterix, 100, "Could not get simple channels.")},
              {"3rd service: hid", {}, kHealthy},
              {"4th service: display", {}, kHealthy},
              {"5th service: registry", {}, kHealthy},
              {"1st call: simpleChannels", {Way::Empty}, yields(0, 0)},
              {"1st call: simpleChannels",
               {},
               fails(kMeterix, 100, "Could not get simple channels.")},
              {"2nd call: sample", {Way::Empty}, yields(0, 0)},
              {"2nd call: sample",
               {Way::AbsentValue},
               fails(kMeterix, 100, "Could not get the count of first.")},
              {"2nd call: sample", {}, fails(kMeterix, 100, "Could not sample the report.")},
          });
}

TEST_F(SingleFaults, OfTheImageExperiment) {
    const Outcome kHealthy = yields(3, 1 + 2 + 3);
    const Outcome kNoManager{.exception = "No HID Manager available?!"};
    const Outcome kAmbiguous = fails(kKirra, 3, "Kirra device match was ambiguous!");
    const Outcome kNoDisplay =
        fails(kKirra, 2, "Could not get the main display to determine device power state.");
    const Outcome kNoPowerState = fails(kKirra, 2, "Could not find the display power state.");
    const Outcome kSensorError{.isHandedOn = true};
    Outcome timedOut = fails(kKirra, 6, "Timed out after 0 seconds.");
    timedOut.timesOut = true;
    sweep(test::kImageExperiment, kHealthy,
          {
              {"1st service: capture", {}, kHealthy},
              {"2nd service: meterix", {}, kHealthy},
              {"3rd service: hid", {}, kNoManager},
              {"4th service: display", {}, kNoDisplay},
              {"5th service: registry", {}, kNoPowerState},
              {"1st call: mainDisplay", {}, kNoDisplay},
              {"2nd call: registryObject",
               {},
               fails(kKirra, 2, "Could not get the frame buffer to determine device power state.")},
              {"3rd call: property Quorm Debug Info", {}, kNoPowerState},
              {"4th call: createManager", {}, kNoManager},
              {"5th call: enumerateDevicesMatching", {}, kAmbiguous},
              {"6th call: devices", {}, kAmbiguous},
              {"7th call: open", {}, fails(kKirra, 3, "Could not open Kirra device.")},
              {"8th call: setInputReportCallback", {}, timedOut},
              {"9th call: setFeatureReportWithID 171",
               {},
               fails(kKirra, 4, "Failed to override power mode to active!")},
              {"10th call: setFeatureReportWithID 172",
               {},
               fails(kKirra, 5, "Failed to set streaming mode to images only!")},
              {"11th call: scheduleWithRunLoop", {}, yields(0, 0)},  // the loop has no source
              {"12th call: setInputReportCallback to none", {}, kHealthy},
              {"13th call: unscheduleFromRunLoop", {}, kHealthy},
              {"14th call: close", {}, kHealthy},
              {"1st report", {Way::WithError}, kSensorError},
              {"1st report", {}, yields(3, 2 + 3 + 4)},
              {"2nd report", {Way::WithError}, kSensorError},
              {"2nd report", {}, yields(3, 1 + 3 + 4)},
              {"3rd report", {Way::WithError}, kSensorError},
              {"3rd report", {}, yields(3, 1 + 2 + 4)},
          });
}

}  // namespace
