// ImageBuffers: the buffers of one run of a stream, lent to clients and given back to the kernel when the last
// reference goes.
#ifndef ZR_DEVICES_LINUX_IMAGE_BUFFERS_H
#define ZR_DEVICES_LINUX_IMAGE_BUFFERS_H

#include <cstdint>
#include <memory>
#include <utility>

#include "devices/linux/video_device.h"
#include "platform/image_buffer.h"
#include "platform/sync.h"

namespace linux_device {

// Owner    The stream's thread and every buffer that is lent.
// Threads  Any.
class ImageBuffers : public std::enable_shared_from_this<ImageBuffers> {
  public:
    explicit ImageBuffers(std::shared_ptr<VideoDevice> video) : _video(std::move(video)) {}

    // The picture in that buffer of the kernel, with its attachments.
    platform::ImageBufferRef lend(std::uint32_t index, platform::MutableDictionary attachments);

    // To the kernel, unless the run is over.
    void giveBack(std::uint32_t index);

    // The run is over: what comes back from now on is not the kernel's any more.
    void end();

  private:
    const std::shared_ptr<VideoDevice> _video;
    platform::Mutex _mutex;
    bool _isOver ZR_GUARDED_BY(_mutex) = false;
};

}  // namespace linux_device

#endif
