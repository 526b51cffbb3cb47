// A camera node of the kernel: the Video for Linux API, version 2.
#include <algorithm>
#include <array>
#include <cctype>
#include <cerrno>
#include <cmath>
#include <cstring>
#include <linux/videodev2.h>
#include <map>
#include <utility>
#include <vector>

#include <fcntl.h>
#include <linux/usb/video.h>
#include <linux/uvcvideo.h>
#include <sys/ioctl.h>
#include <sys/mman.h>

#include "devices/linux/file_descriptor.h"
#include "devices/linux/system_problem.h"
#include "devices/linux/video_device.h"
#include "devices/linux/video_nodes.h"
#include "input/nearest.h"
#include "platform/sync.h"

namespace linux_device {

namespace {

constexpr std::int64_t kMicroseconds = 1'000'000;
constexpr double kRateTolerance = 0.01;

std::uint32_t codeOf(const std::string& fourcc) {
    std::array<char, 4> characters = {' ', ' ', ' ', ' '};
    std::copy_n(fourcc.begin(), std::min(fourcc.size(), characters.size()), characters.begin());
    return v4l2_fourcc(characters[0], characters[1], characters[2], characters[3]);
}

std::string fourccOf(std::uint32_t code) {
    std::string text;
    for (unsigned shift = 0; shift < 32; shift += 8) {
        text += static_cast<char>((code >> shift) & 0x7FU);
    }
    return text;
}

std::string formatText(const std::string& fourcc, std::uint32_t width, std::uint32_t height) {
    return fourcc + " " + std::to_string(width) + "x" + std::to_string(height);
}

template <class Text>
std::string textOf(const Text& text) {
    const auto* characters = reinterpret_cast<const char*>(&text[0]);
    return {characters, strnlen(characters, sizeof text)};
}

// A control's name as v4l2-ctl shows it: "Exposure Time, Absolute" is exposure_time_absolute.
std::string plainName(const std::string& name) {
    std::string plain;
    bool isParted = false;
    for (const char character : name) {
        if (std::isalnum(static_cast<unsigned char>(character)) == 0) {
            isParted = !plain.empty();
            continue;
        }
        plain += std::exchange(isParted, false) ? "_" : "";
        plain += static_cast<char>(std::tolower(static_cast<unsigned char>(character)));
    }
    return plain;
}

// A buffer's memory in this process.
class Mapping {
  public:
    Mapping(int file, std::size_t length, std::int64_t offset)
        : _length(length), _memory(mmap(nullptr, length, PROT_READ, MAP_SHARED, file, offset)) {}
    Mapping(Mapping&& other) noexcept
        : _length(other._length), _memory(std::exchange(other._memory, MAP_FAILED)) {}
    Mapping(const Mapping&) = delete;
    Mapping& operator=(const Mapping&) = delete;
    Mapping& operator=(Mapping&&) = delete;
    ~Mapping() {
        if (isThere()) {
            munmap(_memory, _length);
        }
    }

    bool isThere() const { return _memory != MAP_FAILED; }
    std::span<const std::byte> bytes() const {
        return {static_cast<const std::byte*>(_memory), _length};
    }

  private:
    std::size_t _length;
    void* _memory;
};

class V4l2Device final : public VideoDevice {
  public:
    V4l2Device(const Machine& machine, std::string path)
        : _path(std::move(path))
        , _file(::open(machine.at(_path).c_str(), O_RDWR | O_NONBLOCK | O_CLOEXEC)) {
        if (!_file.isOpen()) {
            failWithErrno(_path);
        }
    }

    const std::string& path() const override { return _path; }

    v4l2_capability capability() {
        v4l2_capability capability{};
        _call("VIDIOC_QUERYCAP", VIDIOC_QUERYCAP, &capability);
        return capability;
    }

    void setFormat(const VideoFormat& wanted) override {
        v4l2_format format{};
        format.type = V4L2_BUF_TYPE_VIDEO_CAPTURE;
        format.fmt.pix.width = wanted.width;
        format.fmt.pix.height = wanted.height;
        format.fmt.pix.pixelformat = codeOf(wanted.fourcc);
        format.fmt.pix.field = V4L2_FIELD_ANY;
        _call("setting the format", VIDIOC_S_FMT, &format);
        const v4l2_pix_format& is = format.fmt.pix;
        const std::string asked = formatText(wanted.fourcc, wanted.width, wanted.height);
        if (is.width != wanted.width || is.height != wanted.height ||
            is.pixelformat != codeOf(wanted.fourcc)) {
            _refuse("asked for " + asked + ", the driver sets " +
                    formatText(fourccOf(is.pixelformat), is.width, is.height));
        }
    }

