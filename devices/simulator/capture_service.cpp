#include "devices/simulator/capture_service.h"

#include <algorithm>
#include <chrono>
#include <utility>

#include "devices/simulator/capture_stream.h"
#include "platform/deadline.h"
#include "platform/text_format.h"

namespace simulator {

namespace {

constexpr std::chrono::seconds kBufferGrace{1};

// One client's connection to the device.
class SimulatedDevice final : public WLRylCaptureDevice {
  public:
    explicit SimulatedDevice(const std::shared_ptr<CaptureContext>& context) : _context(context) {
        for (const StreamProfile& profile : context->profile.streams) {
            _streams.push_back(std::make_shared<SimulatedStream>(context, profile));
        }
    }
    SimulatedDevice(const SimulatedDevice&) = delete;
    SimulatedDevice& operator=(const SimulatedDevice&) = delete;

    // Possibly inside a handler: never waits.
    ~SimulatedDevice() override {
        for (const auto& stream : _streams) {
            stream->abandon();
        }
    }

    std::optional<WLRylCaptureStreamList> streams(platform::ErrorSlot error) override {
        if (!_isUsable("its streams") || _context->profile.streamList.strikes(error)) {
            return std::nullopt;
        }
        return WLRylCaptureStreamList(_streams.begin(), _streams.end());
    }

    bool requestControlOfStreams(const WLRylCaptureStreamList& streams,
                                 platform::ErrorSlot error) override {
        return _isUsable("control") &&
               std::all_of(streams.begin(), streams.end(), [&](const auto& requested) {
                   const auto own = std::find(_streams.begin(), _streams.end(), requested);
                   return own != _streams.end() && (*own)->grantControl(error);
               });
    }

    bool invalidate(platform::ErrorSlot error) override {
        if (!_isUsable("its invalidation") || _context->profile.invalidate.strikes(error)) {
            return false;
        }
        _invalidated = true;
        for (const auto& stream : _streams) {
            stream->invalidate();
        }
        return true;
    }

  private:
    bool _isUsable(std::string_view what) {
        if (_invalidated) {
            _context->misused(
                platform::format("a device was asked for %@ after it was invalidated", what));
        }
        return !_invalidated;
    }

    const std::shared_ptr<CaptureContext> _context;
    std::vector<std::shared_ptr<SimulatedStream>> _streams;
    bool _invalidated = false;
};

class PlugIn final : public SimulatedCapture {
  public:
    explicit PlugIn(std::shared_ptr<CaptureContext> context) : _context(std::move(context)) {}
    PlugIn(const PlugIn&) = delete;
    PlugIn& operator=(const PlugIn&) = delete;

    ~PlugIn() override {
        // Receipts that are queued still give theirs back.
        const auto held = _context->liveBuffers.drain(platform::deadlineAfter(kBufferGrace));
        if (held > 0) {
            _context->misused(platform::format("%@ image buffers were never given back", held));
        }
    }

    std::shared_ptr<WLRylCaptureDevice> device(platform::ErrorSlot error) override {
        if (_context->profile.device.strikes(error)) {
            return nullptr;
        }
        return std::make_shared<SimulatedDevice>(_context);
    }

    std::size_t liveBuffers() const override { return _context->liveBuffers.count(); }

  private:
    const std::shared_ptr<CaptureContext> _context;
};

}  // namespace

std::shared_ptr<WLISPCapturePlugIn> makeCapturePlugIn(CaptureProfile profile,
                                                      double speed,
                                                      std::shared_ptr<StreamProgress> progress,
                                                      std::weak_ptr<observed::Observer> observer) {
    if (!profile.plugIn) {
        return nullptr;
    }
    return std::make_shared<PlugIn>(std::make_shared<CaptureContext>(
        std::move(profile), speed, std::move(progress), std::move(observer)));
}

}  // namespace simulator
