// The simulated capture service: a device with camera streams that deliver frames and events on
// threads of their own, at the configured rate or as fast as they are taken.
#ifndef ZR_DEVICES_SIMULATOR_CAPTURE_SERVICE_H
#define ZR_DEVICES_SIMULATOR_CAPTURE_SERVICE_H

#include <cstddef>
#include <memory>

#include "devices/observed/observer.h"
#include "devices/simulator/profile/capture_profile.h"
#include "devices/simulator/stream_progress.h"
#include "platform/welkin/capture.h"

namespace simulator {

// The plug-in as makeCapturePlugIn makes it, for whoever wants to look inside.
class SimulatedCapture : public WLISPCapturePlugIn {
  public:
    // Image buffers, over all devices and streams, that somebody still holds. Any thread.
    virtual std::size_t liveBuffers() const = 0;
};

// The plug-in of such a device; null when the profile has none.
//
// Each call of its device() is another client's connection: its streams, their settings and their
// deliveries are its own. Dropping the device ends them too.
//
// `speed`: device time a second of real time. 0, infinity or NaN deliver frames as fast as they are
// taken. A stream has 16 image buffers, in every case: with all of them held it waits for one.
// `progress` counts the frames and the device time of all streams.
//
// The observer is told each frame, after its handler returned, and each misuse:
//   - a property written, or a stream started, without control of the stream
//   - a stream started without a frame handler or a second time, stopped while it does not run
//   - a device or a stream used after the device was invalidated
//   - no buffer given back for five seconds, or one still held a second after the plug-in went
std::shared_ptr<WLISPCapturePlugIn> makeCapturePlugIn(CaptureProfile profile,
                                                      double speed,
                                                      std::shared_ptr<StreamProgress> progress,
                                                      std::weak_ptr<observed::Observer> observer);

}  // namespace simulator

#endif
