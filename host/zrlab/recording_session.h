// What recordings are to a session: it writes one with --record, and replays one with --device replay:FILE.
#ifndef ZR_HOST_ZRLAB_RECORDING_SESSION_H
#define ZR_HOST_ZRLAB_RECORDING_SESSION_H

#include <memory>
#include <string>
#include <vector>

#include "devices/device.h"
#include "devices/recording/recorder.h"
#include "host/record/run_listener.h"
#include "host/report/report_form.h"
#include "host/zrlab/device_choice.h"

namespace host {

// Follows the session whose device is recorded.
//
// Owner    The session's reports. What the device is used for after that is not recorded.
// Threads  The session's; the sink is called on a thread of the recorder's.
class SessionRecorder final : public RunListener {
  public:
    explicit SessionRecorder(ReportSink sink) : _sink(std::move(sink)) {}
    ~SessionRecorder() override { finish(); }
    SessionRecorder(const SessionRecorder&) = delete;
    SessionRecorder& operator=(const SessionRecorder&) = delete;

    // Begins with the device: its services are recorded from here on. `parameters` are those of the session, as
    // PARAM=VALUE. Throws std::system_error when no thread can be started.
    void record(devices::Device& device,
                const std::vector<std::string>& parameters,
                const std::string& version);

    // Ends the recording. Returns what is missing in it, in one line; nothing when it is whole.
    std::string finish();

    void runStarted(const RunRecord& run) override;

  private:
    const ReportSink _sink;
    recording::RecorderRef _recorder;  // null before record()
};

// What a session that replays a recording takes from it; nothing for another device.
struct RecordedSession {
    std::vector<std::string> names;       // what was run, in this order, without repetitions
    std::vector<std::string> parameters;  // PARAM=VALUE
    std::vector<std::string> warnings;    // what is missing, one line each
};

// Throws a Problem (kExitUsage) when the recording cannot be used.
RecordedSession recordedSession(const DeviceChoice& choice);

// Throws a Problem (kExitUsage) unless `names` are what was run first, in this order: another run would get answers that
// were given to a run before it. Nothing was run on another device.
void requireRecorded(const std::vector<std::string>& names,
                     const RecordedSession& recorded,
                     const DeviceChoice& choice);

// The session's parameters: `given`, and what was recorded for others that the names declare.
std::vector<std::string> withRecorded(const std::vector<std::string>& given,
                                      const RecordedSession& recorded,
                                      const std::vector<std::string>& names);

}  // namespace host

#endif
