// Any sequence of input reports, errors among them: images for the reports that are long enough and
// have the right ID, an error handed on unchanged, and no byte read beyond a report.
//
// The input is a sequence of reports: a byte that says which kind (0: an error, 1: an image report,
// else a report of that ID), the length in two bytes, lowest first, and so many bytes.
#include <algorithm>
#include <cstdint>
#include <iterator>
#include <memory>
#include <span>
#include <vector>

#include "fuzz/expect.h"
#include "kirra/image_stream.h"
#include "tests/support/hand_fed_sensor.h"

namespace {

using fuzz::expect;
using platform::ErrorRef;

struct Delegate final : ZRKirraImageStreamDelegate {
    void handleImage(ZRKirraMendraImage image) override {
        expect(image.dScanI().size() == 48, "48 samples");
        ++images;
    }
    void streamDidError(const ErrorRef& error) override { lastError = error; }

    std::size_t images = 0;
    ErrorRef lastError;
};

std::uint8_t take(std::span<const std::uint8_t>& input) {
    if (input.empty()) {
        return 0;
    }
    const std::uint8_t byte = input.front();
    input = input.subspan(1);
    return byte;
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* bytes, std::size_t size) {
    const auto sensor = std::make_shared<test::HandFedSensor>();
    platform::installServices({.hid = std::make_shared<test::OneSensorBus>(sensor)});
    const auto runLoop = platform::RunLoop::forThisThread();
    const auto delegate = std::make_shared<Delegate>();
    const auto stream = std::make_shared<ZRKirraImageStream>();
    stream->setDelegate(delegate);
    expect(stream->openWithRunLoop(runLoop, nullptr), "the open");
    const WLHIDInputReportCallback report = sensor->callback;  // a late report uses it, too

    std::span<const std::uint8_t> input(bytes, size);
    while (!input.empty()) {
        const std::uint8_t kind = take(input);
        const std::size_t low = take(input);
        const std::size_t length = std::min(low + 256 * std::size_t{take(input)}, input.size());
        // A copy of exactly that length, so that the sanitizer sees a read beyond it.
        std::vector<std::byte> data;
        std::transform(input.begin(), input.begin() + static_cast<std::ptrdiff_t>(length),
                       std::back_inserter(data), [](std::uint8_t byte) { return std::byte{byte}; });
        data.shrink_to_fit();
        input = input.subspan(length);

        const std::int64_t id = kind < 2 ? 118 : kind;
        const ErrorRef error =
            kind == 0 ? std::make_shared<const platform::Error>("sensor", 1, "fuzz") : nullptr;
        const std::size_t before = delegate->images;
        delegate->lastError = nullptr;
        report(id, data, error);
        const bool isImage = error == nullptr && id == 118 && length >= 792;
        expect(delegate->images - before == (isImage ? 1U : 0U), "an image for an image report");
        expect(delegate->lastError == error, "the error itself");
        expect(error == nullptr || sensor->callback == nullptr, "closed by an error");
    }
    return 0;
}
