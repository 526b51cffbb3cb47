// RunTag: which run of the host a piece of work belongs to, so that a log line that it writes later, on
// another thread, is put down to the run that caused it.
//
// Work takes over the tag of the thread that asked for it: an item of a work queue has the tag of the
// thread that queued it. Code that calls back on a thread of
// its own keeps the tag beside the callback.
#ifndef ZR_PLATFORM_RUN_TAG_H
#define ZR_PLATFORM_RUN_TAG_H

#include <cstdint>

namespace platform {

// A number that the host chooses; zero stands for no run.
using RunTag = std::uint64_t;

// The calling thread's tag; zero until a scope sets one.
RunTag currentRunTag();

// Sets the calling thread's tag for as long as it lives. Begins and ends on one thread; scopes nest.
class RunTagScope {
  public:
    explicit RunTagScope(RunTag tag);
    ~RunTagScope();
    RunTagScope(const RunTagScope&) = delete;
    RunTagScope& operator=(const RunTagScope&) = delete;

  private:
    const RunTag _before;
};

}  // namespace platform

#endif