    void setMetadataFormat(const std::string& fourcc) override {
        v4l2_format format{};
        format.type = V4L2_BUF_TYPE_META_CAPTURE;
        format.fmt.meta.dataformat = codeOf(fourcc);
        _call("setting the metadata format", VIDIOC_S_FMT, &format);
        if (format.fmt.meta.dataformat != codeOf(fourcc)) {
            _refuse("asked for metadata " + fourcc + ", the driver sets " +
                    fourccOf(format.fmt.meta.dataformat));
        }
    }

    void setFrameRate(double framesPerSecond) override {
        constexpr std::uint32_t kDenominator = 1000;
        v4l2_streamparm parameters{};
        parameters.type = V4L2_BUF_TYPE_VIDEO_CAPTURE;
        v4l2_fract& interval = parameters.parm.capture.timeperframe;
        interval = {kDenominator,
                    platform::Number(framesPerSecond * kDenominator).as<std::uint32_t>()};
        _call("setting the frame rate", VIDIOC_S_PARM, &parameters);
        const double rate = static_cast<double>(interval.denominator) / interval.numerator;
        if (!(std::abs(rate - framesPerSecond) <= framesPerSecond * kRateTolerance)) {
            _refuse("asked for " + platform::Number(framesPerSecond).text() +
                    " frames per second, the driver sets " + platform::Number(rate).text());
        }
    }

    // Asks the driver once for each control: a search by name goes through all controls before it.
    ControlInfo findControl(const Control& wanted) override {
        {
            const platform::MutexLock lock(_mutex);
            if (const auto found = _controls.find(wanted.name); found != _controls.end()) {
                return found->second;
            }
        }
        ControlInfo info = _askForControl(wanted);
        const platform::MutexLock lock(_mutex);
        _controls.emplace(wanted.name, info);
        return info;
    }

    std::int64_t control(const ControlInfo& info) override {
        v4l2_ext_control control{};
        control.id = info.id;
        _callControl("reading", VIDIOC_G_EXT_CTRLS, info, control);
        return _valueOf(info, control);
    }

    void setControl(const ControlInfo& info, std::int64_t value) override {
        v4l2_ext_control control{};
        control.id = info.id;
        if (info.is64Bit) {
            control.value64 = value;
        } else {
            control.value = platform::Number(value).as<std::int32_t>();
        }
        _callControl("setting", VIDIOC_S_EXT_CTRLS, info, control);
        const std::int64_t is = _valueOf(info, control);
        if (is != value) {
            _refuse("control \"" + info.name + "\": asked for " + std::to_string(value) +
                    ", the driver sets " + std::to_string(is));
        }
    }

    platform::Number extensionUnit(const ExtensionUnit& unit) override {
        std::vector<std::byte> bytes(unit.type.size);
        _callExtensionUnit("reading", UVC_GET_CUR, unit, bytes);
        return numberIn(std::span<const std::byte>(bytes), unit.type);
    }

    void setExtensionUnit(const ExtensionUnit& unit, std::int64_t value) override {
        std::vector<std::byte> bytes = bytesOf(value, unit.type);
        _callExtensionUnit("setting", UVC_SET_CUR, unit, bytes);
    }

    void subscribe(const EventRule& rule) override {
        v4l2_event_subscription subscription{};
        const bool isControl = rule.cause == EventCause::ControlChanged;
        subscription.type = isControl ? V4L2_EVENT_CTRL : V4L2_EVENT_SOURCE_CHANGE;
        subscription.id = isControl ? findControl(rule.control).id : 0;
        _call("subscribing to events", VIDIOC_SUBSCRIBE_EVENT, &subscription);
    }

    std::optional<VideoEvent> nextEvent() override {
        v4l2_event event{};
        if (_try(VIDIOC_DQEVENT, &event) != 0) {
            return std::nullopt;
        }
        VideoEvent result{.microseconds = event.timestamp.tv_sec * kMicroseconds +
                                          event.timestamp.tv_nsec / 1000};
        if (event.type == V4L2_EVENT_CTRL) {
            result.isControl = true;
            result.control = event.id;
            result.value = event.u.ctrl.type == V4L2_CTRL_TYPE_INTEGER64
                               ? std::int64_t{event.u.ctrl.value64}
                               : event.u.ctrl.value;
        } else {
            result.value = event.u.src_change.changes;
        }
        return result;
    }

    void makeBuffers(BufferKind kind, std::uint32_t count) override {
        _type =
            kind == BufferKind::Picture ? V4L2_BUF_TYPE_VIDEO_CAPTURE : V4L2_BUF_TYPE_META_CAPTURE;
        v4l2_requestbuffers request{};
        request.count = count;
        request.type = _type;
        request.memory = V4L2_MEMORY_MMAP;
        _call("asking for buffers", VIDIOC_REQBUFS, &request);
        _isPrepared = true;
        for (std::uint32_t index = 0; index < request.count; ++index) {
            if (kind == BufferKind::Metadata) {
                _map(index);
            }
            queue(index);
        }
    }

