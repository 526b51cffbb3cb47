// What the tests of the sensor image capture stand on: a simulated HID bus whose every call is
// written down, and a check after every test that nothing was misused.
#ifndef ZR_TESTS_KIRRA_KIRRA_BENCH_H
#define ZR_TESTS_KIRRA_KIRRA_BENCH_H

#include <memory>
#include <optional>
#include <string>
#include <string_view>
#include <vector>

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "devices/observed/observer.h"
#include "devices/simulator/display_service.h"
#include "devices/simulator/hid_sensor.h"
#include "kirra/image_experiment.h"
#include "kirra/image_stream.h"
#include "platform/run_loop.h"
#include "platform/services.h"
#include "tests/support/is_error.h"

namespace test {

using Journal = std::vector<std::string>;

// The calls of an open that succeeds, and of one close.
extern const Journal kOpening;
extern const Journal kClosing;

// What the bus notes down.
struct Tap {
    Journal journal;
    WLHIDInputReportCallback callback;  // the last one
};

Journal joined(Journal first, const Journal& second);

platform::ErrorRef sensorError(std::string_view text);

class KirraTest : public ::testing::Test {
  protected:
    ~KirraTest() override { platform::installServices({}); }

    simulator::HidDeviceProfile& sensor() { return hid.devices.at(1); }

    // Makes the profiles the installed device and starts a new journal.
    void install();

    // An experiment that was set up on this thread.
    std::shared_ptr<ZRKirraImageExperiment> make(platform::Number images, platform::Number timeout);
    // Installs, runs an experiment and returns its images; the run's error ends up in `error`.
    // Nothing when there is no result.
    std::optional<platform::List> run(platform::Number images, platform::Number timeout);

    // The callback that was installed last, as the sensor would call it.
    const WLHIDInputReportCallback& callback() const { return _tap->callback; }

    simulator::HidProfile hid = simulator::healthyHid();
    simulator::DisplayProfile display = simulator::DisplayProfile{};
    std::shared_ptr<platform::RunLoop> runLoop = platform::RunLoop::forThisThread();
    Journal& journal() { return _tap->journal; }
    platform::ErrorRef error;

  private:
    struct Witness final : observed::Observer {
        void misused(std::string_view what) override { ADD_FAILURE() << what; }
    };
    std::shared_ptr<Witness> _witness = std::make_shared<Witness>();
    std::shared_ptr<Tap> _tap;
};

}  // namespace test

#endif
