// A HID sensor for the guest's kernel, by way of uhid: image reports of 792 bytes with ID 118, twenty per second, once
// the feature reports 171 and 172 have switched it on. At 8, which no image has, stands the low half of the monotonic
// clock's nanoseconds when the report was sent. Commands: see main().
#include <algorithm>
#include <atomic>
#include <cerrno>
#include <chrono>
#include <cstddef>
#include <cstring>
#include <string_view>
#include <thread>

#include <fcntl.h>
#include <linux/uhid.h>
#include <unistd.h>

#include "tests/virtual_machine/commands.h"

namespace {

using namespace std::chrono_literals;

constexpr std::size_t kReportSize = 792;
constexpr std::string_view kName = "Bench sensor";
constexpr std::string_view kSerial = "SN-0002";
constexpr std::uint8_t kReport = 118;
constexpr std::uint8_t kPower = 171;
constexpr std::uint8_t kStreaming = 172;

// Vendor usage page 0xFF00, usage 0x24: an input report and two feature reports of one byte.
constexpr std::uint8_t kDescriptor[] = {
    0x06, 0x00,    0xFF, 0x09, 0x24,       0xA1, 0x01, 0x15, 0x00, 0x26, 0xFF,   0x00, 0x75, 0x08,
    0x85, kReport, 0x96, 0x17, 0x03,       0x09, 0x24, 0x81, 0x02, 0x85, kPower, 0x95, 0x01, 0x09,
    0x25, 0xB1,    0x02, 0x85, kStreaming, 0x95, 0x01, 0x09, 0x26, 0xB1, 0x02,   0xC0};

class Sensor {
  public:
    std::atomic<int> refused = 0;  // the feature report that is refused
    std::atomic<int> mute = 0;     // the one that is never answered
    std::atomic<int> length = kReportSize;
    std::atomic<bool> isSilent = false;
    std::atomic<int> interval = 50;       // milliseconds
    std::atomic<int> temperature = 31;    // degrees Celsius
    std::atomic<int> amplitude = 10'000;  // of the image's first sample
    std::atomic<int> last = 0;            // the report after which it is unplugged; 0: never

    bool plug() {
        _device = open("/dev/uhid", O_RDWR | O_CLOEXEC);
        uhid_event event{};
        event.type = UHID_CREATE2;
        uhid_create2_req& wanted = event.u.create2;
        std::copy_n(kName.begin(), kName.size(), wanted.name);
        std::copy_n(kSerial.begin(), kSerial.size(), wanted.uniq);
        wanted.rd_size = sizeof kDescriptor;
        std::memcpy(wanted.rd_data, kDescriptor, sizeof kDescriptor);
        wanted.bus = 3;  // USB
        wanted.vendor = 0x1234;
        wanted.product = 0x5678;
        return _device >= 0 && _write(event);
    }

    void unplug() {
        uhid_event event{};
        event.type = UHID_DESTROY;
        _write(event);
    }

    // Never returns.
    void answer() {
        for (uhid_event event{}; read(_device, &event, sizeof event) > 0;) {
            if (event.type != UHID_SET_REPORT) {
                continue;
            }
            const uhid_set_report_req& request = event.u.set_report;
            const bool isOn = request.size > 1 && request.data[1] == 1;
            if (request.rnum == mute) {
                continue;
            }
            const bool isRefused = request.rnum == refused;
            if (!isRefused) {
                (request.rnum == kPower ? _hasPower : _isStreaming) = isOn;
            }
            uhid_event reply{};
            reply.type = UHID_SET_REPORT_REPLY;
            reply.u.set_report_reply.id = request.id;
            reply.u.set_report_reply.err = isRefused ? EPIPE : 0;
            _write(reply);
        }
    }

    // Never returns.
    void sendReports() {
        const auto begin = std::chrono::steady_clock::now();
        auto due = begin;
        for (std::uint32_t number = 1;;) {
            due += std::chrono::milliseconds(interval);
            std::this_thread::sleep_until(due);
            if (!_hasPower || !_isStreaming || isSilent) {
                continue;
            }
            uhid_event event{};
            event.type = UHID_INPUT2;
            event.u.input2.size = static_cast<std::uint16_t>(length);
            std::uint8_t* data = event.u.input2.data;
            const auto elapsed = std::chrono::duration_cast<std::chrono::milliseconds>(due - begin);
            const auto milliseconds = static_cast<std::uint32_t>(elapsed.count());
            data[0] = kReport;
            std::memcpy(data + 4, &number, sizeof number);
            std::memcpy(data + 12, &milliseconds, sizeof milliseconds);
            const auto sample = static_cast<std::int32_t>(amplitude);
            const auto degrees = static_cast<float>(temperature);
            std::memcpy(data + 16, &sample, sizeof sample);
            std::memcpy(data + 788, &degrees, sizeof degrees);
            const auto now = std::chrono::steady_clock::now().time_since_epoch();
            const auto sent = static_cast<std::uint32_t>(std::chrono::nanoseconds(now).count());
            std::memcpy(data + 8, &sent, sizeof sent);
            _write(event);
            if (number == static_cast<std::uint32_t>(last)) {
                unplug();
            }
            ++number;
        }
    }

  private:
    bool _write(const uhid_event& event) const { return write(_device, &event, sizeof event) > 0; }

    int _device = -1;
    std::atomic<bool> _hasPower = false;  // by a feature report, as is the next
    std::atomic<bool> _isStreaming = false;
};

}  // namespace

int main(int argc, char** argv) {
    auto& sensor = *new Sensor;  // shared with threads that never end
    const auto set = [](auto& what) { return [&what](int number) { what = number; }; };
    const guest::Commands commands = {
        {"refuse", set(sensor.refused)},      {"mute", set(sensor.mute)},
        {"length", set(sensor.length)},       {"silent", set(sensor.isSilent)},
        {"interval", set(sensor.interval)},   {"temperature", set(sensor.temperature)},
        {"amplitude", set(sensor.amplitude)}, {"unplug-after", set(sensor.last)},
    };
    guest::obeyAll(commands, argc, argv, [&] {
        if (!sensor.plug()) {
            std::perror("plug");
            std::exit(1);
        }
        std::thread([&sensor] { sensor.answer(); }).detach();
        std::thread([&sensor] { sensor.sendReports(); }).detach();
    });
    std::_Exit(0);
}
