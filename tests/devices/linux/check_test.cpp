#include "devices/linux/check.h"

#include <string>
#include <vector>

#include <gtest/gtest.h>

#include "tests/devices/linux/machine_in_folder.h"

namespace {

// What is not there says why, and what there is instead; a panel without power is there all the same.
TEST(Check, SaysWhatTheMachineLacksAndWhatItHasInstead) {
    const test::MachineInFolder files;
    files.write("/run/events", "watchdog 3\n");
    files.write("/sys/class/video4linux/video0/name", "Other camera\n");
    files.write("/sys/class/video4linux/video0/index", "1\n");
    files.link("/sys/class/video4linux/video0/device", "/sys/devices/usb1/1-1:1.0");
    files.link("/sys/devices/usb1/1-1:1.0/driver", "/sys/bus/usb/drivers/uvcvideo");
    files.write("/sys/devices/usb1/idVendor", "0abc\n");
    files.write("/sys/devices/usb1/idProduct", "00f1\n");
    files.write("/sys/class/hidraw/hidraw0/device/uevent",
                "HID_ID=0003:0000ABCD:0000EF01\nHID_NAME=Other sensor\nHID_UNIQ=SN-7\n");
    files.write("/sys/class/hidraw/hidraw0/device/report_descriptor", "");
    files.write("/sys/class/drm/card0-DSI-1/status", "connected\n");
    files.write("/sys/class/drm/card0-DSI-1/dpms", "Off\n");

    files.write("/station.json", R"({
        "capture": {"streams": {"infrared": {
            "portType": "front-infrared", "video": {"driver": "uvcvideo", "name": "Camera"},
            "errorCounters": {"sif": {"errorBuffers": true}, "uart": {"file": "/run/events", "field": 2}}}}},
        "counters": {"channels": {
            "A": {"group": "G", "subgroup": "S", "file": "/run/events", "field": 2},
            "B": {"group": "G", "subgroup": "S", "file": "/run/none"},
            "C": {"group": "G", "subgroup": "S", "constant": 8}}},
        "hid": {"devices": {"sensor": {"vendor": "0x1234"}}},
        "display": {"connector": "card*-DSI-1", "on": {"status": "connected", "dpms": "On"}}})");
    std::vector<std::string> problems;
    const auto described =
        linux_device::readDescription(files.machine().at("/station.json").string(), problems);
    ASSERT_EQ(problems, std::vector<std::string>());
    const devices::Findings findings = checkMachine(described.value(), files.machine());

    // The lines about the camera's metadata are all alike.
    std::vector<std::string> lines;
    for (const std::string& line : findings.lines) {
        const std::size_t owner = line.find(" (");
        if (line.find("  metadata/") == std::string::npos) {
            lines.push_back(line.starts_with("  ok") ? line.substr(0, owner) : line);
        }
    }
    const std::vector<std::string> expected = {
        "capture/streams/infrared",
        "  missing   video                                  no camera matches \"video\" of the "
        "stream "
        "infrared",
        "  ok        errorCounters/sif                      counted while streaming",
        "  ok        errorCounters/uart                     3  /run/events",
        "  constant  errorCounters/i2c                      0",
        "  constant  errorCounters/mipi                     0",
        "  constant  errorCounters/lpdp                     0",
        "  constant  errorCounters/projector                0",
        "counters/channels",
        "  ok        A  3  /run/events",
        "  missing   B  /run/none: No such file or directory (ENOENT)",
        "  constant  C  8",
        "hid/devices",
        "  missing   sensor  no node in /sys/class/hidraw matches",
        "display",
        "  ok        connector  /sys/class/drm/card0-DSI-1",
        "  ok        on/dpms    Off  the panel has no power: not \"On\"",
        "  ok        on/status  connected",
        "/dev/video0 is {\"driver\": \"uvcvideo\", \"name\": \"Other camera\", \"index\": 1, "
        "\"vendor\": \"0x0abc\", \"product\": \"0x00f1\"}",
        "/dev/hidraw0 is {\"vendor\": \"0xabcd\", \"product\": \"0xef01\", \"serial\": \"SN-7\"}: "
        "Other sensor",
        "31 described, 6 found, 5 constant, 20 missing"};
    EXPECT_EQ(lines, expected);
    EXPECT_EQ(findings.missing, 20U);
}

}  // namespace
