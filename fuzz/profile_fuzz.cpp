// Whatever a profile's file holds: it gives a device, or lines that each name the file and show no control
// character. A device that is written as a profile and read again is the same.
//
// Input: the file.
#include <algorithm>
#include <cctype>
#include <cstdlib>
#include <filesystem>
#include <fstream>

#include "devices/simulator/profile/reader.h"
#include "devices/simulator/profile/writer.h"
#include "fuzz/expect.h"
#include "fuzz/input.h"

namespace {

using fuzz::expect;
namespace fs = std::filesystem;

// In a folder of its own, so that a profile which extends a file finds none.
const std::string& profileFile() {
    static const std::string file = [] {
        std::string folder = (fs::temp_directory_path() / "profile_fuzz.XXXXXX").string();
        expect(mkdtemp(folder.data()) != nullptr, "a folder");
        static const std::string toRemove = folder;
        std::atexit([] { fs::remove_all(toRemove); });
        return folder + "/device.json";
    }();
    return file;
}

std::optional<simulator::DeviceProfile> load(std::string_view text,
                                             std::vector<std::string>& problems) {
    std::ofstream(profileFile(), std::ios::binary) << text;
    return simulator::loadProfile(profileFile(), problems);
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
    std::vector<std::string> problems;
    const auto device = load(fuzz::Input(data, size).rest(), problems);
    expect(device.has_value() == problems.empty(), "a device or problems");
    for (const std::string& problem : problems) {
        expect(problem.starts_with(profileFile() + ": ") || problem.find(": ") != std::string::npos,
               "the culprit");
        expect(std::none_of(problem.begin(), problem.end(),
                            [](unsigned char c) { return std::iscntrl(c) != 0; }),
               "one line");
    }
    if (device.has_value()) {
        const std::string written = simulator::profileText(*device);
        const auto again = load(written, problems);
        expect(again.has_value() && simulator::profileText(*again) == written, "the same device");
        expect(again->summary == device->summary, "the same summary");
    }
    return 0;
}
