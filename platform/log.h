// The system log as the project uses it: lines with a subsystem, a category and a level.
//
// A log handle is cheap to call when a line's level is off: the message is a callable, and it is not
// called then. Lines go to one sink for the whole process; by default to the system log.
//
// Threads: everything here may be called on any thread, also while the process exits.
#ifndef ZR_PLATFORM_LOG_H
#define ZR_PLATFORM_LOG_H

#include <memory>
#include <string>
#include <string_view>
#include <utility>

#include "platform/run_tag.h"

namespace platform {

enum class LogLevel { Debug, Default, Error };

struct LogLine {
    std::string_view subsystem;
    std::string_view category;
    LogLevel level;
    std::string_view message;
    RunTag run;  // the run that the writing thread works for; zero for none
};

// Receives lines, on the thread that logs them; several threads may be in write() at once. The log
// holds no lock of its own during the call, but its caller may hold one (the fault experiment logs
// under the lock of its stop): a sink must not call the code that logged the line. It must not throw.
class LogSink {
  public:
    virtual ~LogSink() = default;
    virtual void write(const LogLine& line) = 0;
};

// Replaces the process's sink; lines below `minimum` are then off. A null sink stands for the system
// log. A line being written keeps the old sink alive until it is done. Until the first call, lines
// of LogLevel::Default and above go to the system log.
void setLogSink(std::shared_ptr<LogSink> sink, LogLevel minimum);

class Log {
  public:
    Log(std::string subsystem, std::string category)
        : _subsystem(std::move(subsystem)), _category(std::move(category)) {}

    static bool isEnabled(LogLevel level);

    // Logs what `message()` returns (anything that a string view can be made of); calls it only when
    // the level is on.
    template <class Message>
    void write(LogLevel level, Message&& message) const {
        if (isEnabled(level)) {
            _emit(level, std::forward<Message>(message)());
        }
    }

  private:
    void _emit(LogLevel level, std::string_view message) const;

    std::string _subsystem;
    std::string _category;
};

}  // namespace platform

#endif