    void streamOn() override {
        std::uint32_t type = _type;
        _call("starting the stream", VIDIOC_STREAMON, &type);
    }

    std::optional<FilledBuffer> dequeue() override {
        v4l2_buffer buffer{};
        buffer.type = _type;
        buffer.memory = V4L2_MEMORY_MMAP;
        const int code = _try(VIDIOC_DQBUF, &buffer);
        if (code == EAGAIN) {
            return std::nullopt;
        }
        if (code != 0) {
            failWithErrno(_path + ": taking a filled buffer", code);
        }
        return FilledBuffer{
            .index = buffer.index,
            .sequence = buffer.sequence,
            .microseconds = buffer.timestamp.tv_sec * kMicroseconds + buffer.timestamp.tv_usec,
            .bytes = buffer.bytesused,
            .isBroken = (buffer.flags & V4L2_BUF_FLAG_ERROR) != 0};
    }

    std::span<const std::byte> content(const FilledBuffer& buffer) const override {
        const auto bytes = _mappings.at(buffer.index).bytes();
        return bytes.first(std::min(buffer.bytes, bytes.size()));
    }

    void queue(std::uint32_t index) override {
        v4l2_buffer buffer{};
        buffer.index = index;
        buffer.type = _type;
        buffer.memory = V4L2_MEMORY_MMAP;
        _call("queueing a buffer", VIDIOC_QBUF, &buffer);
    }

    void streamOff() override {
        if (!std::exchange(_isPrepared, false)) {
            return;
        }
        v4l2_event_subscription all{};
        all.type = V4L2_EVENT_ALL;
        _try(VIDIOC_UNSUBSCRIBE_EVENT, &all);
        std::uint32_t type = _type;
        const int stopped = _try(VIDIOC_STREAMOFF, &type);
        _mappings.clear();
        v4l2_requestbuffers none{};
        none.type = _type;
        none.memory = V4L2_MEMORY_MMAP;
        const int freed = _try(VIDIOC_REQBUFS, &none);
        if (stopped != 0 || freed != 0) {
            failWithErrno(_path + (stopped != 0 ? ": stopping the stream" : ": freeing buffers"),
                          stopped != 0 ? stopped : freed);
        }
    }

    int descriptor() const override { return _file.number(); }

  private:
    static constexpr std::uint32_t kFirstControl = V4L2_CTRL_FLAG_NEXT_CTRL;

    static ControlInfo _infoOf(const v4l2_query_ext_ctrl& query) {
        return {.id = query.id,
                .name = textOf(query.name),
                .least = query.minimum,
                .most = query.maximum,
                .is64Bit = query.type == V4L2_CTRL_TYPE_INTEGER64,
                .isReadOnly = (query.flags & V4L2_CTRL_FLAG_READ_ONLY) != 0};
    }

    // Bit masks of 32 bits are unsigned.
    static std::int64_t _valueOf(const ControlInfo& info, const v4l2_ext_control& control) {
        const platform::Number value(control.value);
        return info.is64Bit      ? std::int64_t{control.value64}
               : info.least >= 0 ? std::int64_t{value.as<std::uint32_t>()}
                                 : value.as<std::int64_t>();
    }

    ControlInfo _askForControl(const Control& wanted) {
        v4l2_query_ext_ctrl query{};
        const platform::Number id =
            wanted.name.starts_with("0x") ? parseNumber(wanted.name) : platform::Number();
        if (id.isPresent()) {
            query.id = id.as<std::uint32_t>();
            _call("control " + wanted.name, VIDIOC_QUERY_EXT_CTRL, &query);
            return _infoOf(query);
        }
        std::vector<std::string> names;
        for (query.id = kFirstControl; _try(VIDIOC_QUERY_EXT_CTRL, &query) == 0;
             query.id |= kFirstControl) {
            const std::string name = textOf(query.name);
            names.push_back(plainName(name));
            if (name == wanted.name || names.back() == wanted.name) {
                return _infoOf(query);
            }
        }
        throw SystemProblem(_path + ": no control \"" + wanted.name + "\"" +
                                input::didYouMean(plainName(wanted.name), names),
                            EINVAL);
    }

    // 0, or the errno.
    template <class Argument>
    int _try(unsigned long request, Argument* argument) {
        for (;;) {
            if (ioctl(_file.number(), request, argument) >= 0) {
                return 0;
            }
            if (errno != EINTR) {
                return errno;
            }
        }
    }

