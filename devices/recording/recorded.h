// The decorators around a device's services that record what passes through them, unchanged. A null service stays
// null.
#ifndef ZR_DEVICES_RECORDING_RECORDED_H
#define ZR_DEVICES_RECORDING_RECORDED_H

#include <memory>

#include "devices/recording/recorder.h"
#include "platform/display.h"
#include "platform/welkin/capture.h"
#include "platform/welkin/hid.h"
#include "platform/welkin/meterix.h"

namespace recording {

std::shared_ptr<WLISPCapturePlugIn> recordCapture(std::shared_ptr<WLISPCapturePlugIn> plugIn,
                                                  const RecorderRef& recorder);
std::shared_ptr<platform::MeterixFacility> recordMeterix(
    std::shared_ptr<platform::MeterixFacility> facility, const RecorderRef& recorder);
std::shared_ptr<platform::HidFacility> recordHid(std::shared_ptr<platform::HidFacility> facility,
                                                 const RecorderRef& recorder);
std::shared_ptr<platform::DisplayService> recordDisplay(
    std::shared_ptr<platform::DisplayService> service, const RecorderRef& recorder);
std::shared_ptr<platform::DeviceRegistry> recordRegistry(
    std::shared_ptr<platform::DeviceRegistry> registry, const RecorderRef& recorder);

}  // namespace recording

#endif
