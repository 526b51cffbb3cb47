#include "devices/simulator/capture_service.h"

#include <algorithm>
#include <atomic>
#include <utility>
#include <vector>

#include "devices/simulator/capture_stream.h"

namespace simulator {

namespace {

// One client's connection to the device.
class SimulatedDevice final : public WLRylCaptureDevice {
  public:
    explicit SimulatedDevice(const std::shared_ptr<const CaptureContext>& context)
        : _context(context) {
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
        if (_invalidated || _context->profile.streamList.strikes(error)) {
            return std::nullopt;
        }
        return WLRylCaptureStreamList(_streams.begin(), _streams.end());
    }

    bool requestControlOfStreams(const WLRylCaptureStreamList& streams,
                                 platform::ErrorSlot error) override {
        return !_invalidated &&
               std::all_of(streams.begin(), streams.end(), [&](const auto& requested) {
                   const auto own = std::find(_streams.begin(), _streams.end(), requested);
                   return own != _streams.end() && (*own)->grantControl(error);
               });
    }

    bool invalidate(platform::ErrorSlot error) override {
        if (_invalidated || _context->profile.invalidate.strikes(error)) {
            return false;
        }
        _invalidated = true;
        for (const auto& stream : _streams) {
            stream->invalidate();
        }
        return true;
    }

  private:
    const std::shared_ptr<const CaptureContext> _context;
    std::vector<std::shared_ptr<SimulatedStream>> _streams;
    std::atomic<bool> _invalidated{false};  // any thread may ask
};

class PlugIn final : public WLISPCapturePlugIn {
  public:
    explicit PlugIn(std::shared_ptr<const CaptureContext> context) : _context(std::move(context)) {}

    std::shared_ptr<WLRylCaptureDevice> device(platform::ErrorSlot error) override {
        if (_context->profile.device.strikes(error)) {
            return nullptr;
        }
        return std::make_shared<SimulatedDevice>(_context);
    }

  private:
    const std::shared_ptr<const CaptureContext> _context;
};

}  // namespace

std::shared_ptr<WLISPCapturePlugIn> makeCapturePlugIn(CaptureProfile profile,
                                                      double speed,
                                                      std::shared_ptr<StreamProgress> progress) {
    if (!profile.plugIn) {
        return nullptr;
    }
    return std::make_shared<PlugIn>(std::make_shared<const CaptureContext>(
        CaptureContext{std::move(profile), speed, std::move(progress)}));
}

}  // namespace simulator