    template <class Argument>
    void _call(const std::string& what, unsigned long request, Argument* argument) {
        if (const int code = _try(request, argument); code != 0) {
            failWithErrno(_path + ": " + what, code);
        }
    }

    void _callControl(const char* doing,
                      unsigned long request,
                      const ControlInfo& info,
                      v4l2_ext_control& control) {
        v4l2_ext_controls controls{};
        controls.which = V4L2_CTRL_WHICH_CUR_VAL;
        controls.count = 1;
        controls.controls = &control;
        _call(std::string(doing) + " control \"" + info.name + "\"", request, &controls);
    }

    void _callExtensionUnit(const char* doing,
                            std::uint8_t how,
                            const ExtensionUnit& unit,
                            std::vector<std::byte>& bytes) {
        uvc_xu_control_query query{};
        query.unit = unit.unit;
        query.selector = unit.selector;
        query.query = how;
        query.size = static_cast<std::uint16_t>(bytes.size());
        query.data = reinterpret_cast<std::uint8_t*>(bytes.data());
        _call(std::string(doing) + " selector " + std::to_string(unit.selector) +
                  " of extension unit " + std::to_string(unit.unit),
              UVCIOC_CTRL_QUERY, &query);
    }

    void _map(std::uint32_t index) {
        v4l2_buffer buffer{};
        buffer.index = index;
        buffer.type = _type;
        buffer.memory = V4L2_MEMORY_MMAP;
        _call("looking at a buffer", VIDIOC_QUERYBUF, &buffer);
        Mapping mapping(_file.number(), buffer.length, buffer.m.offset);
        if (!mapping.isThere()) {
            failWithErrno(_path + ": mapping a buffer");
        }
        _mappings.push_back(std::move(mapping));
    }

    [[noreturn]] void _refuse(const std::string& reason) const {
        throw SystemProblem(_path + ": " + reason, EINVAL);
    }

    const std::string _path;
    const FileDescriptor _file;
    std::uint32_t _type = V4L2_BUF_TYPE_VIDEO_CAPTURE;
    bool _isPrepared = false;
    std::vector<Mapping> _mappings;

    platform::Mutex _mutex;
    std::map<std::string, ControlInfo> _controls ZR_GUARDED_BY(_mutex);  // that were found
};

std::string busOf(V4l2Device& device) {
    return textOf(device.capability().bus_info);
}

// The node of the description. One that was found by all that /sys says is opened only when its bus is asked for.
std::pair<VideoNode, std::shared_ptr<V4l2Device>> openVideo(const Machine& machine,
                                                            const StreamDescription& described) {
    std::vector<std::pair<VideoNode, std::shared_ptr<V4l2Device>>> found;
    for (const VideoNode& node : videoNodes(machine)) {
        if (!matches(node, described.video)) {
            continue;
        }
        auto device = std::make_shared<V4l2Device>(machine, node.path);
        const v4l2_capability capability = device->capability();
        const bool isCamera = (capability.device_caps & V4L2_CAP_VIDEO_CAPTURE) != 0;
        const std::string& bus = described.video.busInfo;
        if (isCamera && (bus.empty() || bus == textOf(capability.bus_info))) {
            found.emplace_back(node, std::move(device));
        }
    }
    if (found.empty()) {
        throw SystemProblem("no camera matches \"video\" of the stream " + described.name, ENODEV);
    }
    if (found.size() > 1) {
        throw SystemProblem("more than one camera matches \"video\" of the stream " +
                                described.name + ": " + found[0].first.path + ", " +
                                found[1].first.path,
                            ENOTUNIQ);
    }
    return std::move(found.front());
}

// The next node of the same device and the same bus that captures metadata.
std::shared_ptr<V4l2Device> openMetadata(const Machine& machine,
                                         const VideoNode& video,
                                         const std::string& bus) {
    for (const VideoNode& node : videoNodes(machine)) {
        if (node.device != video.device || node.index <= video.index) {
            continue;
        }
        auto device = std::make_shared<V4l2Device>(machine, node.path);
        const v4l2_capability capability = device->capability();
        if ((capability.device_caps & V4L2_CAP_META_CAPTURE) != 0 &&
            textOf(capability.bus_info) == bus) {
            return device;
        }
    }
    throw SystemProblem(video.path + ": the camera has no metadata node", ENODEV);
}

}  // namespace

std::shared_ptr<VideoDevice> openVideoDevice(const Machine& machine, const std::string& path) {
    return std::make_shared<V4l2Device>(machine, path);
}

Camera openCamera(const Machine& machine, const StreamDescription& described) {
    const auto [node, video] = openVideo(machine, described);
    Camera camera{.video = video};
    if (!described.metadataFormat.empty()) {
        camera.metadata = openMetadata(machine, node, busOf(*video));
    }
    return camera;
}

}  // namespace linux_device
