// The cameras of the machine, as the capture service.
#ifndef ZR_DEVICES_LINUX_CAPTURE_SERVICE_H
#define ZR_DEVICES_LINUX_CAPTURE_SERVICE_H

#include <memory>

#include "devices/linux/capture_stream.h"
#include "platform/welkin/capture.h"

namespace linux_device {

// Each call of its device() is another client's connection, with streams of its own in the order of the
// description. Nodes are opened when a client asks for control of their stream, so that a camera that is missing
// hides no other. Dropping a device ends its streams.
std::shared_ptr<WLISPCapturePlugIn> makeCapturePlugIn(CaptureContext context);

}  // namespace linux_device

#endif
