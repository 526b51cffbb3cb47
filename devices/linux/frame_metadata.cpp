#include "devices/linux/frame_metadata.h"

#include <utility>
#include <variant>

#include "devices/linux/device_log.h"
#include "devices/linux/system_problem.h"
#include "platform/deadline.h"

namespace linux_device {

namespace {

// The bench finds lost frames by it.
constexpr std::string_view kFrameNumber = "FrameNumber";

}  // namespace

platform::Number readSource(const NumberSource& number,
                            const Machine& machine,
                            VideoDevice& video) {
    platform::Number read;
    if (const auto* constant = std::get_if<Constant>(&number.source)) {
        read = constant->value;
    } else if (const auto* file = std::get_if<FileNumber>(&number.source)) {
        read = readNumber(machine, *file);
    } else if (const auto* control = std::get_if<Control>(&number.source)) {
        read = video.control(video.findControl(*control));
    } else if (const auto* unit = std::get_if<ExtensionUnit>(&number.source)) {
        read = video.extensionUnit(*unit);
    }
    return number.conversion.apply(read);
}

FrameMetadata::FrameMetadata(const std::vector<NumberSource>& described,
                             Machine machine,
                             std::shared_ptr<VideoDevice> video)
    : _described(described)
    , _machine(std::move(machine))
    , _video(std::move(video))
    , _kept(described.size()) {}

std::optional<platform::Dictionary> FrameMetadata::make(std::span<const std::byte> buffer,
                                                        std::uint64_t number) {
    platform::MutableDictionary metadata;
    metadata.reserve(_described.size() + 1);
    metadata.set(kFrameNumber, number);
    for (std::size_t index = 0; index < _described.size(); ++index) {
        const NumberSource& source = _described[index];
        platform::Number value;
        const std::string* problem = nullptr;
        if (const auto* field = std::get_if<BufferField>(&source.source)) {
            const std::size_t at = std::min(field->at, buffer.size());
            value = source.conversion.apply(numberIn(buffer.subspan(at), field->type));
        } else {
            const Kept& kept = _read(index);
            value = kept.number;
            problem = &kept.problem;
        }
        if (value.isPresent()) {
            metadata.set(source.name, value);
        } else if (!source.optional) {
            const std::string text =
                "metadata/" + source.key + ": " +
                (problem != nullptr ? *problem
                                    : "not in the frame's " + std::to_string(buffer.size()) +
                                          " bytes of metadata");
            if (text != _lastProblem) {
                logProblem(text);
                _lastProblem = text;
            }
            return std::nullopt;
        }
    }
    _lastProblem.clear();
    return platform::Dictionary(std::move(metadata));
}

// Anew when it was kept for long enough.
const FrameMetadata::Kept& FrameMetadata::_read(std::size_t index) {
    Kept& kept = _kept[index];
    const NumberSource& source = _described[index];
    if (std::chrono::steady_clock::now() < kept.until) {
        return kept;
    }
    try {
        kept.number = readSource(source, _machine, *_video);
    } catch (const SystemProblem& problem) {
        kept.number = {};
        kept.problem = problem.what();
    }
    // Counted from now: reading may have taken long.
    kept.until = platform::deadlineAfter(std::chrono::duration<double>(source.atMostEvery));
    return kept;
}

}  // namespace linux_device
