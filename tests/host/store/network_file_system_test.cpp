#include "host/store/sqlite/network_file_system.h"

#include <fstream>
#include <sstream>

#include <gtest/gtest.h>

namespace {

constexpr const char* kMounts =
    R"(21 1 0:20 / / rw,relatime shared:1 - fuse.fuse-overlayfs fuse-overlayfs rw
22 21 0:21 / /proc rw - proc proc rw
30 21 8:1 / /data rw shared:7 master:2 - ext4 /dev/sda1 rw
31 30 0:40 / /data/share rw - nfs4 server:/share rw
32 30 0:41 / /data/with\040blank rw - cifs //server/x rw
33 21 0:42 / /mnt rw - ext4 /dev/sdb1 rw
34 33 0:43 / /mnt rw - fuse.sshfs joe@host: rw
35 21 0:44 / /host rw - 9p host rw
)";

TEST(NetworkFileSystem, IsToldByTheDeepestMount) {
    const struct {
        const char* file;
        const char* type;
    } rows[] = {{"/runs.db", ""},
                {"/data/runs.db", ""},
                {"/data/share/a/b.db", "nfs4"},
                {"/data/shared/b.db", ""},
                {"/data/with blank/b", "cifs"},
                {"/mnt/b.db", "fuse.sshfs"},
                {"/host/b.db", "9p"},
                {"/data/x/../share/b.db", "nfs4"}};
    for (const auto& row : rows) {
        std::istringstream mounts(kMounts);
        EXPECT_EQ(host::networkFileSystemOf(row.file, mounts), row.type) << row.file;
    }
    std::istringstream broken("21 1 0:20\n\n - \n");
    EXPECT_EQ(host::networkFileSystemOf("/runs.db", broken), "");
}

}  // namespace
