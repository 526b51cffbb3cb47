#include "platform/run_tag.h"

#include <utility>

namespace platform {

namespace {
thread_local RunTag tagOfThisThread = 0;
}

RunTag currentRunTag() {
    return tagOfThisThread;
}

RunTagScope::RunTagScope(RunTag tag) : _before(std::exchange(tagOfThisThread, tag)) {}
RunTagScope::~RunTagScope() {
    tagOfThisThread = _before;
}

}  // namespace platform
