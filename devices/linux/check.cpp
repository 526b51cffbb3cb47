#include "devices/linux/check.h"

#include <algorithm>
#include <chrono>
#include <memory>
#include <string>
#include <utility>
#include <variant>
#include <vector>

#include "devices/linux/capture_service.h"
#include "devices/linux/check_report.h"
#include "devices/linux/display.h"
#include "devices/linux/frame_metadata.h"
#include "devices/linux/hid_sensor.h"
#include "devices/linux/video_device.h"
#include "devices/linux/video_nodes.h"
#include "platform/deadline.h"
#include "platform/sync.h"
#include "platform/text_format.h"

namespace linux_device {

namespace {

using platform::Dictionary;
using platform::Value;

constexpr std::chrono::seconds kPatience{3};  // for the first frame
constexpr double kUsualRate = 30;             // frames per second

constexpr std::string_view kSmallDigits = "0123456789abcdef";
constexpr std::string_view kCapitalDigits = "0123456789ABCDEF";

// Four digits.
std::string hexadecimal(std::uint16_t number, std::string_view digits = kSmallDigits) {
    std::string text;
    for (unsigned shift = 16; shift > 0; shift -= 4) {
        text += digits[(number >> (shift - 4)) & 0xFU];
    }
    return text;
}

void adviseRule(CheckReport& report, const std::string& path, const std::string& rule) {
    report.advise(platform::format(
        "only root can open %@; a line for /etc/udev/rules.d/60-zrlab.rules: %@, MODE=\"0660\"",
        path, rule));
}

// The keys of an identity, as they can stand in the description.
std::string identityKeys(std::uint16_t vendor, std::uint16_t product, const std::string& serial) {
    return platform::format(R"("vendor": "0x%@", "product": "0x%@")", hexadecimal(vendor),
                            hexadecimal(product)) +
           (serial.empty() ? "" : platform::format(R"(, "serial": "%@")", serial));
}

// What is there when nothing matches, in the words of a description.
void showNode(CheckReport& report, const VideoNode& node) {
    report.advise(platform::format(
        R"(%@ is {"driver": "%@", "name": "%@", "index": %@%@})", node.path, node.driver, node.name,
        node.index,
        node.vendor == 0 ? "" : ", " + identityKeys(node.vendor, node.product, node.serial)));
}
void showNode(CheckReport& report, const HidNode& node) {
    report.advise(platform::format("%@ is {%@}: %@", node.path,
                                   identityKeys(node.vendor, node.product, node.serial),
                                   node.name));
}

// What a number is made of, as far as the machine has it, and its value.
class NumberCheck {
  public:
    NumberCheck(CheckReport& report, const Machine& machine) : _report(report), _machine(machine) {}

    // `video` is null when no camera was found.
    void check(const std::string& name, const NumberSource& number, VideoDevice* video) {
        if (const auto* constant = std::get_if<Constant>(&number.source)) {
            _report.constant(name, number.conversion.apply(constant->value).text());
        } else if (const auto* file = std::get_if<FileNumber>(&number.source)) {
            _checkFile(name, number, *file);
        } else if (const auto* control = std::get_if<Control>(&number.source)) {
            _report.look(name, [&] {
                return _read(number, video).text() + "  control \"" + control->name + "\"";
            });
        } else if (const auto* unit = std::get_if<ExtensionUnit>(&number.source)) {
            _report.look(name, [&] {
                return _read(number, video).text() + "  selector " +
                       std::to_string(unit->selector) + " of extension unit " +
                       std::to_string(unit->unit);
            });
        } else if (std::holds_alternative<StreamCount>(number.source)) {
            _report.found(name, "counted while streaming");
        }
    }

  private:
    platform::Number _read(const NumberSource& number, VideoDevice* video) {
        if (video == nullptr) {
            throw SystemProblem("no camera to ask", ENODEV);
        }
        return readSource(number, _machine, *video);
    }

