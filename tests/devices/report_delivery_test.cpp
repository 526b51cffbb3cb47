// What carries a sensor's reports to its run loop: one per turn, a bounded number, and how it ends.
#include "devices/report_delivery.h"

#include <chrono>
#include <future>
#include <memory>
#include <string_view>
#include <vector>

#include <gmock/gmock.h>
#include <gtest/gtest.h>

namespace {

using platform::RunLoop;
using platform::RunLoopOutcome;
using testing::ElementsAre;
using Delivery = devices::ReportDelivery<int>;

constexpr std::string_view kMode = platform::kRunLoopDefaultMode;
constexpr double kGenerous = 60;  // seconds
constexpr int kLast = 9;

class ReportDelivery : public testing::Test {
  protected:
    std::shared_ptr<Delivery> started() {
        return Delivery::start(runLoop, kMode, [this](int report) {
            received.push_back(report);
            if (received.size() == stopAt) {
                runLoop->stop();
            }
            return report != kLast;
        });
    }

    const std::shared_ptr<RunLoop> runLoop = RunLoop::forThisThread();
    std::vector<int> received;
    std::size_t stopAt = 0;
};

TEST_F(ReportDelivery, AStopTakesEffectBetweenTwoReports) {
    const auto delivery = started();
    stopAt = 2;
    for (const int report : {1, 2, 3, kLast, 4}) {
        EXPECT_TRUE(delivery->add(report));
    }
    EXPECT_EQ(runLoop->run(kMode, kGenerous), RunLoopOutcome::Stopped);
    EXPECT_THAT(received, ElementsAre(1, 2));
    EXPECT_EQ(runLoop->run(kMode, kGenerous), RunLoopOutcome::Finished) << "after the last report";
    EXPECT_THAT(received, ElementsAre(1, 2, 3, kLast));
    EXPECT_FALSE(delivery->add(5));
}

// Whoever waits for time or room goes on when the delivery ends, and learns that it did.
TEST_F(ReportDelivery, ItsEndEndsEveryWait) {
    for (const bool isForRoom : {true, false}) {
        const auto delivery = started();
        for (std::size_t count = 0; count < Delivery::kMostWaiting; ++count) {
            EXPECT_TRUE(delivery->awaitRoom() && delivery->add(1));
        }
        auto waiting = std::async(std::launch::async, [&] {
            return isForRoom ? delivery->awaitRoom()
                             : delivery->awaitTime(std::chrono::steady_clock::now() +
                                                   std::chrono::hours(1));
        });
        delivery->end();
        EXPECT_FALSE(waiting.get());
    }
    EXPECT_EQ(runLoop->run(kMode, kGenerous), RunLoopOutcome::Finished);
    EXPECT_THAT(received, testing::IsEmpty()) << "the reports that waited are lost";
}

TEST_F(ReportDelivery, MakesRoomAsReportsAreReceived) {
    const auto delivery = started();
    stopAt = Delivery::kMostWaiting + 1;
    auto adding = std::async(std::launch::async, [&] {
        for (std::size_t count = 0; count < stopAt; ++count) {
            if (!delivery->awaitRoom() || !delivery->add(1)) {
                return false;
            }
        }
        return true;
    });
    EXPECT_EQ(runLoop->run(kMode, kGenerous), RunLoopOutcome::Stopped);
    EXPECT_TRUE(adding.get());
}

TEST_F(ReportDelivery, LeavesTheLoopWithItsLastOwner) {
    started().reset();
    EXPECT_EQ(runLoop->run(kMode, kGenerous), RunLoopOutcome::Finished);
}

}  // namespace
