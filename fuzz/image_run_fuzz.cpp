// Reports, errors, silence and stops on a run loop, in any order: the experiment's outcome is the one that
// they add up to, with the images in the order in which they came, and the sensor is closed.
//
// Input: how many images are wanted, how the script ends (u: the sensor is unplugged, t: time passes), then
// i an image, l a longer one, h a short one and its length, o a report of another ID, e an error, x a stop by
// others, . the end of the turn, w the same and then a second of silence.
#include "fuzz/clock.h"
#include "fuzz/expect.h"
#include "fuzz/input.h"
#include "fuzz/loop_sensor.h"
#include "kirra/image_experiment.h"

namespace {

using fuzz::expect;

constexpr int kTimeout = 5;  // seconds

class Script {
  public:
    explicit Script(fuzz::Input input)
        : _input(input), wanted(_input.below(8)), ends(_input.letter("ut")) {}

    // The reports of a turn. They use one callback, as those of a sensor's queue do, also those that come
    // after an error has closed the stream.
    void turn() {
        const WLHIDInputReportCallback report = sensor->callback;
        const auto source = sensor->source;
        while (!_input.isAtEnd()) {
            switch (_input.letter("ilhoex.w")) {
                case 'i':
                    _image(report, KirraImage::kSize);
                    break;
                case 'l':
                    _image(report, KirraImage::kSize + 1 + _input.below(64));
                    break;
                case 'h':
                    report(118,
                           fuzz::reportBytes(KirraImage::kSize - 1 - 3 * _input.below(256), 118, 7),
                           nullptr);
                    break;
                case 'o':
                    report(117, fuzz::reportBytes(KirraImage::kSize, 117, 7), nullptr);
                    break;
                case 'e':
                    error = std::make_shared<const platform::Error>("sensor", 1, "fuzz");
                    isStopped = true;
                    report(118, fuzz::reportBytes(KirraImage::kSize, 118, 7), error);
                    expect(sensor->callback == nullptr && sensor->source == nullptr &&
                               sensor->isClosed,
                           "closed by an error");
                    break;
                case 'x':
                    isStopped = true;
                    runLoop->stop();
                    break;
                case '.':
                    source->signal();
                    return _endTurn();
                case 'w':
                    return _endTurn();
            }
        }
        if (ends == 'u') {
            runLoop->removeSource(source, platform::kRunLoopDefaultMode);
            return;
        }
        _endTurn();
    }

    void silence() {
        expect(!isStopped && !isLate, "nothing ends the run");
        seconds += _input.isAtEnd() ? kTimeout : 1;
        fuzz::setNow(seconds);
        if (!_input.isAtEnd()) {
            sensor->source->signal();
        }
        isLate = _input.isAtEnd();
    }

  private:
    fuzz::Input _input;

    void _image(const WLHIDInputReportCallback& report, std::size_t length) {
        images.push_back(++frame);
        isStopped = isStopped || images.size() >= wanted;
        report(118, fuzz::reportBytes(length, 118, frame), nullptr);
    }
    void _endTurn() { isLate = !isStopped && seconds >= kTimeout; }

  public:
    const std::size_t wanted;
    const char ends;
    const std::shared_ptr<platform::RunLoop> runLoop = platform::RunLoop::forThisThread();
    const std::shared_ptr<fuzz::LoopSensor> sensor = fuzz::installLoopSensor();

    // What the run is to end with.
    bool isStopped = false;
    bool isLate = false;
    platform::ErrorRef error;
    std::vector<std::uint32_t> images;

    int seconds = 0;
    std::uint32_t frame = 0;
};

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
    fuzz::setClock({});
    Script script(fuzz::Input(data, size));
    script.sensor->turn = [&script] { script.turn(); };
    const auto observer = std::make_shared<platform::RunLoopObserver>();
    *observer = {platform::RunLoopBeforeWaiting, 0,
                 [&script](std::uint32_t /*activity*/) { script.silence(); }};
    script.runLoop->addObserver(observer, platform::kRunLoopDefaultMode);

    const auto experiment = std::make_shared<ZRKirraImageExperiment>();
    expect(experiment->setupWithParameters({{"images", script.wanted}, {"timeout", kTimeout}},
                                           nullptr, nullptr),
           "setup");
    platform::ErrorRef error;
    const auto result = experiment->run(&error);
    script.runLoop->removeObserver(observer, platform::kRunLoopDefaultMode);

    expect(script.sensor->callback == nullptr && script.sensor->isClosed, "closed in the end");
    expect((result == nullptr) == (script.isLate || script.error != nullptr), "a result");
    if (script.isLate) {
        expect(error->code() == 6 && error->localizedDescription() == "Timed out after 5 seconds.",
               "late");
    } else if (script.error != nullptr) {
        expect(error == script.error, "the last error itself");
    } else {
        std::vector<std::uint32_t> frames;
        for (const platform::Value& image : *result->auxiliaryData().find("images")->list()) {
            frames.push_back(image["frameID"].asNumber().as<std::uint32_t>());
        }
        expect(frames == script.images, "every image, in order");
    }
    return 0;
}
