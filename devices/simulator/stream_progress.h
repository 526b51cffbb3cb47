// StreamProgress: how far the device's streaming has come; what makes its counters rise.
#ifndef ZR_DEVICES_SIMULATOR_STREAM_PROGRESS_H
#define ZR_DEVICES_SIMULATOR_STREAM_PROGRESS_H

#include <atomic>
#include <cstdint>

namespace simulator {

// Atomic: the capture threads write it while a snapshot of the counters reads it on another thread.
struct StreamProgress {
    std::atomic<std::uint64_t> frames{0};        // frames delivered since the device was made
    std::atomic<std::uint64_t> microseconds{0};  // device time spent streaming, over all frames
};

}  // namespace simulator

#endif
