#include "kirra/image_experiment.h"

#include <algorithm>
#include <cstdint>
#include <new>
#include <optional>
#include <string>
#include <string_view>
#include <utility>

#include "platform/display.h"
#include "platform/services.h"

namespace {

constexpr std::string_view kImages = "images";
constexpr std::string_view kTimeout = "timeout";
constexpr std::string_view kDomain = ZRKirraImageExperimentErrorDomain;
// Room for so many images is made beforehand; a list that grows is copied again and again.
constexpr std::uint64_t kMostExpected = 16'384;
constexpr std::string_view kNoRunLoop = "Kirra is a HID device that requires a current run loop.";

// Keys of an image's dictionary.
constexpr platform::StringKey kFrameID("frameID");
constexpr platform::StringKey kDScanI("dScanI");
constexpr platform::StringKey kDScanQ("dScanQ");
constexpr platform::StringKey kTmonDataInC("tmonDataInC");
constexpr platform::StringKey kTimestampInMilliseconds("timestampInMilliseconds");

// Why the display does not count as powered; empty when it does.
std::string_view displayProblem() {
    const platform::Services services = platform::services();
    platform::DisplayId display = 0;
    if (services.display == nullptr || services.display->mainDisplay(display) != 0) {
        return "Could not get the main display to determine device power state.";
    }
    const platform::RegistryObject object = services.display->registryObject(display);
    if (object == 0) {
        return "Could not get the frame buffer to determine device power state.";
    }
    platform::Value property;
    if (services.registry != nullptr) {
        property = services.registry->property(object, platform::kDisplayDebugInfo);
    }
    const platform::Value& powered =
        property[platform::kDisplayPowerInfo][platform::kDisplayPowerInfoPanel];
    if (!powered.isPresent()) {
        return "Could not find the display power state.";
    }
    return powered.asNumber().isTrue() ? "" : "The display is not powered.";
}

platform::Dictionary dictionaryOf(const ZRKirraMendraImage& image) {
    platform::MutableDictionary entries;
    entries.reserve(5);
    entries.set(kFrameID, image.frameID());
    entries.set(kDScanI, image.dScanI());
    entries.set(kDScanQ, image.dScanQ());
    entries.set(kTmonDataInC, image.tmonDataInC());
    entries.set(kTimestampInMilliseconds, image.timestampInMilliseconds());
    return entries;
}

// Observes a run loop as long as it lives.
class Observation {
  public:
    Observation(platform::RunLoop& runLoop, std::shared_ptr<platform::RunLoopObserver> observer)
        : _runLoop(runLoop), _observer(std::move(observer)) {
        _runLoop.addObserver(_observer, platform::kRunLoopCommonModes);
    }
    ~Observation() { _runLoop.removeObserver(_observer, platform::kRunLoopCommonModes); }
    Observation(const Observation&) = delete;
    Observation& operator=(const Observation&) = delete;

  private:
    platform::RunLoop& _runLoop;
    const std::shared_ptr<platform::RunLoopObserver> _observer;
};

}  // namespace

ZRDescription ZRKirraImageExperiment::experimentDescription() const {
    auto description =
        ZRDescription::descriptionWithSummary("Stream Kirra in active mode and capture frames.");
    description.addParameter(ZRNumberParameter("The number of frames to capture.", true),
                             std::string(kImages));
    description.addParameter(ZRNumberParameter("The timeout in seconds.", true),
                             std::string(kTimeout));
    return description;
}

bool ZRKirraImageExperiment::setupWithParameters(const platform::Dictionary& parameters,
                                                 ZRDiagnosticHost* /*host*/,
                                                 platform::ErrorSlot error) {
    if (!_displayIsPowered(error)) {
        return false;
    }
    const auto runLoop = platform::RunLoop::current();
    _runLoop = runLoop;
    if (runLoop == nullptr) {
        return platform::fail(error, kDomain, 1, nullptr, "%@", kNoRunLoop);
    }
    _imagesToCapture = parameters.number(kImages).as<std::uint64_t>();
    _timeoutInSeconds = parameters.number(kTimeout).as<std::uint64_t>();
    return true;
}

bool ZRKirraImageExperiment::_displayIsPowered(platform::ErrorSlot error) {
    const std::string_view problem = displayProblem();
    if (!problem.empty()) {
        return platform::fail(error, kDomain, 2, nullptr, "%@", problem);
    }
    return true;
}

ZRExperimentResultRef ZRKirraImageExperiment::run(platform::ErrorSlot error) {
    const auto runLoop = _runLoop.lock();
    if (runLoop == nullptr || runLoop != platform::RunLoop::current()) {
        return platform::fail(error, kDomain, 1, nullptr, "%@", kNoRunLoop);
    }
    try {
        _stream = std::make_shared<ZRKirraImageStream>();
    } catch (const std::bad_alloc&) {
        return platform::fail(error, kDomain, 3, nullptr, "Failed to create kirra stream.");
    }
    _images.reserve(std::min(_imagesToCapture, kMostExpected));
    _stream->setDelegate(shared_from_this());
    if (!_stream->openWithRunLoop(runLoop, error)) {
        return nullptr;
    }
    if (_runObserved(*runLoop) == platform::RunLoopOutcome::TimedOut) {
        return platform::fail(error, kDomain, 6, nullptr, "Timed out after %lu seconds.",
                              _timeoutInSeconds);
    }
    if (_asyncError != nullptr) {
        return platform::failWith(error, _asyncError);
    }
    return _buildResult();
}

platform::RunLoopOutcome ZRKirraImageExperiment::_runObserved(platform::RunLoop& runLoop) {
    std::optional<Observation> exit;
    try {
        exit.emplace(runLoop, _makeExitObserver());
    } catch (...) {
        _disconnect();  // without the observer no exit does it
        throw;
    }
    return runLoop.run(platform::kRunLoopDefaultMode, static_cast<double>(_timeoutInSeconds));
}

// Disconnects and closes the sensor on every way out of the run loop.
std::shared_ptr<platform::RunLoopObserver> ZRKirraImageExperiment::_makeExitObserver() {
    auto observer = std::make_shared<platform::RunLoopObserver>();
    observer->activities = platform::RunLoopAllActivities;
    observer->order = 0;
    observer->callback = [weak = weak_from_this()](std::uint32_t activity) {
        const auto self = weak.lock();
        if (self != nullptr && (activity & platform::RunLoopExit) != 0) {
            self->_disconnect();
        }
    };
    return observer;
}

void ZRKirraImageExperiment::_disconnect() {
    _stream->setDelegate(nullptr);
    _stream->close();
}

ZRExperimentResultRef ZRKirraImageExperiment::_buildResult() const {
    auto result = std::make_shared<ZRExperimentResult>();
    platform::MutableList images;
    images.reserve(_images.size());
    for (const ZRKirraMendraImage& image : _images) {
        images.emplace_back(dictionaryOf(image));
    }
    result->auxiliaryData().set(kImages, platform::List(std::move(images)));
    return result;
}

void ZRKirraImageExperiment::handleImage(ZRKirraMendraImage image) {
    _images.push_back(std::move(image));
    if (_images.size() >= _imagesToCapture) {
        if (const auto runLoop = _runLoop.lock()) {
            runLoop->stop();
        }
    }
}

void ZRKirraImageExperiment::streamDidError(const platform::ErrorRef& error) {
    _asyncError = error;
    if (const auto runLoop = _runLoop.lock()) {
        runLoop->stop();
    }
}
