// The capture service, with faults.
#ifndef ZR_DEVICES_FAULTY_CAPTURE_H
#define ZR_DEVICES_FAULTY_CAPTURE_H

#include <memory>

#include "devices/faulty/injector.h"
#include "platform/welkin/capture.h"

namespace faulty {

std::shared_ptr<WLISPCapturePlugIn> faultyCapture(std::shared_ptr<WLISPCapturePlugIn> plugIn,
                                                  std::shared_ptr<Injector> injector);

}  // namespace faulty

#endif
