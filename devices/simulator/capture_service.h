// The simulated capture service: a device with camera streams that deliver frames and events on
// threads of their own, at the configured rate or as fast as they are taken.
#ifndef ZR_DEVICES_SIMULATOR_CAPTURE_SERVICE_H
#define ZR_DEVICES_SIMULATOR_CAPTURE_SERVICE_H

#include <memory>

#include "devices/simulator/profile/capture_profile.h"
#include "devices/simulator/stream_progress.h"
#include "platform/welkin/capture.h"

namespace simulator {

// The plug-in of such a device; null when the profile has none.
//
// Each call of its device() is another client's connection: its streams, their settings and their
// deliveries are its own. Dropping the device ends them too.
//
// `speed`: simulated seconds per real second. 0, infinity or NaN deliver frames as fast as they are
// taken. A stream has 16 image buffers, in every case: with all of them held it waits for one.
// `progress` counts the frames and the device time of all streams.
//
// Refused, besides what the profile makes fail:
//   - a property written, or a stream started, without control of the stream
//   - a stream started without a frame handler or a second time, stopped while it does not run
//   - a device or a stream used after the device was invalidated
std::shared_ptr<WLISPCapturePlugIn> makeCapturePlugIn(CaptureProfile profile,
                                                      double speed,
                                                      std::shared_ptr<StreamProgress> progress);

}  // namespace simulator

#endif
