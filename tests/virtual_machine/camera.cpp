// An infrared camera (UVC 1.1, bulk, 320 x 180 pixels of 8 bits, 30 or 60 frames per second) for the guest's kernel.
// What the tests move is in the header of each frame, in bytes that the driver hands on as they are:
//
//   presentation time   0  u8   light source: 1 and 2 in turn once a client has written mode 2, else 0
//                       1  u16  hardware events
//                       3  u8   the mode that was written
//   source clock        0  u16  number of the frame, which goes on from stream to stream: the driver leaves the header
//                               out of a frame whose source clock is that of the frame before
//                       2  i16  temperature, hundredths of a degree Celsius
//                       4  i16  temperature of the flood light, the same
//
// Commands: see main().
#include <array>
#include <atomic>
#include <cerrno>
#include <chrono>
#include <string_view>

#include "tests/virtual_machine/commands.h"
#include "tests/virtual_machine/usb_device.h"

namespace guest {

namespace {

using namespace std::chrono_literals;

constexpr unsigned kWidth = 320;
constexpr unsigned kHeight = 180;
constexpr std::size_t kPicture = std::size_t{kWidth} * kHeight;
constexpr std::size_t kHeader = 12;
constexpr std::uint8_t kStream = 0x81;
constexpr std::uint32_t kInterval = 333'333;  // 100 ns
constexpr std::uint32_t kShortInterval = 166'666;
constexpr std::uint8_t kInterleaved = 2;  // the mode that lights frames

// Requests of USB and of its video class.
constexpr std::uint8_t kClearFeature = 1;
constexpr std::uint8_t kSetFeature = 3;
constexpr std::uint8_t kGetDescriptor = 6;
constexpr std::uint8_t kSetConfiguration = 9;
constexpr std::uint8_t kSetInterface = 11;
constexpr std::uint8_t kSetCurrent = 0x01;
constexpr std::uint8_t kGetCurrent = 0x81;
constexpr std::uint8_t kGetMinimum = 0x82;
constexpr std::uint8_t kGetMaximum = 0x83;
constexpr std::uint8_t kGetResolution = 0x84;
constexpr std::uint8_t kGetLength = 0x85;
constexpr std::uint8_t kGetInfo = 0x86;
constexpr std::uint8_t kGetDefault = 0x87;

constexpr std::uint8_t kProbe = 1;
constexpr std::uint8_t kCommit = 2;
constexpr std::uint8_t kOutOfRange = 4;  // request error code
constexpr std::uint8_t kUnknownControl = 6;

struct Control {
    std::uint8_t unit;
    std::uint8_t selector;
    std::uint8_t size;
    std::int32_t minimum;
    std::int32_t maximum;
    std::int32_t resolution;  // of the exposure mode: the modes that there are
    std::int32_t standard;
};
constexpr std::uint8_t kExtensionUnit = 3;
constexpr std::uint8_t kMode = 1;
constexpr Control kControls[] = {
    {1, 0x02, 1, 1, 8, 1 | 8, 8},             // automatic exposure mode: 1 manual, 8 automatic
    {1, 0x04, 4, 1, 5000, 1, 80},             // exposure time
    {2, 0x04, 2, 0, 100, 1, 16},              // gain
    {kExtensionUnit, kMode, 4, 0, 3, 1, 0},   // light-source mode
    {kExtensionUnit, 2, 4, 0, 1 << 30, 1, 0}  // errors on the camera's own bus
};

constexpr std::uint8_t kDeviceDescriptor[] = {18,   1,    0,    2, 0xEF, 2, 1, 64, 0x34,
                                              0x12, 0x79, 0x56, 0, 1,    1, 2, 3,  1};
constexpr std::uint8_t kQualifier[] = {10, 6, 0, 2, 0xEF, 2, 1, 64, 1, 0};
constexpr std::uint8_t kUnits[] = {
    // Camera: automatic exposure mode, exposure time.
    18, 0x24, 2, 1, 1, 2, 0, 0, 0, 0, 0, 0, 0, 0, 3, 0x0A, 0, 0,
    // Processing unit: gain.
    12, 0x24, 5, 2, 1, 0, 0, 2, 0x00, 0x02, 0, 0,
    // Extension unit.
    26, 0x24, 6, kExtensionUnit, 0x10, 0x32, 0x54, 0x76, 0x98, 0xBA, 0xDC, 0xFE, 0x01, 0x23, 0x45,
    0x67, 0x89, 0xAB, 0xCD, 0xEF, 2, 1, 2, 1, 3, 0,
    // Output.
    9, 0x24, 3, 4, 1, 1, 0, 3, 0};
constexpr std::uint8_t kFormat[] = {27,   0x24, 4,    1, 1,    'Y', '8', '0',  '0',
                                    0,    0,    0x10, 0, 0x80, 0,   0,   0xAA, 0,
                                    0x38, 0x9B, 0x71, 8, 1,    0,   0,   0,    0};

Bytes configuration() {
    Bytes frame{34, 0x24, 5, 1, 0};
    for (const auto& [number, size] :
         std::initializer_list<std::pair<std::uint64_t, std::size_t>>{{kWidth, 2},
                                                                      {kHeight, 2},
                                                                      {kPicture * 8 * 30, 4},
                                                                      {kPicture * 8 * 60, 4},
                                                                      {kPicture, 4},
                                                                      {kInterval, 4},
                                                                      {2, 1},
                                                                      {kShortInterval, 4},
                                                                      {kInterval, 4}}) {
        append(frame, number, size);
    }
    Bytes control{13, 0x24, 1, 0x10, 0x01};
    append(control, 13 + sizeof kUnits, 2);
    append(control, 48'000'000, 4);
    append(control, std::array<std::uint8_t, 2>{1, 1});
    append(control, kUnits);
    Bytes input{14, 0x24, 1, 1};
    append(input, 14 + sizeof kFormat + frame.size(), 2);
    append(input, std::array<std::uint8_t, 8>{kStream, 0, 4, 0, 0, 0, 1, 0});
    append(input, kFormat);
    append(input, frame);

    Bytes rest{8, 11, 0, 2, 0x0E, 3, 0, 2, 9, 4, 0, 0, 0, 0x0E, 1, 0, 2};
    append(rest, control);
    append(rest, std::array<std::uint8_t, 9>{9, 4, 1, 0, 1, 0x0E, 2, 0, 0});
    append(rest, input);
    append(rest, std::array<std::uint8_t, 7>{7, 5, kStream, 2, 0, 2, 0});

    Bytes whole{9, 2};
    append(whole, 9 + rest.size(), 2);
    append(whole, std::array<std::uint8_t, 5>{2, 1, 0, 0x80, 50});
    append(whole, rest);
    return whole;
}

Bytes text(std::string_view characters) {
    Bytes bytes{static_cast<std::uint8_t>(2 + 2 * characters.size()), 3};
    for (const char character : characters) {
        append(bytes, static_cast<std::uint8_t>(character), 2);
    }
    return bytes;
}

Bytes descriptor(std::uint16_t which) {
    constexpr std::string_view kTexts[] = {"Bench", "Infrared camera", "SN-0001"};
    const std::size_t index = which & 0xFFU;
    switch (which >> 8U) {
        case 1:
            return {std::begin(kDeviceDescriptor), std::end(kDeviceDescriptor)};
        case 2:
            return configuration();
        case 3:
            return index == 0 ? Bytes{4, 3, 9, 4}
                              : (index <= std::size(kTexts) ? text(kTexts[index - 1]) : Bytes());
        case 6:
            return {std::begin(kQualifier), std::end(kQualifier)};
        default:
            return {};
    }
}

// What is negotiated before a stream.
Bytes streamParameters(std::uint32_t interval) {
    Bytes bytes{1, 0, 1, 1};
    append(bytes, interval, 4);
    append(bytes, 0, 10);
    append(bytes, kPicture, 4);
    append(bytes, kPicture + kHeader, 4);
    append(bytes, 48'000'000, 4);
    bytes.push_back(3);
    bytes.resize(34);
    return bytes;
}

std::uint32_t numberAt(const Bytes& bytes, std::size_t at) {
    std::uint32_t number = 0;
    for (std::size_t byte = 0; byte < 4 && at + byte < bytes.size(); ++byte) {
        number |= std::uint32_t{bytes[at + byte]} << (8 * byte);
    }
    return number;
}

// Takes one of what is left of a fault.
bool take(std::atomic<int>& left) {
    return left > 0 && left-- > 0;
}

class Camera : public UsbDevice {
  public:
    // What a test sets. Atomic: the frames are made on a thread of their own.
    std::atomic<int> light = -1, events = 0, temperature = 3125, flood = 2920,
                     busErrors = 0;  // -1: by the mode
    std::atomic<int> errorBits = 0, halfFrames = 0, badHeaders = 0, skipped = 0, stalls = 0;
    std::atomic<bool> isSilent = false, refusesCommit = false, refusesProbe = false;
    std::atomic<bool> refusesControls = false, hangsControls = false;

