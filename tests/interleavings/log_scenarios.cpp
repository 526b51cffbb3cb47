// The log's sink is replaced while lines are written.
#include <memory>
#include <string>

#include "platform/log.h"
#include "platform/sync.h"
#include "tools/explore/scenario.h"
#include "tools/explore/scheduler.h"

namespace interleavings {

namespace {

struct Seen {
    int lines = 0;
    int sinks = 0;  // alive
};

class Sink final : public platform::LogSink {
  public:
    explicit Sink(std::shared_ptr<Seen> seen) : _seen(std::move(seen)) { ++_seen->sinks; }
    ~Sink() override {
        expect(!_inside, "a sink ends while a line is written to it");
        --_seen->sinks;
    }

    void write(const platform::LogLine& line) override {
        _inside = true;
        step("writes {}", line.message);
        ++_seen->lines;
        _inside = false;
    }

  private:
    const std::shared_ptr<Seen> _seen;
    bool _inside = false;
};

// Two threads write and each replaces the sink meanwhile: no line is lost, and no sink is left over.
std::function<void()> sinkReplaced() {
    const auto seen = std::make_shared<Seen>();
    const auto replace = [seen] {
        platform::setLogSink(std::make_shared<Sink>(seen), platform::LogLevel::Debug);
    };
    const auto work = [replace] {
        const platform::Log log("interleavings", "log");
        log.write(platform::LogLevel::Error, [] { return "first"; });
        replace();
        log.write(platform::LogLevel::Error, [] { return "second"; });
    };
    replace();
    platform::startThread(work);
    work();
    return [seen] {
        platform::setLogSink(nullptr, platform::LogLevel::Error);
        expect(seen->lines == 4, "{} of 4 lines were written", seen->lines);
        expect(seen->sinks == 0, "{} sinks are left over", seen->sinks);
    };
}

}  // namespace

std::vector<Scenario> logScenarios() {
    return {{"log.sink-replaced", sinkReplaced, 3}};
}

}  // namespace interleavings
