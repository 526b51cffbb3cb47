// StoreListener: puts the runs of a session into a store as they end, and into a spool when it cannot.
#ifndef ZR_HOST_STORE_STORE_LISTENER_H
#define ZR_HOST_STORE_STORE_LISTENER_H

#include <chrono>
#include <filesystem>
#include <functional>
#include <string>

#include "host/record/run_listener.h"
#include "host/store/spool.h"
#include "host/store/store.h"

namespace host {

struct StoreOptions {
    std::string where;  // see Store
    std::filesystem::path spoolFolder = defaultSpoolFolder(where);
    Attachments attachments = {};
    // How long a session waits for a store that does not work, over all its runs. Then it spools.
    std::chrono::milliseconds patience{2000};
    // For how long a run that ended may bring others with it, out of the spool.
    std::chrono::milliseconds deliveryTime{1000};
};

// A listener of a session. Nothing that a store does changes a run or its verdict, and nothing is thrown once
// the session has started.
//
// A run is written when it ends; then runs that wait in the spool are delivered, for at most the delivery
// time. A run that the store does not take goes to the spool. A store that failed is tried again with the next run, until
// the waiting for it has used up the session's patience.
class StoreListener : public RunListener {
  public:
    // Says something to the user, in one line: once in a session that the store does not take runs, and for each
    // run that could not be kept at all or was set aside in the spool.
    using Complain = std::function<void(const std::string& line)>;

    // Throws a Problem as Store does. Does not connect.
    StoreListener(const StoreOptions& options, Complain complain);

    void sessionStarted(const SessionRecord& session) override { _session = &session; }
    void runEnded(const RunRecord& run) override;

  private:
    bool _write(const RunRecord& run);
    void _keep(const RunRecord& run);
    void _deliver();
    void _complainOnce(const std::string& line);

    Store _store;
    const Spool _spool;
    const Attachments _attachments;
    const std::chrono::milliseconds _deliveryTime;
    const Complain _complain;
    const SessionRecord* _session = nullptr;  // the caller's
    std::chrono::milliseconds _patience;      // what is left of it
    bool _isTold = false;
};

}  // namespace host

#endif
