#include "devices/linux/frame_pairs.h"

#include <utility>

namespace linux_device {

namespace {

// Metadata of pictures that were lost is dropped when a later picture comes; this bounds it when none does.
constexpr std::size_t kMostWaiting = 64;

}  // namespace

void FramePairs::addPicture(const FilledBuffer& picture, TimePoint now) {
    _pictures.push_back({picture, now + kPatience});
}

void FramePairs::addMetadata(std::int64_t microseconds, std::span<const std::byte> content) {
    _metadata.push_back({microseconds, {content.begin(), content.end()}});
    if (_metadata.size() > kMostWaiting) {
        _metadata.pop_front();
    }
}

std::optional<FramePairs::Frame> FramePairs::next(TimePoint now) {
    if (_pictures.empty()) {
        return std::nullopt;
    }
    const Picture& first = _pictures.front();
    while (!_metadata.empty() && _metadata.front().microseconds < first.buffer.microseconds) {
        _metadata.pop_front();
    }
    Frame frame{first.buffer};
    if (!_metadata.empty() && _metadata.front().microseconds == first.buffer.microseconds) {
        frame.metadata = std::move(_metadata.front().content);
        _metadata.pop_front();
    } else if (_hasMetadata && _metadata.empty() && now < first.deadline) {
        return std::nullopt;
    }
    _pictures.pop_front();
    return frame;
}

FramePairs::TimePoint FramePairs::deadline() const {
    return _pictures.empty() ? TimePoint::max() : _pictures.front().deadline;
}

}  // namespace linux_device
