// A device module with one kind, "fixed-counters": devices whose event counters never move. They have
// counters and nothing else, so a diagnostic that streams fails on them with an error that says so.
#include <cstdint>
#include <memory>
#include <sstream>
#include <stdexcept>
#include <string>
#include <string_view>
#include <utility>
#include <vector>

#include "devices/device.h"
#include "platform/welkin/meterix.h"

namespace {

// A device of this kind: one counter's count; the others stand at zero.
struct Model {
    std::string_view name;
    std::string_view summary;
    std::string_view counter = {};
    std::int64_t count = 0;
};

constexpr Model kModels[] = {
    {"zeros", "Every event counter stands at zero"},
    {"one-event", "One under-voltage was counted", "Number YB FAULT_UV", 1},
};

// The sixty counters: what begins each name of a family, and how the names go on.
constexpr std::pair<const char*, const char*> kFamilies[] = {
    {"Number Xel INT_",
     "ADC_READY_LATCH BBSAT_LATCH FAULT_BBA_OVC_LATCH FAULT_BBA_OVP_LATCH FAULT_BBA_OVV_LATCH "
     "FAULT_BBA_UDC_LATCH FAULT_BBA_WDG_SFST_LATCH FAULT_BBB_OVC_LATCH FAULT_BBB_OVP_LATCH "
     "FAULT_BBB_OVV_LATCH FAULT_BBB_UDC_LATCH FAULT_BBB_WDG_SFST_LATCH FAULT_CC "
     "FAULT_LS_OVC_LATCH FAULT_LVT_LATCH FAULT_MAXDC_CLKLP_BBA_LATCH "
     "FAULT_MAXDC_CLKLP_BBB_LATCH FAULT_MAXDC_CLKSAF_BBA_LATCH FAULT_MAXDC_CLKSAF_BBB_LATCH "
     "FAULT_MAXPC_LATCH FAULT_MAXPW_CLKLP_BBA_LATCH FAULT_MAXPW_CLKLP_BBB_LATCH "
     "FAULT_MAXPW_CLKSAF_BBA_LATCH FAULT_MAXPW_CLKSAF_BBB_LATCH FAULT_OTP_LATCH "
     "FAULT_SHORTANODE_ACT_LATCH FAULT_SHORTANODE_LATCH FAULT_STBYDLY_LATCH "
     "FAULT_STROBE_SHORT_LATCH FAULT_TAMP_LATCH FAULT_THROT_LATCH FAULT_THSD_LATCH "
     "FAULT_TSD_WARN_LATCH FAULT_VINUVLO_LATCH FAULT_VIN_OVV_LATCH FAULT_XEF0 FAULT_XEF1 "
     "I2CWDG_LATCH MODE1_LATCH SUPPLY_LATCH"},
    {"Number MB ",
     "ARM_MB_NOREAD ARM_MB_STATE EN_FORCE_LOW EN_PIN_STATE MODID_ECC_ERR MRI_ECC_ERR "
     "MRI_ECC_ERR_FATAL NON_ZERO_PASS_KEY PASS_KEY_ECC_ERR PASS_KEY_ECC_ERR_FATAL"},
    {"Number YB ", "FAULT_A FAULT_B FAULT_C FAULT_D FAULT_E FAULT_NVM FAULT_UV FAULT_OV"},
    {"Number Qorn ", "NTC"},
    {"Number Fesk ", "NTC"},
};

// A facility without state that changes, so any thread may call it without a lock.
class FixedCounters final : public platform::MeterixFacility {
  public:
    explicit FixedCounters(const Model& model) : _model(model) {
        auto channels = std::make_shared<platform::MeterixChannels>();
        for (const auto& [prefix, names] : kFamilies) {
            std::istringstream words(names);
            for (std::string word; words >> word;) {
                channels->push_back(std::make_shared<const WLMeterixChannelDescription>(
                    prefix + word, "Q71ISP", "Q71ISP Events"));
            }
        }
        _channels = std::move(channels);
    }

    std::shared_ptr<const platform::MeterixChannels> simpleChannels(
        platform::ErrorSlot /*error*/) override {
        return _channels;
    }

    std::shared_ptr<const platform::MeterixSamples> sample(
        const platform::MeterixChannels& channels, platform::ErrorSlot /*error*/) override {
        auto samples = std::make_shared<platform::MeterixSamples>();
        for (const WLMeterixChannelDescriptionRef& channel : channels) {
            const std::int64_t count = channel->name() == _model.counter ? _model.count : 0;
            samples->emplace_back(WLMeterixChannel(channel, count));
        }
        return samples;
    }

    std::shared_ptr<const platform::MeterixSamples> difference(
        const platform::MeterixSamples& later,
        const platform::MeterixSamples& /*baseline*/,
        platform::ErrorSlot /*error*/) override {
        auto samples = std::make_shared<platform::MeterixSamples>();
        for (const WLMeterixSample& sample : later) {
            const auto& channel = sample.channel().sharedDescription();
            samples->emplace_back(WLMeterixChannel(channel, std::int64_t{0}));
        }
        return samples;
    }

  private:
    const Model& _model;
    std::shared_ptr<const platform::MeterixChannels> _channels;
};

std::vector<devices::Entry> list() {
    std::vector<devices::Entry> entries;
    for (const Model& model : kModels) {
        entries.push_back({std::string(model.name), std::string(model.summary)});
    }
    return entries;
}

// The first model when none is named.
devices::Device open(const devices::Request& request) {
    for (const Model& model : kModels) {
        if (request.what.empty() || request.what == model.name) {
            return {.name = std::string(model.name),
                    .summary = std::string(model.summary),
                    .facts = {{"platform", "fixed counters"}},
                    .services = {.meterix = std::make_shared<FixedCounters>(model)}};
        }
    }
    throw std::invalid_argument("fixed-counters: no device \"" + request.what + "\"");
}

// Runs once, when zrlab loads the module.
[[gnu::constructor]] void registerKind() {
    devices::registerKind({.name = "fixed-counters",
                           .summary = "Devices whose event counters never move",
                           .list = list,
                           .open = open});
}

}  // namespace
