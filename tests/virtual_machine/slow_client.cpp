// vm_slow_client DESCRIPTION: keeps every frame until none comes any more, looks a second later at what became of them,
// lets them go and waits for more. Says what it saw, a line for each; ends with 0 unless something could not be done.
//
// The camera is that of /dev/video10. Its pictures are looked at beside the device, which maps none: whoever opens the
// node can map them.
#include <algorithm>
#include <chrono>
#include <cstdint>
#include <cstdio>
#include <cstdlib>
#include <linux/videodev2.h>
#include <span>
#include <string>
#include <thread>
#include <vector>

#include <fcntl.h>
#include <sys/ioctl.h>
#include <sys/mman.h>

#include "devices/linux/kind.h"
#include "platform/sync.h"
#include "platform/welkin/capture.h"

namespace {

using namespace std::chrono_literals;
using platform::Dictionary;
using platform::MutexLock;
using platform::Value;

[[noreturn]] void fail(const std::string& what) {
    std::printf("cannot %s\n", what.c_str());
    std::exit(1);
}

// Gives up after 20 s of the guest's time, before the scenario does.
template <class Condition>
void await(const std::string& what, const Condition& condition) {
    for (int tries = 0; !condition(); ++tries) {
        if (tries == 2000) {
            fail("wait for " + what);
        }
        std::this_thread::sleep_for(10ms);
    }
}

// The buffers of the camera as its driver has them.
class KernelBuffers {
  public:
    KernelBuffers() : _node(open("/dev/video10", O_RDWR | O_CLOEXEC)) {}

    // The flags of those that there are.
    std::vector<std::uint32_t> flags() const {
        std::vector<std::uint32_t> all;
        for (v4l2_buffer buffer = _buffer(0); ioctl(_node, VIDIOC_QUERYBUF, &buffer) == 0;
             buffer = _buffer(static_cast<std::uint32_t>(all.size()))) {
            all.push_back(buffer.flags);
        }
        return all;
    }

    std::size_t count() const { return flags().size(); }

    // How many of them are the kernel's: to be filled, or filled and not taken.
    std::size_t held() const {
        std::size_t count = 0;
        for (const std::uint32_t flags : flags()) {
            count += (flags & (V4L2_BUF_FLAG_QUEUED | V4L2_BUF_FLAG_DONE)) != 0 ? 1 : 0;
        }
        return count;
    }

    // Copies of the pictures.
    std::vector<std::vector<std::byte>> pictures() const {
        std::vector<std::vector<std::byte>> all;
        const auto count = static_cast<std::uint32_t>(flags().size());
        for (std::uint32_t index = 0; index < count; ++index) {
            v4l2_buffer buffer = _buffer(index);
            if (ioctl(_node, VIDIOC_QUERYBUF, &buffer) != 0) {
                fail("look at a buffer");
            }
            void* memory =
                mmap(nullptr, buffer.length, PROT_READ, MAP_SHARED, _node, buffer.m.offset);
            if (memory == MAP_FAILED) {
                fail("map a picture");
            }
            const auto bytes = std::span(static_cast<const std::byte*>(memory), buffer.length);
            all.emplace_back(bytes.begin(), bytes.end());
            munmap(memory, buffer.length);
        }
        return all;
    }

  private:
    static v4l2_buffer _buffer(std::uint32_t index) {
        v4l2_buffer buffer{};
        buffer.index = index;
        buffer.type = V4L2_BUF_TYPE_VIDEO_CAPTURE;
        return buffer;
    }

    const int _node;
};

// Keeps frames, or counts them.
class Client {
  public:
    // How many frames are kept, or came since they were let go.
    std::size_t frames() {
        const MutexLock lock(_mutex);
        return _isKeeping ? _kept.size() : _later;
    }
    // How many of the kept frames still have the metadata that they came with.
    std::size_t unchanged() {
        const MutexLock lock(_mutex);
        std::size_t count = 0;
        for (const Frame& frame : _kept) {
            count += metadataOf(*frame.buffer) == frame.metadata ? 1 : 0;
        }
        return count;
    }
    void letGo() {
        std::vector<Frame> kept;  // given back without the lock
        const MutexLock lock(_mutex);
        _isKeeping = false;
        kept.swap(_kept);
    }
    // Between the last frame that was kept and the first one after.
    std::uint64_t missing() {
        const MutexLock lock(_mutex);
        return _firstLater - _lastKept - 1;
    }
    void take(const platform::ImageBufferRef& buffer) {
        const MutexLock lock(_mutex);
        const Value metadata = metadataOf(*buffer);
        const auto number = metadata["FrameNumber"].asNumber().as<std::uint64_t>();
        if (_isKeeping) {
            _lastKept = number;
            _kept.push_back({buffer, metadata});
        } else if (++_later == 1) {
            _firstLater = number;
        }
    }

