// RunListener: follows what a session does, as it happens. Reports are listeners.
#ifndef ZR_HOST_RECORD_RUN_LISTENER_H
#define ZR_HOST_RECORD_RUN_LISTENER_H

#include "host/record/run_record.h"

namespace host {

// Called by one thread at a time: the session's, or the run's own between runStarted() and runEnded(). Except
// logged(), which any thread may call, several at once, also after sessionEnded(): a time-out may outlive its
// run, and its line is then marked as late. And except framesDelivered(), which comes on a thread of its own
// before the experiment's partEnded(), or before runEnded() when the part does not end. A record holds
// everything known so far.
class RunListener {
  public:
    virtual ~RunListener() = default;

    virtual void sessionStarted(const SessionRecord& /*session*/) {}
    virtual void runStarted(const RunRecord& /*run*/) {}
    // A part begins: its name, summary and parameters are known.
    virtual void partStarted(const RunRecord& /*run*/, Part /*part*/) {}
    virtual void logged(const LogRecord& /*line*/) {}
    // The next frames and events of the run. Called when a listener follows them.
    virtual void framesDelivered(const FrameBatch& /*batch*/) {}
    // A part has ended: its measurements or results, and its failures, are in the record.
    virtual void partEnded(const RunRecord& /*run*/, Part /*part*/) {}
    // The verdict is known.
    virtual void runEnded(const RunRecord& /*run*/) {}
    // A name that was asked for is done, with all its repetitions: its record, and its figures when it
    // was repeated, are the last of the session's.
    virtual void nameEnded(const SessionRecord& /*session*/) {}
    virtual void sessionEnded(const SessionRecord& /*session*/) {}
};

}  // namespace host

#endif
