#include "devices/linux/hid_sensor.h"

#include <cerrno>
#include <cstddef>
#include <string>
#include <utility>

#include <fcntl.h>
#include <linux/hidraw.h>
#include <poll.h>
#include <pthread.h>
#include <sys/ioctl.h>

#include "devices/linux/file_descriptor.h"
#include "devices/linux/system_problem.h"
#include "devices/linux/waker.h"
#include "devices/report_delivery.h"
#include "devices/usage_match.h"
#include "platform/number.h"
#include "platform/sync.h"

namespace linux_device {

namespace {

using platform::ErrorRef;
using platform::ErrorSlot;
using platform::MutexLock;
using platform::RunLoop;

constexpr std::size_t kLongestReport = 16384;  // HID_MAX_BUFFER_SIZE of the kernel

// A report, or the error that ends them.
struct InputReport {
    std::vector<std::byte> data;
    ErrorRef error = nullptr;
};

// A device as one user sees it.
//
// Owner    The user's handle, its thread while it reads, and its event source while that delivers a report: it may
//          die on any of their threads.
// Threads  Any; no lock is held while a callback, a run loop or the kernel is called.
class HidSensor final : public WLIOHIDDeviceInterface,
                        public std::enable_shared_from_this<HidSensor> {
  public:
    HidSensor(HidNode node, Machine machine)
        : _node(std::move(node)), _machine(std::move(machine)) {}

    // What the user holds. The device closes when it goes.
    std::shared_ptr<WLIOHIDDeviceInterface> makeHandle() {
        return {this, [self = shared_from_this()](WLIOHIDDeviceInterface*) { self->_letGo(); }};
    }

    bool open(ErrorSlot error) override;
    void setInputReportCallback(WLHIDInputReportCallback callback) override {
        _callback.set(std::move(callback));
    }
    bool setFeatureReportWithID(std::int64_t reportID,
                                std::span<const std::byte> data,
                                ErrorSlot error) override;
    void scheduleWithRunLoop(const std::shared_ptr<RunLoop>& runLoop,
                             std::string_view mode) override;
    void unscheduleFromRunLoop(const std::shared_ptr<RunLoop>& runLoop,
                               std::string_view mode) override;
    bool close(ErrorSlot error) override;

  private:
    using File = std::shared_ptr<const FileDescriptor>;

    // The device on a run loop, and what its thread reads meanwhile.
    struct Delivery {
        File file;
        std::shared_ptr<devices::ReportDelivery<InputReport>> reports;
        Waker end = {};
    };
    using DeliveryRef = std::shared_ptr<Delivery>;

    File _currentFile();
    DeliveryRef _currentDelivery();
    void _endDelivery();
    void _letGo();

    // The device's thread.
    void _read(const DeliveryRef& delivery);
    InputReport _nextReport(const Delivery& delivery, std::vector<std::byte>& buffer) const;

    // The run loop's thread.
    bool _receive(const InputReport& report);

    const HidNode _node;
    const Machine _machine;

    devices::ReportCallback _callback;

    platform::Mutex _mutex;
    File _file ZR_GUARDED_BY(_mutex);             // null while it is closed
    DeliveryRef _delivery ZR_GUARDED_BY(_mutex);  // null while it is not scheduled
};

bool HidSensor::open(ErrorSlot error) {
    return attempt(error, [this] {
        if (_currentFile() != nullptr) {
            throw SystemProblem(_node.path + ": open already", EBUSY);
        }
        const auto file = std::make_shared<const FileDescriptor>(
            ::open(_machine.at(_node.path).c_str(), O_RDWR | O_NONBLOCK | O_CLOEXEC));
        if (!file->isOpen()) {
            failWithErrno(_node.path);
        }
        const MutexLock lock(_mutex);
        _file = file;
        return true;
    });
}

bool HidSensor::setFeatureReportWithID(std::int64_t reportID,
                                       std::span<const std::byte> data,
                                       ErrorSlot error) {
    return attempt(error, [&] {
        const std::string what =
            _node.path + ": feature report " + platform::Number(reportID).text();
        const File file = _currentFile();
        if (file == nullptr) {
            throw SystemProblem(what + ": the device is not open", EBADF);
        }
        if (data.empty() || std::to_integer<std::int64_t>(data.front()) != reportID) {
            throw SystemProblem(what + ": the data does not begin with this ID", EINVAL);
        }
        std::vector<std::byte> copy(data.begin(), data.end());  // the kernel takes no constant
        if (ioctl(file->number(), HIDIOCSFEATURE(copy.size()), copy.data()) < 0) {
            failWithErrno(what);
        }
        return true;
    });
}

void HidSensor::scheduleWithRunLoop(const std::shared_ptr<RunLoop>& runLoop,
                                    std::string_view mode) {
    const File file = _currentFile();
    if (file == nullptr) {
        return;
    }
    _endDelivery();
    auto reports = devices::ReportDelivery<InputReport>::start(
        runLoop, mode, [weak = weak_from_this()](const InputReport& report) {
            const auto self = weak.lock();
            return self != nullptr && self->_receive(report);
        });
    const auto delivery = std::make_shared<Delivery>(Delivery{file, std::move(reports)});
    {
        const MutexLock lock(_mutex);
        _delivery = delivery;
    }
    platform::startThread([self = shared_from_this(), delivery] { self->_read(delivery); });
}

void HidSensor::unscheduleFromRunLoop(const std::shared_ptr<RunLoop>& runLoop,
                                      std::string_view mode) {
    const DeliveryRef delivery = _currentDelivery();
    if (delivery != nullptr && delivery->reports->isOn(runLoop, mode)) {
        _endDelivery();
    }
}

bool HidSensor::close(ErrorSlot error) {
    _endDelivery();
    File closed;
    {
        const MutexLock lock(_mutex);
        closed.swap(_file);
    }
    if (closed == nullptr) {
        return platform::fail(error, kLinuxErrorDomain, EBADF, nullptr, "%@: not open", _node.path);
    }
    return true;
}

void HidSensor::_letGo() {
    close(nullptr);
    setInputReportCallback({});
}

HidSensor::File HidSensor::_currentFile() {
    const MutexLock lock(_mutex);
    return _file;
}

HidSensor::DeliveryRef HidSensor::_currentDelivery() {
    const MutexLock lock(_mutex);
    return _delivery;
}

void HidSensor::_endDelivery() {
    DeliveryRef ended;
    {
        const MutexLock lock(_mutex);
        ended.swap(_delivery);
    }
    if (ended != nullptr) {
        ended->reports->end();
        ended->end.wake();
    }
}

void HidSensor::_read(const DeliveryRef& delivery) {
    pthread_setname_np(pthread_self(), "hid reader");
    std::vector<std::byte> buffer(kLongestReport + 1);
    while (delivery->reports->awaitRoom()) {
        InputReport report = _nextReport(*delivery, buffer);
        const bool isLast = report.error != nullptr;
        if (!delivery->reports->add(std::move(report)) || isLast) {
            return;
        }
    }
}

// The next report of the node, or the error that it ends with. Empty once the delivery has ended. The buffer's first
// byte is 0.
InputReport HidSensor::_nextReport(const Delivery& delivery, std::vector<std::byte>& buffer) const {
    // A report without an ID gets the ID 0, as its data begins with one all the same.
    const std::size_t prefix = _node.descriptor.hasReportIds ? 0 : 1;
    for (;;) {
        pollfd waits[] = {{delivery.file->number(), POLLIN, 0},
                          {delivery.end.descriptor(), POLLIN, 0}};
        if (poll(waits, std::size(waits), -1) < 0 && errno != EINTR) {
            return {{}, errorOf({errorText(_node.path + ": waiting for a report", errno), errno})};
        }
        if (waits[1].revents != 0) {
            return {};
        }
        const ssize_t count =
            ::read(delivery.file->number(), buffer.data() + prefix, kLongestReport);
        const int code = errno;
        if (count > 0) {
            return {{buffer.begin(), buffer.begin() + count + static_cast<ssize_t>(prefix)}};
        }
        if ((waits[0].revents & POLLHUP) != 0) {
            return {{}, errorOf({errorText(_node.path + ": unplugged", ENODEV), ENODEV})};
        }
        if (count == 0 || (code != EAGAIN && code != EINTR)) {
            const int shown = count == 0 ? EIO : code;
            return {{}, errorOf({errorText(_node.path + ": reading a report", shown), shown})};
        }
    }
}

bool HidSensor::_receive(const InputReport& report) {
    const auto id = report.data.empty() ? 0 : std::to_integer<std::int64_t>(report.data[0]);
    _callback.call(id, report.data, report.error);
    return report.error == nullptr;
}

class LinuxManager final : public WLHIDManager {
  public:
    LinuxManager(std::vector<HidDescription> described, Machine machine)
        : _described(std::move(described)), _machine(std::move(machine)) {}

