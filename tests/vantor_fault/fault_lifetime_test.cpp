// Who keeps the experiment alive, where it dies, and what is left behind.
#include <optional>
#include <system_error>
#include <thread>

#include "tests/platform/threads.h"
#include "tests/vantor_fault/fault_bench.h"

namespace {

using platform::LogLevel;
using test::FaultTest;

class FaultLifetime : public FaultTest {
  protected:
    // Drops the host's reference while another thread is held in that line of the log, in an item of
    // the experiment's; then lets that thread go on.
    void expectDeathInside(LogLevel level,
                           std::string_view line,
                           std::shared_ptr<Experiment> experiment) {
        ASSERT_TRUE(log->waitFor(level, line));
        const std::weak_ptr<Experiment> weak = experiment;
        experiment = nullptr;
        EXPECT_FALSE(weak.expired());
        log->release();
        EXPECT_TRUE(test::eventually([&] { return weak.expired(); }));
    }
};

TEST_F(FaultLifetime, DiesInsideAProcessingItem) {
    at(2).noMetadata = true;  // stops the run while frame 1 is being processed
    install();
    log->hold("Processing frame 1.");
    std::shared_ptr<Experiment> experiment;
    double timeout = 0.01;
    do {  // until the second frame comes before the time-out
        experiment = make(9, timeout *= 2);
    } while (experiment->run(nullptr) != nullptr);
    expectDeathInside(LogLevel::Debug, "Processing frame 1.", std::move(experiment));
}

TEST_F(FaultLifetime, DiesInsideAReceipt) {
    camera().stallAfterFrame = 0;
    install();
    log->hold("Received frame that won't be counted");
    auto experiment = make(9, 0);
    EXPECT_NE(experiment->run(nullptr), nullptr);
    frameHandler (*experiment)(buffer(), {});
    expectDeathInside(LogLevel::Default, "Received frame that won't be counted",
                      std::move(experiment));
}

TEST_F(FaultLifetime, DiesInsideItsTimeOut) {
    at(1).noMetadata = true;  // stops the run on the other queue
    install();
    log->hold("Timeout has been reached.");
    auto experiment = make(9, 0.01);
    EXPECT_EQ(experiment->run(nullptr), nullptr);
    expectDeathInside(LogLevel::Error, "Timeout has been reached.", std::move(experiment));
}

// The host lets go while frames keep coming, until the handler finds no experiment any more: the
// last reference may go on any of the threads, the capture service's included.
TEST_F(FaultLifetime, DiesInsideAHandler) {
    camera().stallAfterFrame = 0;
    install();
    for (int round = 0; round < 100; ++round) {
        auto experiment = make(1, 0);
        const std::weak_ptr<Experiment> weak = experiment;
        EXPECT_NE(experiment->run(nullptr), nullptr);
        std::thread service([&weak, deliver = frameHandler(*experiment)] {
            while (!weak.expired()) {
                deliver(buffer(), {});
            }
            deliver(buffer(), {});
        });
        experiment = nullptr;
        service.join();
    }
}

// The experiment lives until its time-out; its threads do not.
TEST_F(FaultLifetime, HasThreadsOnlyWhileItStreams) {
    const auto stream = std::make_shared<test::HandFedStream>();
    install({stream});
    for (int round = 0; round < 200; ++round) {
        const auto experiment = make(1, 3600);
        stream->onStart = [&] {
            EXPECT_TRUE(test::eventually([] {  // each names itself
                return test::threadsNamed("t.primaryScalar") == 1 &&
                       test::threadsNamed("FaultExperiment") == 1;
            }));
            frameHandler (*experiment)(buffer(), {});
        };
        EXPECT_NE(experiment->run(nullptr), nullptr);
        std::size_t threads = 0;
        for (const auto& [name, number] : test::threadNames()) {
            threads += number;
        }
        EXPECT_LT(threads, 10U);
    }
}

// The stream never starts without them.
TEST_F(FaultLifetime, NeedsItsThreadsBeforeTheStreamStarts) {
    const auto stream = std::make_shared<test::HandFedStream>();
    install({stream});
    stream->onStart = [] { ADD_FAILURE() << "started"; };
    const test::NoThreads noThreads;
    EXPECT_THROW(make(1, 0)->run(nullptr), std::system_error);
}

TEST_F(FaultLifetime, NeedsNoFurtherThreadOnceTheStreamHasStarted) {
    const auto stream = std::make_shared<test::HandFedStream>();
    install({stream});
    for (const double timeout : {3600.0, 0.01}) {
        std::optional<test::NoThreads> noThreads;
        const auto experiment = make(3, timeout);
        stream->onStart = [&] {
            noThreads.emplace();
            for (int frame = 0; timeout > 1 && frame < 3; ++frame) {
                frameHandler (*experiment)(buffer(), {});
            }
        };
        EXPECT_NE(experiment->run(nullptr), nullptr);
        // Handlers do not throw; what comes too late finds no thread and is dropped.
        EXPECT_TRUE(test::eventually([] { return test::threadsNamed("t.primaryScalar") == 0; }));
        frameHandler (*experiment)(buffer(), {});
        eventHandler (*experiment)(1, {}, 2);
    }
}

}  // namespace