    void _checkFile(const std::string& name, const NumberSource& number, const FileNumber& file) {
        std::string path = file.file.path;
        _report.look(name, [&] {
            path = _machine.find(file.file);
            const platform::Number read = numberIn(_machine.read(path), file, path);
            return number.conversion.apply(read).text() + "  " + _report.withOwner(path);
        });
        if (_report.isPrivate(path)) {
            _report.advise(platform::format(
                "only root can read %@; let a group read it (chgrp and chmod, or mount options of "
                "its file system) each time the machine starts",
                path));
        }
    }

    CheckReport& _report;
    const Machine& _machine;
};

// Streams the camera for a moment, as a client does, and keeps its first frame.
class TrialStream {
  public:
    TrialStream(const StreamDescription& described, const Machine& machine) {
        const auto plugIn = makeCapturePlugIn({.streams = {described},
                                               .machine = machine,
                                               .starts = std::make_shared<StreamStarts>(0)});
        _device = plugIn->device(nullptr);
        _stream = _device->streams(nullptr)->front();
    }
    ~TrialStream() { _device->invalidate(nullptr); }
    TrialStream(const TrialStream&) = delete;
    TrialStream& operator=(const TrialStream&) = delete;

    // These throw a SystemProblem.
    void open() {
        _require([&](auto error) { return _device->requestControlOfStreams({_stream}, error); });
    }
    void set(std::string_view property, const Value& value) {
        _require([&](auto error) { return _stream->setValue(value, property, error); });
    }
    Value firstFrame() {
        const auto seen = std::make_shared<Seen>();
        WLRylFrameHandler handler = [seen](const platform::ImageBufferRef& buffer,
                                           platform::MediaTime /*time*/) { seen->add(buffer); };
        set(kRylCaptureStreamProperty_VideoOutputHandlers,
            Dictionary{{kRylCaptureStreamVideoOutputID_PrimaryScaler,
                        Dictionary{{kRylCaptureStreamVideoOutputHandlerKey_PixelBufferHandler,
                                    Value::opaque(std::move(handler))}}}});
        _require([&](auto error) { return _stream->start(error); });
        const platform::ImageBufferRef frame = seen->await();
        _stream->stop(nullptr);
        if (frame == nullptr) {
            throw SystemProblem("no frame came within 3 s", ETIMEDOUT);
        }
        return frame->attachment(kRylCaptureSampleBufferAttachmentKey_MetadataDictionary);
    }

  private:
    class Seen {
      public:
        void add(const platform::ImageBufferRef& buffer) {
            const platform::MutexLock lock(_mutex);
            if (_first == nullptr) {
                _first = buffer;
                _changed.notifyAll();
            }
        }
        // Null when none comes.
        platform::ImageBufferRef await() {
            const auto deadline = platform::deadlineAfter(kPatience);
            const platform::MutexLock lock(_mutex);
            while (_first == nullptr && std::chrono::steady_clock::now() < deadline) {
                _changed.waitUntil(_mutex, deadline);
            }
            return _first;
        }

      private:
        platform::Mutex _mutex;
        platform::Condition _changed;
        platform::ImageBufferRef _first ZR_GUARDED_BY(_mutex);
    };

    template <class Call>
    static void _require(const Call& call) {
        platform::ErrorRef error;
        if (!call(&error)) {
            throw SystemProblem(error->localizedDescription(), static_cast<int>(error->code()));
        }
    }

    std::shared_ptr<WLRylCaptureDevice> _device;
    std::shared_ptr<WLRylCaptureStream> _stream;
};

class StreamCheck {
  public:
    StreamCheck(CheckReport& report, const Machine& machine, const StreamDescription& described)
        : _report(report), _machine(machine), _described(described), _numbers(report, machine) {}

    void check() {
        _report.begin("capture/streams/" + _described.name);
        _checkNodes();
        _checkProperties();
        _checkFrame();
        for (const NumberSource& number : _described.errorCounters) {
            _numbers.check("errorCounters/" + number.key, number, _camera.video.get());
        }
        for (const EventRule& rule : _described.events) {
            if (rule.cause == EventCause::ControlChanged) {
                _checkControl("events/" + rule.control.name, rule.control);
            }
        }
    }