    // Never returns.
    void sendFrames() {
        auto due = std::chrono::steady_clock::now();
        for (bool isOdd = false;;) {
            due += std::chrono::nanoseconds(std::int64_t{_interval} * 100);
            std::this_thread::sleep_until(due);
            if (!_isStreaming || isSilent) {
                continue;
            }
            if (take(stalls)) {
                complete(kStream, {}, -EPIPE);
                continue;
            }
            ++_frame;
            if (!take(skipped)) {
                isOdd = !isOdd;
                _send(_payload(isOdd));
            }
        }
    }

  protected:
    int control(const ControlRequest& request, Bytes& answer) override {
        constexpr std::uint8_t kClass = 0x20;
        return (request.type & 0x60U) == kClass ? _videoControl(request, answer)
                                                : _usbControl(request, answer);
    }

  private:
    int _usbControl(const ControlRequest& request, Bytes& answer) {
        switch (request.request) {
            case 0:
                answer = {0, 0};
                return 0;
            case kClearFeature:  // of the endpoint: the driver ends the stream
                _isStreaming = _isStreaming && request.index != kStream;
                return 0;
            case kSetFeature:
            case kSetConfiguration:
            case kSetInterface:
                return 0;
            case kGetDescriptor:
                answer = descriptor(request.value);
                return answer.empty() ? -EPIPE : 0;
            default:
                return -EPIPE;
        }
    }

