// A device profile made from a recording.
#ifndef ZR_HOST_ZRLAB_RECORDING_PROFILE_H
#define ZR_HOST_ZRLAB_RECORDING_PROFILE_H

#include <string>

#include "devices/recording/recording.h"

namespace host {

// The text of a profile of the simulator, as "zrlab device show" prints one: a device that answers and delivers what
// was recorded, as far as a profile can say it. Of several runs it takes what came first.
//
//   taken over       which services there are, streams with port types, properties that fail, error counters;
//                    metadata of the frames, lost frames, a stall, events, frames after the stop; counters and how
//                    far they rose; calls that fail with their errors; the sensor's reports: how many, their lengths and
//                    IDs, an error, an unplugging; the display's power state
//   left out         the contents of images, exact times, what no experiment asked for
//
// Throws a recording::RecordingProblem when a text of the recording, whose file is `name`, is not UTF-8.
std::string profileOf(const recording::Recording& recording, const std::string& name);

}  // namespace host

#endif
