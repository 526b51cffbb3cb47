#include "host/store/sqlite/network_file_system.h"

#include <algorithm>
#include <iterator>
#include <sstream>
#include <string_view>
#include <system_error>

namespace host {

namespace {

// As mountinfo has them. FUSE has local ones too, such as that of a container's root: only those that are
// known to be of a network are named.
constexpr std::string_view kNetworkTypes[] = {"nfs",
                                              "nfs4",
                                              "smb3",
                                              "cifs",
                                              "smbfs",
                                              "9p",
                                              "ceph",
                                              "afs",
                                              "coda",
                                              "ocfs2",
                                              "gfs2",
                                              "lustre",
                                              "ncpfs",
                                              "glusterfs",
                                              "beegfs",
                                              "vboxsf",
                                              "virtiofs",
                                              "fuse.sshfs",
                                              "fuse.s3fs",
                                              "fuse.rclone",
                                              "fuse.ceph",
                                              "fuse.ceph-fuse",
                                              "fuse.smbnetfs",
                                              "fuse.curlftpfs",
                                              "fuse.davfs",
                                              "fuse.davfs2",
                                              "fuse.glusterfs",
                                              "fuse.gcsfuse",
                                              "fuse.vmhgfs-fuse",
                                              "vmhgfs",
                                              "fuse.lizardfs",
                                              "fuse.mfs",
                                              "fuse.moosefs"};

// Blanks and backslashes are in octal there: "\\040".
std::string unescaped(std::string_view text) {
    std::string result;
    for (std::size_t at = 0; at < text.size(); ++at) {
        if (text[at] == '\\' && text.size() - at > 3) {
            const auto digit = [&](std::size_t of) { return text[at + of] - '0'; };
            result += static_cast<char>(digit(1) * 64 + digit(2) * 8 + digit(3));
            at += 3;
        } else {
            result += text[at];
        }
    }
    return result;
}

// Whether `path` is the folder or in it.
bool isIn(const std::filesystem::path& path, const std::filesystem::path& folder) {
    return std::mismatch(folder.begin(), folder.end(), path.begin(), path.end()).first ==
           folder.end();
}

}  // namespace

std::string networkFileSystemOf(const std::filesystem::path& file, std::istream& mounts) {
    std::error_code failure;
    const std::filesystem::path real = std::filesystem::weakly_canonical(file, failure);
    // The deepest mount that the file is in; of several at one place the last.
    std::filesystem::path place;
    std::string type;
    for (std::string line; std::getline(mounts, line);) {
        std::istringstream words(line);
        std::string word;
        for (int at = 0; at < 5; ++at) {
            words >> word;
        }
        const std::filesystem::path mounted = unescaped(word);
        while (words >> word && word != "-") {
        }
        if (words >> word && mounted.native().size() >= place.native().size() &&
            isIn(real, mounted)) {
            place = mounted;
            type = word;
        }
    }
    const bool isNetwork = std::find(std::begin(kNetworkTypes), std::end(kNetworkTypes), type) !=
                           std::end(kNetworkTypes);
    return isNetwork ? type : std::string();
}

}  // namespace host
