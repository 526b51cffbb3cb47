// Spool: runs that wait in a folder until their store takes them, one file for each.
#ifndef ZR_HOST_STORE_SPOOL_H
#define ZR_HOST_STORE_SPOOL_H

#include <chrono>
#include <cstddef>
#include <filesystem>
#include <optional>
#include <string>
#include <utility>
#include <vector>

#include "host/record/run_record.h"
#include "host/store/store.h"

namespace host {

// Any number of processes may add to a folder and deliver from it at once: an entry is named by its run's uuid,
// and a store takes a run once. One thread at a time uses an object.
//
// The folder holds:
//   UUID.json            an entry: a run that waits
//   UUID.json.part       an entry that is being written, or whose writer died; a delivery takes up the latter
//   UUID.json.damaged    what could not be read as a run
//   UUID.json.refused    a run that its store does not take
// The last two are kept for people and never looked at again.
class Spool {
  public:
    // The folder is made when the first run comes.
    explicit Spool(std::filesystem::path folder) : _folder(std::move(folder)) {}

    const std::filesystem::path& folder() const { return _folder; }

    // Puts the run into the folder: it is on the disk, whole, when this returns. Throws a std::exception with
    // one line that names the file, or the run when its uuid is none.
    void add(const SessionRecord& session, const RunRecord& run, Attachments attachments) const;

    struct Delivery {
        std::size_t delivered = 0;          // written to the store
        std::size_t waiting = 0;            // still in the folder
        std::vector<std::string> setAside;  // one line for each file that was set aside
        std::optional<std::string>
            problem;  // why it stopped, in one line that names the store or the file
    };

    // Writes the runs in the folder to the store, the oldest first, until it is empty, something fails or the
    // time is over. An entry is removed when the store has it durably; only one that cannot be read as a run,
    // or that the store refuses for what is in it, is set aside. Never throws for a store or a file.
    Delivery deliver(Store& store,
                     std::chrono::milliseconds atMost = std::chrono::milliseconds::max()) const;

    // How many entries wait. Throws a std::filesystem::filesystem_error when the folder cannot be read.
    std::size_t waiting() const;

  private:
    void _deliver(Store& store, std::chrono::milliseconds atMost, Delivery& result) const;

    std::filesystem::path _folder;
};

// Where runs wait for the store at `where`: a folder of its own for each store below $XDG_STATE_HOME/zrlab/spool, or $HOME/.local/state/zrlab/spool.
std::filesystem::path defaultSpoolFolder(const std::string& where);

}  // namespace host

#endif
