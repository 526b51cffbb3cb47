// A machine whose files are in a folder of the test.
#ifndef ZR_TESTS_DEVICES_LINUX_MACHINE_IN_FOLDER_H
#define ZR_TESTS_DEVICES_LINUX_MACHINE_IN_FOLDER_H

#include <filesystem>
#include <fstream>
#include <string>
#include <string_view>

#include "devices/linux/machine.h"

namespace test {

class MachineInFolder {
  public:
    MachineInFolder() {
        std::string name = (std::filesystem::temp_directory_path() / "zr-machine-XXXXXX").string();
        _folder = mkdtemp(name.data());
    }
    ~MachineInFolder() { std::filesystem::remove_all(_folder); }
    MachineInFolder(const MachineInFolder&) = delete;
    MachineInFolder& operator=(const MachineInFolder&) = delete;

    void write(std::string_view path, std::string_view content) const {
        const std::filesystem::path file = machine().at(path);
        std::filesystem::create_directories(file.parent_path());
        std::ofstream(file, std::ios::binary) << content;
    }
    void link(std::string_view path, std::string_view target) const {
        const std::filesystem::path file = machine().at(path);
        std::filesystem::create_directories(file.parent_path());
        std::filesystem::create_directories(machine().at(target));
        std::filesystem::create_symlink(machine().at(target), file);
    }
    void remove(std::string_view path) const { std::filesystem::remove_all(machine().at(path)); }

    linux_device::Machine machine() const { return linux_device::Machine(_folder); }

  private:
    std::filesystem::path _folder;
};

}  // namespace test

#endif