    int _videoControl(const ControlRequest& request, Bytes& answer) {
        const auto unit = static_cast<std::uint8_t>(request.index >> 8U);
        const auto selector = static_cast<std::uint8_t>(request.value >> 8U);
        if ((request.index & 0xFFU) == 1) {
            return _negotiate(request, selector, answer);
        }
        if (unit == 0) {
            answer = {_lastError};
            return 0;
        }
        for (std::size_t at = 0; at < std::size(kControls); ++at) {
            if (kControls[at].unit == unit && kControls[at].selector == selector) {
                return _access(kControls[at], _values[at], request, answer);
            }
        }
        _lastError = kUnknownControl;
        return -EPIPE;
    }

    int _negotiate(const ControlRequest& request, std::uint8_t selector, Bytes& answer) {
        if (selector == kProbe ? refusesProbe : refusesCommit) {
            return -EPIPE;
        }
        switch (request.request) {
            case kSetCurrent:
                _interval = numberAt(request.data, 4) < kInterval ? kShortInterval : kInterval;
                if (selector == kCommit) {
                    _isStreaming = true;
                }
                return 0;
            case kGetLength:
                answer = {34, 0};
                return 0;
            case kGetInfo:
                answer = {3};
                return 0;
            default:
                answer = streamParameters(_interval);
                return 0;
        }
    }

