#include "devices/linux/image_buffers.h"

#include "devices/linux/device_log.h"
#include "devices/linux/system_problem.h"

namespace linux_device {

platform::ImageBufferRef ImageBuffers::lend(std::uint32_t index,
                                            platform::MutableDictionary attachments) {
    return {new platform::ImageBuffer(std::move(attachments)),
            [self = shared_from_this(), index](const platform::ImageBuffer* buffer) {
                delete buffer;
                self->giveBack(index);
            }};
}

void ImageBuffers::giveBack(std::uint32_t index) {
    const platform::MutexLock lock(_mutex);
    if (_isOver) {
        return;
    }
    try {
        _video->queue(index);
    } catch (const SystemProblem& problem) {
        logProblem(problem.what());
    }
}

void ImageBuffers::end() {
    const platform::MutexLock lock(_mutex);
    _isOver = true;
}

}  // namespace linux_device
