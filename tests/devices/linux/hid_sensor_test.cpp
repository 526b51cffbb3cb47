#include "devices/linux/hid_sensor.h"

#include <cerrno>

#include <fcntl.h>
#include <sys/stat.h>

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "devices/linux/file_descriptor.h"
#include "tests/devices/linux/machine_in_folder.h"
#include "tests/support/eventually.h"
#include "tests/support/is_error.h"

using linux_device::HidDescription;
using linux_device::parseReportDescriptor;
using platform::Dictionary;
using platform::RunLoop;
using testing::ElementsAre;

namespace {

// One input report with ID 0x76, two feature reports.
const std::vector<std::uint8_t> kSensor = {0x06, 0x00, 0xFF, 0x09, 0x24, 0xA1, 0x01, 0x85,
                                           0x76, 0x95, 0x10, 0x09, 0x24, 0x81, 0x02, 0xC0};

TEST(ReportDescriptor, HasAPrimaryUsage) {
    const struct {
        const char* what;
        std::vector<std::uint8_t> bytes;
        std::uint32_t page;
        std::uint32_t usage;
        bool hasReportIds;
    } cases[] = {
        {"the sensor", kSensor, 0xFF00, 0x24, true},
        {"a usage with its page", {0x0B, 0x24, 0, 0, 0xFF, 0xA1, 1}, 0xFF00, 0x24, false},
        {"the first of two usages", {0x05, 1, 0x09, 2, 0x09, 6, 0xA1, 1}, 1, 2, false},
        {"the page at the collection", {0x05, 1, 0x09, 2, 0x05, 12, 0xA1, 1}, 12, 2, false},
        {"a page that was put aside",
         {0x05, 1, 0xA4, 0x05, 2, 0xB4, 0x09, 3, 0xA1, 1},
         1,
         3,
         false},
        {"a logical collection before it",
         {0x05, 1, 0x09, 7, 0xA1, 2, 0x09, 3, 0xA1, 1},
         1,
         3,
         false},
        {"the first of two applications",
         {0x05, 1, 0x09, 2, 0xA1, 1, 0xC0, 0x09, 6, 0xA1, 1},
         1,
         2,
         false},
        {"a long item", {0xFE, 2, 0, 0x09, 0x09, 0x05, 1, 0x09, 2, 0xA1, 1}, 1, 2, false},
        {"an item that is cut off", {0x05, 1, 0x09, 2, 0xA3, 1}, 0, 0, false},
        {"a long item that is cut off", {0xFE}, 0, 0, false},
        {"nothing", {}, 0, 0, false},
    };
    for (const auto& each : cases) {
        const auto descriptor = parseReportDescriptor(each.bytes);
        EXPECT_EQ(descriptor.primaryUsagePage, each.page) << each.what;
        EXPECT_EQ(descriptor.primaryUsage, each.usage) << each.what;
        EXPECT_EQ(descriptor.hasReportIds, each.hasReportIds) << each.what;
    }
}

// A node is a named pipe that keeps writes apart.
class HidSensor : public testing::Test {
  protected:
    void plug(const std::string& name,
              const std::string& uevent,
              const std::vector<std::uint8_t>& descriptor = kSensor) {
        const std::string device = "/sys/class/hidraw/" + name + "/device";
        _files.write(device + "/uevent", uevent);
        _files.write(device + "/report_descriptor",
                     std::string(descriptor.begin(), descriptor.end()));
        _files.write("/dev/keep", "");
        const std::string node = _files.machine().at("/dev/" + name);
        ASSERT_EQ(mkfifo(node.c_str(), 0600), 0);
        _writer = linux_device::FileDescriptor(::open(node.c_str(), O_RDWR | O_CLOEXEC));
        ASSERT_EQ(fcntl(_writer.number(), F_SETFL, O_DIRECT), 0);
    }
    void send(const std::string& report) const {
        EXPECT_EQ(::write(_writer.number(), report.data(), report.size()),
                  static_cast<ssize_t>(report.size()));
    }
    std::vector<std::shared_ptr<WLIOHIDDeviceInterface>> find(
        const std::vector<HidDescription>& described,
        const std::vector<Dictionary>& matching = {{}}) {
        const auto manager = makeHidFacility(described, _files.machine())->createManager();
        manager->enumerateDevicesMatching(matching);
        return manager->devices();
    }