  private:
    void _checkNodes() {
        for (const VideoNode& node : videoNodes(_machine)) {
            if (matches(node, _described.video) && _report.isPrivate(node.path)) {
                adviseRule(_report, node.path, R"(SUBSYSTEM=="video4linux", GROUP="video")");
            }
        }
        const bool isThere = _report.look("video", [&] {
            _camera = openCamera(_machine, _described);
            return _report.withOwner(_camera.video->path());
        });
        if (!isThere) {
            for (const VideoNode& node : videoNodes(_machine)) {
                showNode(_report, node);
            }
        }
        if (_camera.metadata != nullptr) {
            _report.look("metadataFormat", [&] {
                _camera.metadata->setMetadataFormat(_described.metadataFormat);
                return _described.metadataFormat + "  " +
                       _report.withOwner(_camera.metadata->path());
            });
        }
    }

    std::string _controlText(const Control& control) {
        if (_camera.video == nullptr) {
            throw SystemProblem("no camera to ask", ENODEV);
        }
        const ControlInfo info = _camera.video->findControl(control);
        return std::to_string(_camera.video->control(info)) + "  control \"" + info.name + "\", " +
               std::to_string(info.least) + " to " + std::to_string(info.most);
    }

    void _checkControl(const std::string& name, const Control& control) {
        _report.look(name, [&] { return _controlText(control); });
    }

    void _checkProperties() {
        for (const PropertyTarget& property : _described.properties) {
            const std::string name = "properties/" + property.name;
            if (std::holds_alternative<Accepted>(property.target)) {
                _report.constant(name, "accepted, without effect");
            } else if (const auto* control = std::get_if<Control>(&property.target)) {
                _checkControl(name, *control);
            } else if (const auto* unit = std::get_if<ExtensionUnit>(&property.target)) {
                _numbers.check(name, {.name = name, .source = *unit}, _camera.video.get());
            }
        }
        for (const ControlSetting& setting : _described.beforeStart) {
            _checkControl("beforeStart/" + setting.control.name, setting.control);
        }
    }

    // The metadata; the camera belongs to the trial meanwhile.
    void _checkFrame() {
        Value metadata;
        if (_camera.video != nullptr) {
            _camera = {};
            try {
                metadata = _trialFrame();
            } catch (const SystemProblem& problem) {
                _report.missing("frame", problem.what());
            }
        }
        _reopen();
        for (const NumberSource& number : _described.metadata) {
            _checkMetadata(number, metadata);
        }
        for (const FrameKey& key : kFrameKeys) {
            if (key.isRequired &&
                std::none_of(_described.metadata.begin(), _described.metadata.end(),
                             [&](const NumberSource& each) { return each.name == key.name; })) {
                _report.missing(
                    "metadata/" + std::string(key.shortName),
                    "not described; the projector diagnostic refuses frames without it");
            }
        }
    }

    // The formats, the usual frame rate and a frame, whose metadata it returns; nothing when there was none to ask
    // for. Throws a SystemProblem when no frame came as it should.
    Value _trialFrame() {
        TrialStream trial(_described, _machine);
        trial.open();
        bool isReady = true;
        // The first one last: the trial streams it.
        for (std::size_t at = _described.formats.size(); at-- > 0;) {
            isReady &= _report.look("formats/" + std::to_string(at), [&] {
                const VideoFormat& format = _described.formats[at];
                trial.set(kRylCaptureStreamProperty_FormatIndex, std::uint64_t{at});
                return format.fourcc + " " + std::to_string(format.width) + "x" +
                       std::to_string(format.height);
            });
        }
        isReady &= _report.look("properties/maximumFrameRate", [&] {
            trial.set(kRylCaptureStreamProperty_MaximumFrameRate, kUsualRate);
            return platform::Number(kUsualRate).text() + " frames per second";
        });
        if (!isReady) {
            return {};
        }
        Value metadata = trial.firstFrame();
        if (!metadata.isPresent()) {
            throw SystemProblem("it came without its metadata, for the reason that was logged",
                                ENODATA);
        }
        _report.found("frame", "one received, with its metadata");
        return metadata;
    }

