// Whatever a recording's file holds: it is read, or one line says what is wrong with it. What was read and is written
// again reads as the same, and can be replayed.
//
// Input: the file behind its first line.
#include "devices/recording/recording.h"

#include <algorithm>
#include <cctype>
#include <string>

#include "devices/recording/coding.h"
#include "devices/recording/script.h"
#include "fuzz/expect.h"
#include "fuzz/input.h"
#include "host/zrlab/recording_profile.h"
#include "platform/log.h"

namespace {

using fuzz::expect;

struct NoLog final : platform::LogSink {
    void write(const platform::LogLine& /*line*/) override {}
};

// Empty when an entry is deeper than can be written: one level less than can be read.
std::string written(const recording::Recording& file) {
    recording::Encoder encoder;
    std::string bytes(recording::kFileStart);
    bytes += encoder.encode({.at = {}, .content = file.session});
    for (const recording::Entry& entry : file.entries) {
        const std::string one = encoder.encode(entry);
        if (one.empty()) {
            return "";
        }
        bytes += one;
    }
    return bytes;
}

void replay(const recording::Recording& file) {
    recording::Script script(file, 1);
    for (const recording::Entry& entry : file.entries) {
        if (const auto* call = std::get_if<recording::Call>(&entry.content)) {
            platform::ErrorRef error;
            script.take(call->operation, call->object, call->arguments, &error);
            expect(error == nullptr || error->domain() != recording::kReplayErrorDomain ||
                       call->error != nullptr,
                   "what was recorded is answered");
        } else if (const auto* frame = std::get_if<recording::Frame>(&entry.content)) {
            const auto& of = script.deliveries(frame->stream, frame->phase.start);
            expect(of.beforeStop <= of.contents.size() && of.contents.size() == of.offsets.size() &&
                       !of.contents.empty(),
                   "the frame is delivered");
        }
    }
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
    static const bool isQuiet = [] {
        platform::setLogSink(std::make_shared<NoLog>(), platform::LogLevel::Error);
        return true;
    }();
    expect(isQuiet, "a sink");
    std::string bytes(recording::kFileStart);
    bytes += fuzz::Input(data, size).rest();
    try {
        const auto file = recording::parseRecording(bytes, "file");
        replay(file);
        host::profileOf(file, "file");
        const std::string again = written(file);
        if (!again.empty()) {
            const auto second = recording::parseRecording(again, "file");
            expect(second.entries.size() == file.entries.size(), "the same entries");
            expect(written(second) == again, "the same bytes");
        }
    } catch (const recording::RecordingProblem& problem) {
        const std::string text = problem.what();
        expect(text.starts_with("file: "), "the culprit");
        expect(std::none_of(text.begin(), text.end(),
                            [](unsigned char c) { return std::iscntrl(c) != 0; }),
               "one line");
    }
    return 0;
}