    const test::MachineInFolder _files;
    linux_device::FileDescriptor _writer;
    const std::shared_ptr<RunLoop> _runLoop = RunLoop::forThisThread();
};

TEST_F(HidSensor, IsFoundByItsUsageAndItsIdentity) {
    plug("hidraw2", "HID_ID=0003:00001234:00005678\nHID_UNIQ=SN-2\n");
    plug("hidraw10", "HID_ID=0005:00001234:00005679\n", {0x05, 1, 0x09, 2, 0xA1, 1});
    const Dictionary sensor{{platform::kHidPrimaryUsagePage, 0xFF00},
                            {platform::kHidPrimaryUsage, 0x24}};
    const Dictionary mouse{{platform::kHidPrimaryUsage, 2}};
    const struct {
        std::vector<HidDescription> described;
        std::vector<Dictionary> matching;
        std::size_t found;
    } cases[] = {
        {{}, {sensor}, 1},
        {{}, {sensor, mouse}, 2},
        {{}, {sensor, Dictionary{{platform::kHidPrimaryUsagePage, 0xFF00}}}, 1},
        {{}, {Dictionary{{"Transport", "USB"}}}, 0},
        {{{.name = "A", .bus = 3}}, {sensor, mouse}, 1},
        {{{.name = "A", .identity = {.vendor = 0x1234}}}, {sensor, mouse}, 2},
        {{{.name = "A", .identity = {.product = 0x5678, .serial = "SN-2"}}}, {sensor}, 1},
        {{{.name = "A", .identity = {.serial = "SN-3"}}}, {sensor}, 0},
    };
    for (const auto& each : cases) {
        EXPECT_EQ(find(each.described, each.matching).size(), each.found) << &each - &cases[0];
    }
}

TEST_F(HidSensor, DeliversOneReportPerTurn) {
    plug("hidraw0", "HID_ID=0003:00001234:00005678\n");
    const auto sensor = find({}).front();
    platform::ErrorRef error;
    ASSERT_TRUE(sensor->open(&error));
    EXPECT_FALSE(sensor->open(&error));
    EXPECT_THAT(error, test::IsPlainError("linux", EBUSY, "/dev/hidraw0: open already"));
    const std::byte data[] = {std::byte{171}, std::byte{1}};
    EXPECT_FALSE(sensor->setFeatureReportWithID(171, data, &error));
    EXPECT_THAT(error, test::IsPlainError("linux", ENOTTY,
                                          "/dev/hidraw0: feature report 171: Inappropriate ioctl "
                                          "for device (ENOTTY)"));
    EXPECT_FALSE(sensor->setFeatureReportWithID(172, data, &error));
    EXPECT_EQ(error->code(), EINVAL);

    std::vector<std::string> reports;
    sensor->setInputReportCallback(
        [&](std::int64_t id, std::span<const std::byte> report, const platform::ErrorRef&) {
            reports.push_back(std::to_string(id) + ":" + std::to_string(report.size()));
            _runLoop->stop();
        });
    send("vfirst");
    send("vsecond one");
    sensor->scheduleWithRunLoop(_runLoop, platform::kRunLoopDefaultMode);
    for (int turn = 0; turn < 2; ++turn) {
        EXPECT_EQ(_runLoop->run(platform::kRunLoopDefaultMode, test::kGenerous.count()),
                  platform::RunLoopOutcome::Stopped);
    }
    EXPECT_THAT(reports, ElementsAre("118:6", "118:11"));
    EXPECT_TRUE(sensor->close(&error));
    EXPECT_FALSE(_runLoop->hasSources(platform::kRunLoopDefaultMode));
    EXPECT_FALSE(sensor->close(&error));
    EXPECT_THAT(error, test::IsPlainError("linux", EBADF, "/dev/hidraw0: not open"));
}

TEST_F(HidSensor, PutsAnIdBeforeReportsThatHaveNone) {
    plug("hidraw0", "HID_ID=0003:00001234:00005678\n", {0x05, 1, 0x09, 2, 0xA1, 1, 0xC0});
    const auto sensor = find({}).front();
    ASSERT_TRUE(sensor->open(nullptr));
    std::vector<std::byte> got;
    sensor->setInputReportCallback(
        [&](std::int64_t id, std::span<const std::byte> report, const platform::ErrorRef&) {
            EXPECT_EQ(id, 0);
            got.assign(report.begin(), report.end());
            _runLoop->stop();
        });
    sensor->scheduleWithRunLoop(_runLoop, platform::kRunLoopDefaultMode);
    send("\x05");
    _runLoop->run(platform::kRunLoopDefaultMode, test::kGenerous.count());
    EXPECT_THAT(got, ElementsAre(std::byte{0}, std::byte{5}));
}

TEST_F(HidSensor, MayDieInsideItsCallback) {
    plug("hidraw0", "HID_ID=0003:00001234:00005678\n");
    for (int round = 0; round < 20; ++round) {
        auto sensor = find({}).front();
        ASSERT_TRUE(sensor->open(nullptr));
        const std::weak_ptr<WLIOHIDDeviceInterface> weak = sensor;
        sensor->setInputReportCallback(
            [&](std::int64_t, std::span<const std::byte>, const platform::ErrorRef&) {
                sensor.reset();
                _runLoop->stop();
            });
        sensor->scheduleWithRunLoop(_runLoop, platform::kRunLoopDefaultMode);
        send("v");
        send("v");
        _runLoop->run(platform::kRunLoopDefaultMode, test::kGenerous.count());
        EXPECT_TRUE(test::eventually([&] { return weak.expired(); }));
        EXPECT_FALSE(_runLoop->hasSources(platform::kRunLoopDefaultMode));
    }
}

}  // namespace
