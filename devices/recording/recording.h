// A recording as a whole, read from its file.
#ifndef ZR_DEVICES_RECORDING_RECORDING_H
#define ZR_DEVICES_RECORDING_RECORDING_H

#include <cstdint>
#include <stdexcept>
#include <string>
#include <string_view>
#include <vector>

#include "devices/recording/entry.h"

namespace recording {

// Why a recording cannot be used, in one line that names the file.
class RecordingProblem : public std::runtime_error {
  public:
    using std::runtime_error::runtime_error;
};

struct Recording {
    Session session;
    std::vector<Entry> entries;  // after the session, without the end

    // What is missing: entries that the recorder lost, and whether the file stops before the end of the
    // recording. What was complete is in `entries`.
    Hole lost;
    bool isCut = false;

    std::uint64_t bytes = 0;  // of the file, as far as it is complete

    // What is missing, one line each; none when the recording is complete.
    std::vector<std::string> warnings() const;
};

// The recording in these bytes; `name` stands for them in a problem's text. Throws a RecordingProblem when they
// are not a recording, are of another version, end within the first entry, or are damaged: an entry that is
// complete and not well formed.
Recording parseRecording(std::string_view bytes, const std::string& name);

// The same for a file. Also throws when it cannot be read.
Recording readRecording(const std::string& path);

}  // namespace recording

#endif
