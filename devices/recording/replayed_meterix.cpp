#include <utility>

#include "devices/recording/argument_values.h"
#include "devices/recording/replayed.h"

namespace recording {

namespace {

using platform::ErrorSlot;
using platform::MeterixChannels;
using platform::MeterixSamples;

class ReplayedMeterix final : public platform::MeterixFacility {
  public:
    explicit ReplayedMeterix(ScriptRef script) : _script(std::move(script)) {}

    std::shared_ptr<const MeterixChannels> simpleChannels(ErrorSlot error) override {
        return channelsOf(_script->take(Operation::SimpleChannels, 0, {}, error));
    }
    std::shared_ptr<const MeterixSamples> sample(const MeterixChannels& channels,
                                                 ErrorSlot error) override {
        return samplesOf(_script->take(Operation::Sample, 0, channelsValue(channels), error));
    }
    std::shared_ptr<const MeterixSamples> difference(const MeterixSamples& later,
                                                     const MeterixSamples& baseline,
                                                     ErrorSlot error) override {
        return samplesOf(_script->take(Operation::Difference, 0,
                                       platform::List{countsValue(later), countsValue(baseline)},
                                       error));
    }

  private:
    const ScriptRef _script;
};

}  // namespace

std::shared_ptr<platform::MeterixFacility> replayMeterix(ScriptRef script) {
    return std::make_shared<ReplayedMeterix>(std::move(script));
}

}  // namespace recording