  private:
    struct Frame {
        platform::ImageBufferRef buffer;
        Value metadata;
    };

    static Value metadataOf(const platform::ImageBuffer& buffer) {
        return buffer.attachment(kRylCaptureSampleBufferAttachmentKey_MetadataDictionary);
    }

    platform::Mutex _mutex;
    bool _isKeeping ZR_GUARDED_BY(_mutex) = true;
    std::vector<Frame> _kept ZR_GUARDED_BY(_mutex);
    std::size_t _later ZR_GUARDED_BY(_mutex) = 0;
    std::uint64_t _lastKept ZR_GUARDED_BY(_mutex) = 0;
    std::uint64_t _firstLater ZR_GUARDED_BY(_mutex) = 0;
};

std::size_t common(const std::vector<std::vector<std::byte>>& some,
                   const std::vector<std::vector<std::byte>>& others) {
    std::size_t count = 0;
    for (std::size_t at = 0; at < std::min(some.size(), others.size()); ++at) {
        count += some[at] == others[at] ? 1 : 0;
    }
    return count;
}

void starve(WLRylCaptureStream& stream, Client& client, const KernelBuffers& kernel) {
    await("as many frames as there are buffers",
          [&] { return kernel.held() == 0 && client.frames() == kernel.count(); });
    const auto pictures = kernel.pictures();
    std::this_thread::sleep_for(1s);  // thirty frames of the camera's
    std::printf(
        "starved: kept %zu frames of %zu buffers, %zu with the metadata that they came with\n",
        client.frames(), kernel.count(), client.unchanged());
    std::printf("starved: %zu pictures of %zu as they came, the kernel has %zu\n",
                common(pictures, kernel.pictures()), pictures.size(), kernel.held());

    client.letGo();
    await("frames after the others were let go",
          [&] { return client.frames() >= 2 * kernel.count() && kernel.held() == kernel.count(); });
    std::printf("let go: %zu pictures of %zu as they came, the kernel has %zu\n",
                common(pictures, kernel.pictures()), pictures.size(), kernel.held());
    const Value counters =
        stream.valueForProperty(kRylCaptureStreamProperty_ErrorCounters, nullptr);
    // The description calls the lost frames so.
    const auto lost =
        counters[kRylCaptureStreamPropertyValue_I2CErrorCount].asNumber().as<std::uint64_t>();
    std::printf("let go: %s frames are missing, %s counted as lost\n",
                client.missing() >= 25 ? "25 or more" : "less than 25",
                lost == client.missing() ? "all" : "not all");
}

}  // namespace

int main(int count, char** arguments) {
    if (count != 2) {
        std::fprintf(stderr, "usage: vm_slow_client DESCRIPTION\n");
        return 64;
    }
    const auto device = linux_device::openDevice(arguments[1], linux_device::Machine())
                            .services.capture->device(nullptr);
    const WLRylCaptureStreamList streams = *device->streams(nullptr);
    Client client;
    WLRylFrameHandler onFrame = [&client](const platform::ImageBufferRef& buffer,
                                          platform::MediaTime) { client.take(buffer); };
    const Dictionary handlers = {{kRylCaptureStreamVideoOutputHandlerKey_PixelBufferHandler,
                                  Value::opaque(std::move(onFrame))}};
    platform::ErrorRef error;
    if (!device->requestControlOfStreams(streams, &error) ||
        !streams[0]->setValue(0, kRylCaptureStreamProperty_FormatIndex, &error) ||
        !streams[0]->setValue(30, kRylCaptureStreamProperty_MaximumFrameRate, &error) ||
        !streams[0]->setValue(Dictionary{{kRylCaptureStreamVideoOutputID_PrimaryScaler, handlers}},
                              kRylCaptureStreamProperty_VideoOutputHandlers, &error) ||
        !streams[0]->start(&error)) {
        fail("start the stream: " + error->localizedDescription());
    }
    starve(*streams[0], client, KernelBuffers());
    if (!streams[0]->stop(&error) || !device->invalidate(&error)) {
        fail("stop the stream: " + error->localizedDescription());
    }
    return 0;
}
