// VideoDevice: an open node of a camera, as a stream uses it. The kernel's is made by openVideoDevice(); tests have
// others.
#ifndef ZR_DEVICES_LINUX_VIDEO_DEVICE_H
#define ZR_DEVICES_LINUX_VIDEO_DEVICE_H

#include <cstddef>
#include <cstdint>
#include <memory>
#include <optional>
#include <span>
#include <string>

#include "devices/linux/description.h"
#include "devices/linux/machine.h"

namespace linux_device {

// A control as the driver describes it.
struct ControlInfo {
    std::uint32_t id = 0;
    std::string name = {};
    std::int64_t least = 0;
    std::int64_t most = 0;
    bool is64Bit = false;
    bool isReadOnly = false;
};

// A buffer that the kernel has filled.
struct FilledBuffer {
    std::uint32_t index = 0;
    std::uint32_t sequence = 0;
    std::int64_t microseconds = 0;  // on CLOCK_MONOTONIC; 0 when the driver gave no time
    std::size_t bytes = 0;          // how much of it is used
    bool isBroken = false;          // the kernel marked its content as broken
};

struct VideoEvent {
    bool isControl = false;  // or else a change of the source
    std::uint32_t control = 0;
    std::int64_t value = 0;  // of the control, or the flags of the change
    std::int64_t microseconds = 0;
};

// Which of a node's two kinds of buffers.
enum class BufferKind { Picture, Metadata };

// Every operation throws a SystemProblem that names the node, unless it says something else.
//
// Threads  Controls, and queue(): any thread. Everything else: one thread at a time, except streamOff(), which may
//          end another thread's wait for the descriptor.
class VideoDevice {
  public:
    virtual ~VideoDevice() = default;

    virtual const std::string& path() const = 0;

    // Refused when the driver sets something else than what is asked for.
    virtual void setFormat(const VideoFormat& format) = 0;
    virtual void setMetadataFormat(const std::string& fourcc) = 0;
    virtual void setFrameRate(double framesPerSecond) = 0;

    // May wait as long as the camera does not answer; the kernel gives it five seconds.
    virtual ControlInfo findControl(const Control& control) = 0;
    virtual std::int64_t control(const ControlInfo& control) = 0;
    virtual void setControl(const ControlInfo& control, std::int64_t value) = 0;
    virtual platform::Number extensionUnit(const ExtensionUnit& unit) = 0;
    virtual void setExtensionUnit(const ExtensionUnit& unit, std::int64_t value) = 0;

    virtual void subscribe(const EventRule& rule) = 0;
    // The next event that waits; nothing when there is none.
    virtual std::optional<VideoEvent> nextEvent() = 0;

    // Makes so many buffers, or as many as the driver wants, and queues them all; those of metadata are mapped.
    virtual void makeBuffers(BufferKind kind, std::uint32_t count) = 0;
    virtual void streamOn() = 0;
    // The next filled buffer; nothing when none is ready.
    virtual std::optional<FilledBuffer> dequeue() = 0;
    // The used part of a mapped buffer; valid until the buffer is queued again.
    virtual std::span<const std::byte> content(const FilledBuffer& buffer) const = 0;
    virtual void queue(std::uint32_t index) = 0;
    // Ends the stream, if there is one, and frees the buffers.
    virtual void streamOff() = 0;

    // Readable (POLLIN) with a filled buffer, urgent (POLLPRI) with an event.
    virtual int descriptor() const = 0;
};

// The nodes of one camera.
struct Camera {
    std::shared_ptr<VideoDevice> video = nullptr;
    std::shared_ptr<VideoDevice> metadata = nullptr;  // null when the camera has none
};

std::shared_ptr<VideoDevice> openVideoDevice(const Machine& machine, const std::string& path);

// Finds and opens the nodes of the described camera.
Camera openCamera(const Machine& machine, const StreamDescription& described);

}  // namespace linux_device

#endif