    void _reopen() {
        try {
            _camera = openCamera(_machine, _described);
        } catch (const SystemProblem&) {
            // Reported before, or gone since: what asks it says so.
        }
    }

    void _checkMetadata(const NumberSource& number, const Value& frame) {
        const std::string name = "metadata/" + number.key;
        const auto* field = std::get_if<BufferField>(&number.source);
        if (field == nullptr) {
            _numbers.check(name, number, _camera.video.get());
            return;
        }
        const platform::Number value = frame[number.name].asNumber();
        const std::string where = "byte " + std::to_string(field->at) + " of the metadata";
        if (value.isPresent()) {
            _report.found(name, value.text() + "  " + where);
        } else if (number.optional && frame.isPresent()) {
            _report.found(name, "not in this frame  " + where);
        } else {
            _report.missing(name, "not seen in a frame: " + where);
        }
    }

    CheckReport& _report;
    const Machine& _machine;
    const StreamDescription& _described;
    NumberCheck _numbers;
    Camera _camera;
};

void checkHid(CheckReport& report,
              const Machine& machine,
              const std::vector<HidDescription>& described) {
    report.begin("hid/devices");
    const std::vector<HidNode> nodes = findHidNodes(machine, {});
    for (const HidDescription& device : described) {
        bool isThere = false;
        for (const HidNode& node : nodes) {
            if (!matches(node, device)) {
                continue;
            }
            isThere = true;
            report.look(device.name, [&] {
                platform::ErrorRef error;
                if (!makeHidDevice(node, machine)->open(&error)) {
                    throw SystemProblem(error->localizedDescription(),
                                        static_cast<int>(error->code()));
                }
                return report.withOwner(node.path) + "  " + node.name + ", usage page " +
                       hexadecimal(node.descriptor.primaryUsagePage) + ", usage " +
                       hexadecimal(node.descriptor.primaryUsage);
            });
            if (report.isPrivate(node.path)) {
                // The kernel writes the numbers in the device's name in capitals.
                const std::string rule =
                    platform::format(R"(KERNEL=="hidraw*", KERNELS=="*:%@:%@.*", GROUP="plugdev")",
                                     hexadecimal(node.vendor, kCapitalDigits),
                                     hexadecimal(node.product, kCapitalDigits));
                adviseRule(report, node.path, rule);
            }
        }
        if (!isThere) {
            report.missing(device.name, "no node in /sys/class/hidraw matches");
            for (const HidNode& node : nodes) {
                showNode(report, node);
            }
        }
    }
}

void checkDisplay(CheckReport& report, const Machine& machine, const DisplayDescription& display) {
    report.begin("display");
    std::string folder;
    report.look("connector", [&] { return folder = connectorFolder(display, machine); });
    for (const auto& [file, content] : display.on) {
        report.look("on/" + file, [&, &file = file, &content = content] {
            if (folder.empty()) {
                throw SystemProblem("there is no connector", ENOENT);
            }
            const std::string is = machine.readLine(platform::format("%@/%@", folder, file));
            return is == content
                       ? is
                       : platform::format(R"(%@  the panel has no power: not "%@")", is, content);
        });
    }
}

}  // namespace

devices::Findings checkMachine(const Description& description, const Machine& machine) {
    CheckReport report(machine);
    if (description.capture.has_value()) {
        for (const StreamDescription& stream : *description.capture) {
            StreamCheck(report, machine, stream).check();
        }
    }
    if (description.counters.has_value()) {
        report.begin("counters/channels");
        NumberCheck numbers(report, machine);
        for (const CounterChannel& channel : *description.counters) {
            numbers.check(channel.name, channel.count, nullptr);
        }
    }
    if (description.hid.has_value()) {
        checkHid(report, machine, *description.hid);
    }
    if (description.display.has_value()) {
        checkDisplay(report, machine, *description.display);
    }
    return report.findings();
}

}  // namespace linux_device