    int _access(const Control& control,
                std::atomic<std::int32_t>& value,
                const ControlRequest& request,
                Bytes& answer) {
        const bool isCounter = control.unit == kExtensionUnit && control.selector != kMode;
        const auto number = [&](std::int32_t content) {
            append(answer, static_cast<std::uint32_t>(content), control.size);
            return 0;
        };
        if (hangsControls && (request.request == kSetCurrent || request.request == kGetCurrent)) {
            return -EINPROGRESS;
        }
        switch (request.request) {
            case kSetCurrent:
                if (refusesControls) {
                    _lastError = kOutOfRange;
                    return -EPIPE;
                }
                value = static_cast<std::int32_t>(numberAt(request.data, 0));
                return 0;
            case kGetCurrent:
                return number(isCounter ? busErrors : value);
            case kGetMinimum:
                return number(control.minimum);
            case kGetMaximum:
                return number(control.maximum);
            case kGetResolution:
                return number(control.resolution);
            case kGetDefault:
                return number(control.standard);
            case kGetLength:
                answer = {control.size, 0};
                return 0;
            case kGetInfo:
                answer = {static_cast<std::uint8_t>(isCounter ? 1 : 3)};
                return 0;
            default:
                return -EPIPE;
        }
    }

    Bytes _payload(bool isOdd) {
        constexpr std::uint8_t kFlags =
            0x8E;  // end of header, source clock, presentation time, end of frame
        constexpr std::uint8_t kError = 0x40;
        const int mode = _values[3];
        const int lit = mode == kInterleaved ? 1 + static_cast<int>(_frame % 2) : 0;
        const int flags = kFlags | (isOdd ? 1 : 0) | (take(errorBits) ? kError : 0);
        Bytes payload{static_cast<std::uint8_t>(take(badHeaders) ? 1 : kHeader),
                      static_cast<std::uint8_t>(flags)};
        append(payload, static_cast<std::uint32_t>(light < 0 ? lit : light.load()), 1);
        append(payload, static_cast<std::uint32_t>(events), 2);
        append(payload, static_cast<std::uint32_t>(mode), 1);
        append(payload, _frame, 2);
        append(payload, static_cast<std::uint32_t>(temperature), 2);
        append(payload, static_cast<std::uint32_t>(flood), 2);
        payload.resize(kHeader + (take(halfFrames) ? kPicture / 2 : kPicture),
                       static_cast<std::uint8_t>(_frame));
        return payload;
    }

    // In as many requests as it takes; a frame that no request waits for is lost.
    void _send(std::span<const std::uint8_t> payload) {
        constexpr int kPatience = 100;  // milliseconds
        for (int waited = 0; !payload.empty() && _isStreaming && waited < kPatience;) {
            const std::size_t part = std::min(room(kStream), payload.size());
            if (part == 0) {
                std::this_thread::sleep_for(1ms);
                ++waited;
                continue;
            }
            complete(kStream, payload.first(part));
            payload = payload.subspan(part);
        }
    }

    std::array<std::atomic<std::int32_t>, std::size(kControls)> _values = {8, 80, 16, 0, 0};
    std::atomic<std::uint32_t> _interval = kInterval;
    std::atomic<std::uint32_t> _frame = 0;
    std::atomic<bool> _isStreaming = false;
    std::uint8_t _lastError = 0;
};

}  // namespace

}  // namespace guest

int main(int argc, char** argv) {
    // Shared with a thread that never ends.
    auto& camera = *new guest::Camera;
    const auto set = [](auto& what) { return [&what](int number) { what = number; }; };
    const guest::Commands commands = {
        {"light", set(camera.light)},
        {"events", set(camera.events)},
        {"temperature", set(camera.temperature)},
        {"flood", set(camera.flood)},
        {"bus-errors", set(camera.busErrors)},
        {"error-bits", set(camera.errorBits)},
        {"half-frames", set(camera.halfFrames)},
        {"bad-headers", set(camera.badHeaders)},
        {"skip", set(camera.skipped)},
        {"stall", set(camera.stalls)},
        {"silent", set(camera.isSilent)},
        {"refuse-commit", set(camera.refusesCommit)},
        {"refuse-probe", set(camera.refusesProbe)},
        {"refuse-controls", set(camera.refusesControls)},
        {"hang-controls", set(camera.hangsControls)},
        {"unplug", [&](int) { camera.unplug(); }},
    };
    guest::obeyAll(commands, argc, argv, [&] {
        if (!camera.plug()) {
            std::perror("plug");
            std::exit(1);
        }
        std::thread([&camera] { camera.sendFrames(); }).detach();
    });
    std::_Exit(0);
}
