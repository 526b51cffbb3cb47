// A camera node that tests fill.
#ifndef ZR_TESTS_DEVICES_LINUX_FAKE_VIDEO_H
#define ZR_TESTS_DEVICES_LINUX_FAKE_VIDEO_H

#include <cerrno>
#include <deque>
#include <functional>
#include <map>
#include <set>
#include <string>
#include <vector>

#include <sys/eventfd.h>
#include <unistd.h>

#include "devices/linux/file_descriptor.h"
#include "devices/linux/system_problem.h"
#include "devices/linux/video_device.h"
#include "platform/sync.h"

namespace test {

// Threads  Any.
class FakeVideo final : public linux_device::VideoDevice {
  public:
    explicit FakeVideo(std::string path) : _path(std::move(path)) {}

    // The camera took a picture; false when no buffer was queued for it.
    bool fill(std::uint32_t sequence,
              std::int64_t microseconds,
              const std::vector<std::byte>& content = {},
              bool isBroken = false) {
        const platform::MutexLock lock(_mutex);
        if (_queued.empty()) {
            return false;
        }
        const std::uint32_t index = _queued.front();
        _queued.pop_front();
        _contents[index] = content;
        _filled.push_back({index, sequence, microseconds, content.size(), isBroken});
        _wake();
        return true;
    }
    void breakWith(int code) {
        const platform::MutexLock lock(_mutex);
        _breakage = code;
        _wake();
    }
    std::size_t queued() const {
        const platform::MutexLock lock(_mutex);
        return _queued.size();
    }
    bool isOn() const {
        const platform::MutexLock lock(_mutex);
        return _isOn;
    }
    // What was set, in order.
    std::vector<std::string> settings() const {
        const platform::MutexLock lock(_mutex);
        return _settings;
    }

    // Called by control(), without a lock.
    std::function<std::int64_t()> readControl = [] { return 0; };
    // The operation that fails, by its name.
    std::string failing;

    const std::string& path() const override { return _path; }
    void setFormat(const linux_device::VideoFormat& format) override {
        _set(format.fourcc + " " + std::to_string(format.width));
    }
    void setMetadataFormat(const std::string& fourcc) override { _set(fourcc); }
    void setFrameRate(double framesPerSecond) override {
        _set("rate " + std::to_string(static_cast<int>(framesPerSecond)));
    }
    linux_device::ControlInfo findControl(const linux_device::Control& control) override {
        return {.id = 1, .name = control.name};
    }
    std::int64_t control(const linux_device::ControlInfo& /*control*/) override {
        return readControl();
    }
    void setControl(const linux_device::ControlInfo& control, std::int64_t value) override {
        _set(control.name + " " + std::to_string(value));
    }
    platform::Number extensionUnit(const linux_device::ExtensionUnit& /*unit*/) override {
        return 5;
    }
    void setExtensionUnit(const linux_device::ExtensionUnit& unit, std::int64_t value) override {
        _set("unit " + std::to_string(unit.unit) + " " + std::to_string(value));
    }
    void subscribe(const linux_device::EventRule& rule) override { _set(rule.control.name); }
    std::optional<linux_device::VideoEvent> nextEvent() override { return std::nullopt; }

    void makeBuffers(linux_device::BufferKind /*kind*/, std::uint32_t count) override {
        _mayFail("makeBuffers");
        for (std::uint32_t index = 0; index < count; ++index) {
            queue(index);
        }
    }
    void streamOn() override {
        _mayFail("streamOn");
        const platform::MutexLock lock(_mutex);
        _isOn = true;
    }
    std::optional<linux_device::FilledBuffer> dequeue() override {
        const platform::MutexLock lock(_mutex);
        if (_breakage != 0) {
            linux_device::failWithErrno(_path, _breakage);
        }
        std::uint64_t count = 0;
        if (::read(_ready.number(), &count, sizeof count) < 0) {
            return std::nullopt;
        }
        const linux_device::FilledBuffer buffer = _filled.front();
        _filled.pop_front();
        return buffer;
    }
    std::span<const std::byte> content(const linux_device::FilledBuffer& buffer) const override {
        const platform::MutexLock lock(_mutex);
        return _contents.at(buffer.index);
    }
    void queue(std::uint32_t index) override {
        const platform::MutexLock lock(_mutex);
        _queued.push_back(index);
    }
    void streamOff() override {
        const platform::MutexLock lock(_mutex);
        _isOn = false;
        _queued.clear();
        _filled.clear();
        std::uint64_t count = 0;
        while (::read(_ready.number(), &count, sizeof count) > 0) {
        }
    }
    int descriptor() const override { return _ready.number(); }

  private:
    void _wake() const {
        const std::uint64_t one = 1;
        static_cast<void>(::write(_ready.number(), &one, sizeof one));
    }
    void _set(std::string text) {
        _mayFail(text);
        const platform::MutexLock lock(_mutex);
        _settings.push_back(std::move(text));
    }
    void _mayFail(const std::string& operation) const {
        if (operation == failing) {
            linux_device::failWithErrno(_path + ": " + operation, EIO);
        }
    }

    const std::string _path;
    const linux_device::FileDescriptor _ready{
        eventfd(0, EFD_CLOEXEC | EFD_NONBLOCK | EFD_SEMAPHORE)};
    mutable platform::Mutex _mutex;
    std::deque<std::uint32_t> _queued ZR_GUARDED_BY(_mutex);
    std::deque<linux_device::FilledBuffer> _filled ZR_GUARDED_BY(_mutex);
    std::map<std::uint32_t, std::vector<std::byte>> _contents ZR_GUARDED_BY(_mutex);
    std::vector<std::string> _settings ZR_GUARDED_BY(_mutex);
    int _breakage ZR_GUARDED_BY(_mutex) = 0;
    bool _isOn ZR_GUARDED_BY(_mutex) = false;
};

}  // namespace test

#endif
