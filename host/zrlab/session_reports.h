// SessionReports: every report that a session was asked for, and where each goes.
#ifndef ZR_HOST_ZRLAB_SESSION_REPORTS_H
#define ZR_HOST_ZRLAB_SESSION_REPORTS_H

#include <atomic>
#include <functional>
#include <memory>
#include <string>
#include <string_view>
#include <vector>

#include "host/record/run_listener.h"
#include "host/report/report_form.h"
#include "host/zrlab/output_file.h"
#include "host/zrlab/recording_session.h"
#include "host/zrlab/session_options.h"

namespace host {

// One report goes to standard output, or to the file that --output names; a further one to each file that
// --report names, a table of numbers to those of --frames and --images, and a recording of the device to that of
// --record.
//
// Owner    The session, and the log's sink: a time-out that outlives its run may log when the session is
//          gone.
// Threads  The session's; what the listeners are called on, run_listener.h says.
class SessionReports {
  public:
    // Checks that every report can be written. `session` is what the names of files are made from: its
    // identity, planned names and start. Throws a Problem: kExitUsage about a file's name or ending, a file
    // that is used twice or for the device, or one that cannot be written.
    SessionReports(const SessionOptions& options, const SessionRecord& session);

    SessionReports(const SessionReports&) = delete;
    SessionReports& operator=(const SessionReports&) = delete;

    // The reports, in the order in which they were asked for.
    const std::vector<std::shared_ptr<RunListener>>& listeners() const { return _listeners; }

    // Whether one of them shows frames as they come, whether one needs all of their metadata and the events,
    // and whether one needs the frames of a whole run.
    bool followFrames() const { return _followFrames; }
    bool needsDetails() const { return _needsDetails; }
    bool keepFrames() const { return _keepFrames; }

    // The recording of the device; null when there is none.
    const std::shared_ptr<SessionRecorder>& recorder() const { return _recorder; }

    // Whether standard output takes no more: its reader has gone.
    bool outputFailed() const { return _outputFailed; }

    // Once the session has ended: puts the files in their places. Whatever cannot be written is reported
    // in one line on standard error, and the others are written all the same. False when anything failed,
    // standard output included.
    bool finish();

  private:
    struct File {
        std::string path;
        bool streams;  // as a form of report does
        std::function<std::shared_ptr<RunListener>(ReportSink sink)> open;
        std::shared_ptr<OutputFile> content = nullptr;
    };

    void _noteFrames(const ReportForm& form);
    void _addFile(const std::string& path, const ReportForm& form, bool verbose);
    void _addTables(const SessionOptions& options, const SessionRecord& session);
    // `inputs` are files that the session reads.
    void _refuseClashes(const std::vector<std::string>& inputs) const;

    std::vector<File> _files;
    std::vector<std::shared_ptr<RunListener>> _listeners;
    std::shared_ptr<SessionRecorder> _recorder;  // one of the listeners
    bool _followFrames = false;
    bool _needsDetails = false;
    bool _keepFrames = false;
    // Set by the thread that makes a line, read by the session's.
    std::atomic<bool> _outputFailed{false};
};

}  // namespace host

#endif
