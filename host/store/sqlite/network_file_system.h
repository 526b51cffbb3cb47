// Which files are on a network file system.
#ifndef ZR_HOST_STORE_SQLITE_NETWORK_FILE_SYSTEM_H
#define ZR_HOST_STORE_SQLITE_NETWORK_FILE_SYSTEM_H

#include <filesystem>
#include <istream>
#include <string>

namespace host {

// The type of the network file system that the file is or would be on, such as "nfs4" or "fuse.sshfs"; empty
// when it is on a local one or that cannot be told. `mounts` has the lines of /proc/self/mountinfo, see proc(5).
// The write-ahead log of a database needs shared memory, which does not work there.
std::string networkFileSystemOf(const std::filesystem::path& file, std::istream& mounts);

}  // namespace host

#endif
