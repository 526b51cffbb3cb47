#include "platform/log.h"

#include <syslog.h>

#include "platform/sync.h"

namespace platform {

namespace {

class SystemLogSink final : public LogSink {
  public:
    void write(const LogLine& line) override {
        syslog(_priority(line.level), "[%.*s:%.*s] %.*s", static_cast<int>(line.subsystem.size()),
               line.subsystem.data(), static_cast<int>(line.category.size()), line.category.data(),
               static_cast<int>(line.message.size()), line.message.data());
    }

  private:
    static int _priority(LogLevel level) {
        switch (level) {
            case LogLevel::Debug:
                return LOG_DEBUG;
            case LogLevel::Default:
                return LOG_NOTICE;
            case LogLevel::Error:
                break;
        }
        return LOG_ERR;
    }
};

// Never destroyed: a time-out item may log while the process exits.
struct State {
    Mutex mutex;
    std::shared_ptr<LogSink> sink ZR_GUARDED_BY(mutex) = std::make_shared<SystemLogSink>();
    // Read before every line, without the mutex; a line that races with a change of the sink may go
    // by the old level or the new one.
    Atomic<LogLevel> minimum{LogLevel::Default};
};

State& state() {
    static State& shared = *new State;
    return shared;
}

}  // namespace

void setLogSink(std::shared_ptr<LogSink> sink, LogLevel minimum) {
    if (sink == nullptr) {
        sink = std::make_shared<SystemLogSink>();
    }
    State& shared = state();
    {
        const MutexLock lock(shared.mutex);
        shared.sink.swap(sink);
    }
    shared.minimum.store(minimum, std::memory_order_relaxed);
}

bool Log::isEnabled(LogLevel level) {
    return level >= state().minimum.load(std::memory_order_relaxed);
}

void Log::_emit(LogLevel level, std::string_view message) const {
    State& shared = state();
    std::shared_ptr<LogSink> sink;
    {
        const MutexLock lock(shared.mutex);
        sink = shared.sink;
    }
    sink->write({_subsystem, _category, level, message, currentRunTag()});
}

}  // namespace platform
