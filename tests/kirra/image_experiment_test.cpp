// Setup, and every way in which a run ends.
#include "kirra/image_experiment.h"

#include <cstdint>
#include <limits>
#include <optional>
#include <stdexcept>
#include <thread>

#include "platform/services.h"
#include "tests/kirra/kirra_bench.h"

namespace {

using platform::ErrorRef;
using platform::List;
using platform::Number;
using platform::RunLoopOutcome;
using platform::Value;
using test::IsPlainError;
using test::joined;
using test::kClosing;
using test::KirraTest;
using test::kOpening;
using ::testing::ElementsAre;

constexpr std::string_view kDomain = ZRKirraImageExperimentErrorDomain;
constexpr std::string_view kNoRunLoop = "Kirra is a HID device that requires a current run loop.";
constexpr std::uint64_t kHuge = std::numeric_limits<std::uint64_t>::max();
constexpr int kGenerous = 60;  // seconds

class ImageExperiment : public KirraTest {};

TEST_F(ImageExperiment, IsSetUpOnAPoweredDisplayAndARunLoop) {
    const std::string_view kNoDisplay =
        "Could not get the main display to determine device power state.";
    const struct {
        void (*damage)(simulator::DisplayProfile&);
        std::string_view problem;  // empty: none
    } kCases[] = {
        {[](auto&) {}, ""},
        {[](auto& profile) { profile.mainDisplayStatus = -536870212; }, kNoDisplay},
        {[](auto& profile) { profile.registryService = false; },
         "Could not get the frame buffer to determine device power state."},
        {[](auto& profile) { profile.powered = "on"; }, "The display is not powered."},
        {[](auto& profile) { profile.powered = -0.5; }, ""},
    };
    const auto setUp = [](ErrorRef* slot) {
        return ZRKirraImageExperiment().setupWithParameters({}, nullptr, slot);
    };
    for (const auto& [damage, problem] : kCases) {
        display = simulator::DisplayProfile{};
        damage(display);
        install();
        ErrorRef here;
        ErrorRef elsewhere;
        EXPECT_EQ(setUp(&here), problem.empty());
        EXPECT_EQ(setUp(nullptr), problem.empty());
        std::thread([&] { EXPECT_FALSE(setUp(&elsewhere) || setUp(nullptr)); }).join();
        if (problem.empty()) {
            EXPECT_EQ(here, nullptr);
            EXPECT_THAT(elsewhere, IsPlainError(kDomain, 1, kNoRunLoop));
        } else {
            EXPECT_THAT(here, IsPlainError(kDomain, 2, problem));
            EXPECT_THAT(elsewhere, IsPlainError(kDomain, 2, problem));  // looked at first
        }
        EXPECT_THAT(journal(), ElementsAre());
    }
    platform::installServices({});
    EXPECT_FALSE(setUp(&error));
    EXPECT_THAT(error, IsPlainError(kDomain, 2, kNoDisplay));
    platform::installServices({.display = simulator::makeDisplayService(display)});
    EXPECT_FALSE(setUp(&error));
    EXPECT_THAT(error, IsPlainError(kDomain, 2, "Could not find the display power state."));
}

// As many as asked for: a stop takes hold before the next report.
TEST_F(ImageExperiment, CapturesTheImagesInOrder) {
    const struct {
        Number images;
        Number timeout;
        std::size_t expected;
    } kCases[] = {
        {3, kGenerous, 3}, {100, kHuge, 100}, {2, 1e300, 2}, {0, kGenerous, 1}, {{}, kGenerous, 1},
    };
    sensor().firstFrameId = std::numeric_limits<std::uint32_t>::max();
    for (const auto& [images, timeout, expected] : kCases) {
        const List captured = run(images, timeout).value_or(List());
        ASSERT_EQ(captured.size(), expected) << images.text();
        for (std::size_t at = 0; at < captured.size(); ++at) {
            const Value image = captured[at];
            EXPECT_EQ(image["frameID"], Value(static_cast<std::uint32_t>(at - 1)));
            EXPECT_EQ(image.dictionary()->size(), 5U);
            EXPECT_EQ(image["dScanI"].list()->size() + image["dScanQ"].list()->size(), 96U);
            EXPECT_TRUE(image["tmonDataInC"].number() && image["timestampInMilliseconds"].number());
        }
        EXPECT_EQ(journal(), joined(kOpening, kClosing));
    }
}

// A run loop without sources has finished: what came until then is the result, were it nothing.
TEST_F(ImageExperiment, SucceedsWithFewerImagesWhenTheSensorIsUnplugged) {
    for (const std::uint64_t report : {1U, 4U}) {
        sensor().unplugAtReport = report;
        const std::optional<List> images = run(10, kGenerous);
        ASSERT_TRUE(images.has_value());
        EXPECT_EQ(images->size(), report - 1);
        EXPECT_EQ(journal(), joined(kOpening, kClosing));
    }
}

TEST_F(ImageExperiment, EndsWithTheErrorOfTheSensor) {
    sensor().errorAtReport = {.report = 2, .error = test::sensorError("overheated")};
    const auto other = std::make_shared<platform::RunLoopSource>([] {});
    runLoop->addSource(other,
                       platform::kRunLoopDefaultMode);  // so that the loop does not end by itself
    EXPECT_EQ(run(3, kGenerous), std::nullopt);
    EXPECT_EQ(error, sensor().errorAtReport->error);
    runLoop->removeSource(other, platform::kRunLoopDefaultMode);
    EXPECT_EQ(journal(),
              joined(kOpening, joined(kClosing, kClosing)));  // the stream, then the exit
}

TEST_F(ImageExperiment, TimesOutAndDropsWhatCame) {
    sensor().maxReports = 2;
    EXPECT_EQ(run(3, 1), std::nullopt);
    EXPECT_THAT(error, IsPlainError(kDomain, 6, "Timed out after 1 seconds."));
    EXPECT_EQ(journal(), joined(kOpening, kClosing));

    install();
    const auto experiment = make(3, 0);
    experiment->streamDidError(test::sensorError("dropped too"));
    EXPECT_EQ(experiment->run(&error), nullptr);
    EXPECT_THAT(error, IsPlainError(kDomain, 6, "Timed out after 0 seconds."));
}

TEST_F(ImageExperiment, RunsOnlyOnTheThreadOfItsSetup) {
    install();
    EXPECT_EQ(std::make_shared<ZRKirraImageExperiment>()->run(&error), nullptr);
    EXPECT_THAT(error, IsPlainError(kDomain, 1, kNoRunLoop));
    const auto experiment = make(1, kGenerous);
    for (const bool hasRunLoop : {true, false}) {
        const auto other = hasRunLoop ? experiment : std::make_shared<ZRKirraImageExperiment>();
        error = nullptr;
        std::thread([&] {
            const auto itsOwn = hasRunLoop ? platform::RunLoop::forThisThread() : nullptr;
            EXPECT_EQ(other->run(&error), nullptr);
        }).join();
        EXPECT_THAT(error, IsPlainError(kDomain, 1, kNoRunLoop));
    }
    EXPECT_THAT(journal(), ElementsAre());
}

// Whatever throws on the run loop: a source of another user's, or an observer that is notified of the
// exit before the experiment's own.
TEST_F(ImageExperiment, ClosesTheSensorAndGoesWhenTheRunThrows) {
    const auto source =
        std::make_shared<platform::RunLoopSource>([] { throw std::runtime_error("source"); });
    const auto observer = std::make_shared<platform::RunLoopObserver>(platform::RunLoopObserver{
        platform::RunLoopExit, -1, [](std::uint32_t) { throw std::runtime_error("observer"); }});
    for (const bool atExit : {false, true}) {
        install();
        const auto experiment = make(1, kGenerous);
        if (atExit) {
            runLoop->addObserver(observer, platform::kRunLoopDefaultMode);
        } else {
            runLoop->addSource(source, platform::kRunLoopDefaultMode);
            source->signal();
        }
        EXPECT_THROW(experiment->run(nullptr), std::runtime_error);
        EXPECT_EQ(journal(), joined(kOpening, kClosing));
        runLoop->removeSource(source, platform::kRunLoopDefaultMode);
        runLoop->removeObserver(observer, platform::kRunLoopDefaultMode);
        EXPECT_EQ(runLoop->run(platform::kRunLoopDefaultMode, kGenerous), RunLoopOutcome::Finished);
        EXPECT_EQ(journal(), joined(kOpening, kClosing));  // no observer is left
    }

    // An observer that is added first but comes later in the order finds the sensor closed.
    install();
    test::Journal seen;
    const auto after = std::make_shared<platform::RunLoopObserver>(platform::RunLoopObserver{
        platform::RunLoopExit, 1, [&](std::uint32_t) { seen = journal(); }});
    runLoop->addObserver(after, platform::kRunLoopDefaultMode);
    EXPECT_NE(make(1, kGenerous)->run(nullptr), nullptr);
    EXPECT_EQ(seen, joined(kOpening, kClosing));
    runLoop->removeObserver(after, platform::kRunLoopDefaultMode);
}

// Nothing clears the images, nothing is left on the run loop that would act on the next run, and a
// late report finds no experiment.
TEST_F(ImageExperiment, LeavesNothingBehindButItsImages) {
    install();
    auto experiment = make(2, kGenerous);
    for (const std::size_t expected : {2U, 3U}) {
        const auto result = experiment->run(nullptr);
        ASSERT_NE(result, nullptr);
        EXPECT_EQ(result->auxiliaryData().find("images")->list()->size(), expected);
        callback()(118, std::vector<std::byte>(792), nullptr);  // the delegate has been cleared
    }
    journal().clear();
    EXPECT_EQ(runLoop->run(platform::kRunLoopDefaultMode, kGenerous), RunLoopOutcome::Finished);
    const std::weak_ptr<ZRKirraImageExperiment> gone = experiment;
    experiment = nullptr;
    EXPECT_TRUE(gone.expired());
    callback()(118, {}, test::sensorError("late"));
    EXPECT_THAT(journal(), ElementsAre());
}

}  // namespace
