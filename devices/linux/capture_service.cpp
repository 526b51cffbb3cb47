#include "devices/linux/capture_service.h"

#include <algorithm>
#include <atomic>
#include <cerrno>
#include <utility>
#include <vector>

namespace linux_device {

namespace {

using platform::ErrorSlot;

platform::Failure failInvalidated(ErrorSlot error) {
    return platform::fail(error, kLinuxErrorDomain, ENODEV, nullptr,
                          "the device was invalidated before");
}

class LinuxCaptureDevice final : public WLRylCaptureDevice {
  public:
    explicit LinuxCaptureDevice(const std::shared_ptr<const CaptureContext>& context) {
        for (const StreamDescription& described : context->streams) {
            _streams.push_back(std::make_shared<CaptureStream>(context, described));
        }
    }
    LinuxCaptureDevice(const LinuxCaptureDevice&) = delete;
    LinuxCaptureDevice& operator=(const LinuxCaptureDevice&) = delete;

    // Possibly inside a handler: never waits.
    ~LinuxCaptureDevice() override {
        for (const auto& stream : _streams) {
            stream->abandon();
        }
    }

    std::optional<WLRylCaptureStreamList> streams(ErrorSlot error) override {
        if (_isInvalidated) {
            return failInvalidated(error);
        }
        return WLRylCaptureStreamList(_streams.begin(), _streams.end());
    }

    bool requestControlOfStreams(const WLRylCaptureStreamList& streams, ErrorSlot error) override {
        return std::all_of(streams.begin(), streams.end(), [&](const auto& requested) {
            const auto own = std::find(_streams.begin(), _streams.end(), requested);
            if (own == _streams.end()) {
                return bool(platform::fail(error, kLinuxErrorDomain, EINVAL, nullptr,
                                           "a stream of another device"));
            }
            return (*own)->grantControl(error);
        });
    }

    bool invalidate(ErrorSlot error) override {
        if (_isInvalidated.exchange(true)) {
            return failInvalidated(error);
        }
        for (const auto& stream : _streams) {
            stream->invalidate();
        }
        return true;
    }

  private:
    std::vector<std::shared_ptr<CaptureStream>> _streams;
    std::atomic<bool> _isInvalidated{false};  // any thread may ask
};

class PlugIn final : public WLISPCapturePlugIn {
  public:
    explicit PlugIn(CaptureContext context)
        : _context(std::make_shared<const CaptureContext>(std::move(context))) {}

    std::shared_ptr<WLRylCaptureDevice> device(ErrorSlot /*error*/) override {
        return std::make_shared<LinuxCaptureDevice>(_context);
    }

  private:
    const std::shared_ptr<const CaptureContext> _context;
};

}  // namespace

std::shared_ptr<WLISPCapturePlugIn> makeCapturePlugIn(CaptureContext context) {
    return std::make_shared<PlugIn>(std::move(context));
}

}  // namespace linux_device
