// A device's services that answer and deliver what a script says.
#ifndef ZR_DEVICES_RECORDING_REPLAYED_H
#define ZR_DEVICES_RECORDING_REPLAYED_H

#include <memory>

#include "devices/recording/script.h"
#include "platform/display.h"
#include "platform/welkin/capture.h"
#include "platform/welkin/hid.h"
#include "platform/welkin/meterix.h"

namespace recording {

using ScriptRef = std::shared_ptr<Script>;

std::shared_ptr<WLISPCapturePlugIn> replayCapture(ScriptRef script);
std::shared_ptr<platform::MeterixFacility> replayMeterix(ScriptRef script);
std::shared_ptr<platform::HidFacility> replayHid(ScriptRef script);
std::shared_ptr<platform::DisplayService> replayDisplay(ScriptRef script);
std::shared_ptr<platform::DeviceRegistry> replayRegistry(ScriptRef script);

}  // namespace recording

#endif
