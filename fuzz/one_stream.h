// A capture service whose one stream takes everything; who holds it plays the device in `onStart`, which
// is called with the frame handler.
#ifndef ZR_FUZZ_ONE_STREAM_H
#define ZR_FUZZ_ONE_STREAM_H

#include <functional>
#include <memory>
#include <utility>

#include "devices/simulator/meterix_facility.h"
#include "platform/services.h"
#include "tests/support/one_stream_capture.h"

namespace fuzz {

struct OneStream final : test::OneStreamCapture {
    bool start(platform::ErrorSlot /*error*/) override {
        onStart(frameHandler());
        return true;
    }
    bool stop(platform::ErrorSlot /*error*/) override { return true; }

    std::function<void(const WLRylFrameHandler& handler)> onStart;
};

// Installs a new one, and a facility with one counter.
inline std::shared_ptr<OneStream> installOneStream() {
    auto stream = std::make_shared<OneStream>();
    simulator::MeterixProfile counters;
    counters.channels.push_back({"Q71ISP", "Q71ISP Events", "one"});
    platform::installServices(
        {.capture = stream,
         .meterix = simulator::makeMeterixFacility(std::move(counters),
                                                   std::make_shared<simulator::StreamProgress>())});
    return stream;
}

}  // namespace fuzz

#endif
