// Recordings that tests write themselves.
#ifndef ZR_TESTS_DEVICES_RECORDING_RECORDINGS_H
#define ZR_TESTS_DEVICES_RECORDING_RECORDINGS_H

#include <memory>
#include <string>
#include <string_view>
#include <utility>
#include <vector>

#include "devices/recording/coding.h"
#include "devices/recording/recording.h"
#include "devices/recording/script.h"
#include "platform/sync.h"
#include "platform/welkin/capture.h"

namespace test {

inline const recording::Session kSession{.device = "board",
                                         .summary = "A board",
                                         .facts = {{"serial number", "B-7"}},
                                         .services = {"capture", "meterix", "hid"},
                                         .parameters = {"frameCount=3"},
                                         .program = "zrlab 1.0.0",
                                         .started = "2026-11-24T17:34:07.125Z"};

// The bytes of a recording with these entries, from its session to its end.
inline std::string bytesOf(const std::vector<recording::Entry>& entries) {
    recording::Encoder encoder;
    std::string bytes(recording::kFileStart);
    bytes += encoder.encode({.at = {}, .content = kSession});
    for (const recording::Entry& entry : entries) {
        bytes += encoder.encode(entry);
    }
    return bytes + encoder.encode({.at = {}, .content = recording::End()});
}

inline recording::Recording parsed(std::string_view bytes) {
    return recording::parseRecording(bytes, "test.zrr");
}

// Why the bytes are not a recording that can be used; empty when they are.
inline std::string problemWith(std::string_view bytes) {
    try {
        parsed(bytes);
        return "";
    } catch (const recording::RecordingProblem& problem) {
        return problem.what();
    }
}

// The handlers property with this frame handler.
inline platform::Value handlersWith(WLRylFrameHandler handler) {
    return platform::Dictionary{
        {kRylCaptureStreamVideoOutputID_PrimaryScaler,
         platform::Dictionary{{kRylCaptureStreamVideoOutputHandlerKey_PixelBufferHandler,
                               platform::Value::opaque(std::move(handler))}}}};
}

// What a recorder writes.
class Tape {
  public:
    void write(std::string_view bytes) {
        const platform::MutexLock lock(_mutex);
        _bytes += bytes;
    }
    std::string bytes() {
        const platform::MutexLock lock(_mutex);
        return _bytes;
    }
    recording::Recording recording() { return parsed(bytes()); }

  private:
    platform::Mutex _mutex;
    std::string _bytes ZR_GUARDED_BY(_mutex);
};

// The contents of one kind, in their order.
template <class Content>
std::vector<Content> allOf(const recording::Recording& recording) {
    std::vector<Content> found;
    for (const recording::Entry& entry : recording.entries) {
        if (const auto* content = std::get_if<Content>(&entry.content)) {
            found.push_back(*content);
        }
    }
    return found;
}

}  // namespace test

#endif
