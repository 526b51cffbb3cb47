#include "host/zrlab/device_command.h"

#include <cstdlib>
#include <filesystem>
#include <fstream>
#include <stdexcept>
#include <string>
#include <vector>

#include <gtest/gtest.h>

#include "devices/device.h"
#include "host/record/problem.h"
#include "host/zrlab/device_choice.h"

namespace {

namespace fs = std::filesystem;

struct Row {
    std::string action;
    std::vector<std::string> devices;
    int status;
    std::string text;  // what is printed or what the problem says
};

std::string showBoard(const std::string& what) {
    if (what == "broken") {
        throw std::runtime_error("board: it does not answer");
    }
    return "board " + what + "\n";
}

// Once for the process, as the program does.
void registerKinds() {
    host::registerBuiltInKinds();
    const auto open = [](const devices::Request& /*request*/) { return devices::Device(); };
    devices::registerKind({.name = "board", .summary = "Shows", .open = open, .show = showBoard});
    devices::registerKind({.name = "plain", .summary = "Only opens", .open = open});
}

TEST(DeviceCommand, ShowsAndChecksWhatTheKindCanShowAndCheck) {
    registerKinds();
    std::string folder = (fs::temp_directory_path() / "zrlab-device-XXXXXX").string();
    ASSERT_NE(mkdtemp(folder.data()), nullptr);
    const std::string good = folder + "/good.json";
    const std::string bad = folder + "/bad.json";
    std::ofstream(good) << R"({"extends": "module-hot"})";
    std::ofstream(bad) << R"({"hid": {"manger": 1}, "display": {"powerInfo": 0}})";
    const Row rows[] = {
        {"show", {"board:rev-a"}, 0, "board rev-a\n"},
        {"show", {"board:broken"}, 2, "board: it does not answer"},
        {"show", {"plain:x"}, 64, "plain:x: devices of the kind \"plain\" cannot be shown"},
        {"check",
         {"board:rev-a"},
         64,
         "board:rev-a: devices of the kind \"board\" cannot be checked"},
        {"show", {"helthy"}, 64, "unknown device \"helthy\"; did you mean healthy?"},
        {"show", {"xyzzy"}, 64, "unknown device \"xyzzy\"; zrlab devices lists them"},
        {"show", {"bord:x"}, 64, "bord:x: unknown kind of device \"bord\"; did you mean board?"},
        {"show", {"healthy", "i2c-errors"}, 64, "device: show takes one device"},
        {"check",
         {bad, good, "simulator:healthy"},
         64,
         bad + ": /hid/manger: unknown key; did you mean manager?\n" + bad +
             ": /display/powerInfo: neither true nor false\n" + good +
             ": valid\nsimulator:healthy: valid\n"},
        {"check", {good}, 0, good + ": valid\n"},
    };
    for (const Row& row : rows) {
        try {
            const auto [text, status] = host::deviceCommand(row.action, row.devices);
            EXPECT_EQ(text, row.text);
            EXPECT_EQ(status, row.status) << row.text;
        } catch (const host::Problem& problem) {
            EXPECT_EQ(problem.what(), row.text);
            EXPECT_EQ(problem.status(), row.status) << row.text;
        }
    }
    fs::remove_all(folder);
}

}  // namespace
