// Whatever a profile's file holds: it gives a device, or lines that each name the file and show no
// control character. A device that is written as a profile has all that the file says, and is the same when
// it is read again.
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
#include "input/json_reader.h"

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

// "7-7" as "7" and "07-" as "7-": a range has more than one form.
std::string rangeText(const std::string& text) {
    if (text.empty() || text.find_first_not_of("-0123456789") != std::string::npos) {
        return text;
    }
    const std::string first = text.substr(0, text.find('-'));
    const std::string last = text.substr(std::min(first.size() + 1, text.size()));
    const auto number = [](const std::string& digits) {
        return std::strtoull(digits.c_str(), nullptr, 10);
    };
    const std::uint64_t end = first == text  ? number(first)
                              : last.empty() ? UINT64_MAX
                                             : number(last);
    return std::to_string(number(first)) + "-" + std::to_string(end);
}

// Every value of the file is in what was written, where it was; null takes away or stands for
// nothing.
void expectIn(const input::Json& written, const input::Json& given) {
    if (given.is_object()) {
        for (const auto& [key, value] : given.items()) {
            if (key == "extends" || key == "$schema") {
                continue;
            }
            const input::Json* const place = written.contains(key) ? &written[key] : nullptr;
            if (value.is_null()) {
                expect(place == nullptr || place->is_null() || *place == false, "null is nothing");
            } else {
                expect(place != nullptr, "the key is written");
                expectIn(*place, value);
            }
        }
    } else if (given.is_array()) {
        expect(written.is_array() && written.size() == given.size(), "the list is written");
        for (std::size_t at = 0; at < given.size(); ++at) {
            expectIn(written[at], given[at]);
        }
    } else if (given.is_string()) {
        expect(written.is_string() &&
                   rangeText(written.get<std::string>()) == rangeText(given.get<std::string>()),
               "the text is written");
    } else if (!given.is_null()) {
        expect(written == given, "the value is written");
    }
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
    std::vector<std::string> problems;
    const std::string_view text = fuzz::Input(data, size).rest();
    const auto device = load(text, problems);
    expect(device.has_value() == problems.empty(), "a device or problems");
    for (const std::string& problem : problems) {
        expect(problem.starts_with(profileFile() + ": "), "the culprit");
        expect(std::none_of(problem.begin(), problem.end(),
                            [](unsigned char c) { return std::iscntrl(c) != 0; }),
               "one line");
    }
    if (device.has_value()) {
        const std::string written = simulator::profileText(*device);
        const auto again = load(written, problems);
        expect(again.has_value() && simulator::profileText(*again) == written, "the same device");
        expectIn(input::parseJson(written), input::parseJson(std::string(text)));
        expect(again->summary == device->summary, "the same summary");
    }
    return 0;
}
