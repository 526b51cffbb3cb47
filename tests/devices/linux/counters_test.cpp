#include "devices/linux/counters.h"

#include <cerrno>

#include <gtest/gtest.h>

#include "devices/linux/system_problem.h"
#include "tests/devices/linux/machine_in_folder.h"
#include "tests/support/is_error.h"

using linux_device::Constant;
using linux_device::CounterChannel;
using linux_device::FieldRange;
using linux_device::FileNumber;
using linux_device::Restarts;
using linux_device::StreamStarts;
using linux_device::SystemProblem;
using platform::Number;

namespace {

FileNumber number(const std::string& match, std::optional<FieldRange> field = {}) {
    FileNumber wanted{.file = {"/file"}, .matchText = match, .field = field};
    if (!match.empty()) {
        wanted.match.emplace(match);
    }
    return wanted;
}

std::string textIn(const std::string& file, const FileNumber& wanted) {
    try {
        return numberIn(file, wanted, "/file").text();
    } catch (const SystemProblem& problem) {
        return problem.what();
    }
}

TEST(FileNumber, IsWhereItIsDescribed) {
    const std::string udp = "Udp: InDatagrams NoPorts\nUdp: 12 7\n";
    const std::string interrupts = "      CPU0 CPU1\n 16:  12  30  IO-APIC  xhci_hcd\n";
    const struct {
        std::string file;
        FileNumber wanted;
        std::string result;
    } cases[] = {
        {"42\n", number(""), "42"},
        {" -3 kB\n", number(""), "-3"},
        {"0x1F", number(""), "31"},
        {"18446744073709551615", number(""), "18446744073709551615"},
        {"25.5", number(""), "25.5"},
        {"", number(""), "/file: the line has 0 fields, field 1 is asked for"},
        {"42x", number(""), "/file: \"42x\" is not a number"},
        {udp, number(R"(^Udp: \d+ (\d+))"), "7"},
        {udp, number(R"(^Udp: \d)", FieldRange{2, 2}), "12"},
        {udp, number(R"(^Udp: \d)", FieldRange{4, 4}),
         "/file: the line has 3 fields, field 4 is asked for"},
        {udp, number("(Tcp)"), "/file: no line matches \"(Tcp)\""},
        {udp, number("(InDatagrams)"), "/file: \"InDatagrams\" is not a number"},
        {interrupts, number("xhci", FieldRange{2, 3}), "42"},
        {interrupts, number("xhci", FieldRange{2, {}}), "42"},
        {interrupts, number("xhci", FieldRange{2, 4}), "/file: \"IO-APIC\" is not a number"},
        // A line that would exhaust the stack of the regular expression.
        {std::string(1'000'000, 'a') + " 1", number("a (1)"), "/file: no line matches \"a (1)\""},
    };
    for (const auto& each : cases) {
        EXPECT_EQ(textIn(each.file, each.wanted), each.result) << each.file.substr(0, 80);
    }
}

TEST(Machine, FindsTheOneFileThatAPatternMeans) {
    const test::MachineInFolder files;
    files.write("/sys/class/hwmon/hwmon9/name", "acpi\n");
    files.write("/sys/class/hwmon/hwmon9/temp1_input", "1");
    files.write("/sys/class/hwmon/hwmon10/name", "lm75\n");
    files.write("/sys/class/hwmon/hwmon10/device/temp1_input", "2");
    const auto machine = files.machine();
    EXPECT_EQ(machine.find({"/sys/class/hwmon/hwmon*/device/temp1_input", {{"name", "lm75"}}}),
              "/sys/class/hwmon/hwmon10/device/temp1_input");
    const auto problem = [&](const linux_device::FilePattern& pattern) {
        try {
            return machine.find(pattern);
        } catch (const SystemProblem& thrown) {
            return std::string(thrown.what());
        }
    };
    EXPECT_EQ(problem({"/sys/class/hwmon/hwmon*/name"}),
              "/sys/class/hwmon/hwmon*/name: 2 files match, /sys/class/hwmon/hwmon9/name and "
              "/sys/class/hwmon/hwmon10/name among them");
    EXPECT_EQ(problem({"/sys/class/hwmon/hwmon*/name", {{"name", "tmp102"}}}),
              "/sys/class/hwmon/hwmon*/name: No such file or directory (ENOENT)");
}

class Counters : public testing::Test {
  protected:
    void describe(Restarts restarts) {
        CounterChannel channel{.name = "A", .group = "G", .subgroup = "S", .restarts = restarts};
        channel.count.source = number("");
        CounterChannel fixed{.name = "B", .group = "G", .subgroup = "S"};
        fixed.count.source = Constant{3};
        _facility = makeMeterixFacility({channel, fixed}, _files.machine(), _starts);
    }
    std::shared_ptr<const platform::MeterixSamples> sample(const std::string& content) {
        _files.write("/file", content);
        return _facility->sample(*_facility->simpleChannels(nullptr), nullptr);
    }
    // The difference of A, or the text of the error.
    std::string rise(const std::shared_ptr<const platform::MeterixSamples>& later,
                     const std::shared_ptr<const platform::MeterixSamples>& baseline) {
        platform::ErrorRef error;
        const auto difference = _facility->difference(*later, *baseline, &error);
        return difference != nullptr ? difference->front().channel().count().text()
                                     : error->localizedDescription();
    }

    const test::MachineInFolder _files;
    const std::shared_ptr<StreamStarts> _starts = std::make_shared<StreamStarts>(0);
    std::shared_ptr<platform::MeterixFacility> _facility;
};

TEST_F(Counters, AreFilesAndConstants) {
    describe(Restarts::Never);
    const auto samples = sample("7");
    ASSERT_EQ(samples->size(), 2U);
    EXPECT_EQ((*samples)[0].channel().count(), Number(std::int64_t{7}));
    EXPECT_EQ((*samples)[1].channel().count(), Number(3));
    EXPECT_EQ(rise(sample("9"), samples), "2");
}

TEST_F(Counters, NeverFallSilently) {
    describe(Restarts::Never);
    const auto before = sample("7");
    EXPECT_EQ(rise(sample("2"), before),
              "counter A fell from 7 to 2; \"restarts\" in its description says when it starts "
              "anew");
    const auto missing = sample("none");
    EXPECT_FALSE(missing->front().channel().count().isPresent());
    EXPECT_EQ(rise(missing, before), "counter A had no count at the end");
    EXPECT_EQ(rise(before, missing), "counter A had no count at the beginning");
}

TEST_F(Counters, GoOnAcrossRestartsThatAreDeclared) {
    const struct {
        Restarts restarts;
        bool streams;
        std::string later;
        std::string rise;
    } cases[] = {
        {Restarts::AtStreamStart, true, "9", "9"},  {Restarts::AtStreamStart, true, "5", "5"},
        {Restarts::AtStreamStart, false, "9", "2"}, {Restarts::AtAnyTime, false, "5", "5"},
        {Restarts::AtAnyTime, true, "9", "2"},
    };
    for (const auto& each : cases) {
        describe(each.restarts);
        sample("4");
        const auto before = sample("7");
        *_starts += each.streams ? 1 : 0;
        EXPECT_EQ(rise(sample(each.later), before), each.rise);
    }
}

}  // namespace
