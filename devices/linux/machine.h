// The files of a machine: how they are found and read.
#ifndef ZR_DEVICES_LINUX_MACHINE_H
#define ZR_DEVICES_LINUX_MACHINE_H

#include <filesystem>
#include <string>
#include <string_view>
#include <utility>
#include <vector>

namespace linux_device {

// Which file: an absolute path whose parts may have wildcards (*, ?, [...]), as the numbers in /sys change from
// start to start.
struct FilePattern {
    std::string path;
    // Files beside it and their content: of the folders that the last part with a wildcard matches, the one meant.
    // {"name", "lm75"} finds the folder of that sensor.
    std::vector<std::pair<std::string, std::string>> where = {};
};

// A value: copy it. Any thread. `root` stands before every path, so that a test can have a machine in a folder.
class Machine {
  public:
    explicit Machine(std::filesystem::path root = "/") : _root(std::move(root)) {}

    // Where a file of the machine is. `path` is absolute.
    std::filesystem::path at(std::string_view path) const;

    // The path of the one file that the pattern means. Throws a SystemProblem that names the pattern: when there is
    // none, more than one, or a folder on the way cannot be read.
    std::string find(const FilePattern& pattern) const;

    // All of them, by name, numbers by value. Throws a SystemProblem about a folder that cannot be read.
    std::vector<std::string> findAll(const FilePattern& pattern) const;

    // The content, of at most 1 MiB. Throws a SystemProblem that names the file.
    std::string read(std::string_view path) const;

    // The same without white space at its end.
    std::string readLine(std::string_view path) const;

    // That; empty when it cannot be read.
    std::string line(std::string_view path) const;

    // The names in a folder, sorted, numbers by value; none when it cannot be read.
    std::vector<std::string> names(std::string_view folder) const;

    // What a symbolic link leads to, as an absolute path of the machine without links; empty when there is none.
    std::string target(std::string_view path) const;

  private:
    std::filesystem::path _root;
};

}  // namespace linux_device

#endif