    void enumerateDevicesMatching(const std::vector<platform::Dictionary>& matching) override {
        _devices.clear();
        for (const HidNode& node : findHidNodes(_machine, _described)) {
            if (devices::matchesAny(node.descriptor.primaryUsagePage, node.descriptor.primaryUsage,
                                    matching)) {
                _devices.push_back(makeHidDevice(node, _machine));
            }
        }
    }

    std::vector<std::shared_ptr<WLIOHIDDeviceInterface>> devices() override { return _devices; }

  private:
    const std::vector<HidDescription> _described;
    const Machine _machine;
    std::vector<std::shared_ptr<WLIOHIDDeviceInterface>> _devices;
};

class LinuxHid final : public platform::HidFacility {
  public:
    LinuxHid(std::vector<HidDescription> described, Machine machine)
        : _described(std::move(described)), _machine(std::move(machine)) {}

    std::shared_ptr<WLHIDManager> createManager() override {
        return std::make_shared<LinuxManager>(_described, _machine);
    }

  private:
    const std::vector<HidDescription> _described;
    const Machine _machine;
};

}  // namespace

std::shared_ptr<WLIOHIDDeviceInterface> makeHidDevice(const HidNode& node, const Machine& machine) {
    return std::make_shared<HidSensor>(node, machine)->makeHandle();
}

std::shared_ptr<platform::HidFacility> makeHidFacility(std::vector<HidDescription> described,
                                                       const Machine& machine) {
    return std::make_shared<LinuxHid>(std::move(described), machine);
}

}  // namespace linux_device
