// The counters that a device without faults publishes: sixty of the projector module, all at zero,
// and others around them that a reader must leave out.
#include <string>
#include <string_view>
#include <vector>

#include "devices/simulator/profile/meterix_profile.h"

namespace simulator {

namespace {

constexpr std::string_view kGroup = "Q71ISP";
constexpr std::string_view kSubgroup = "Q71ISP Events";

struct Family {
    std::string_view prefix;
    std::vector<std::string_view> counters;
};

std::vector<Family> projectorFamilies() {
    return {
        {"Number Xel INT_",
         {"ADC_READY_LATCH",
          "BBSAT_LATCH",
          "FAULT_BBA_OVC_LATCH",
          "FAULT_BBA_OVP_LATCH",
          "FAULT_BBA_OVV_LATCH",
          "FAULT_BBA_UDC_LATCH",
          "FAULT_BBA_WDG_SFST_LATCH",
          "FAULT_BBB_OVC_LATCH",
          "FAULT_BBB_OVP_LATCH",
          "FAULT_BBB_OVV_LATCH",
          "FAULT_BBB_UDC_LATCH",
          "FAULT_BBB_WDG_SFST_LATCH",
          "FAULT_CC",
          "FAULT_LS_OVC_LATCH",
          "FAULT_LVT_LATCH",
          "FAULT_MAXDC_CLKLP_BBA_LATCH",
          "FAULT_MAXDC_CLKLP_BBB_LATCH",
          "FAULT_MAXDC_CLKSAF_BBA_LATCH",
          "FAULT_MAXDC_CLKSAF_BBB_LATCH",
          "FAULT_MAXPC_LATCH",
          "FAULT_MAXPW_CLKLP_BBA_LATCH",
          "FAULT_MAXPW_CLKLP_BBB_LATCH",
          "FAULT_MAXPW_CLKSAF_BBA_LATCH",
          "FAULT_MAXPW_CLKSAF_BBB_LATCH",
          "FAULT_OTP_LATCH",
          "FAULT_SHORTANODE_ACT_LATCH",
          "FAULT_SHORTANODE_LATCH",
          "FAULT_STBYDLY_LATCH",
          "FAULT_STROBE_SHORT_LATCH",
          "FAULT_TAMP_LATCH",
          "FAULT_THROT_LATCH",
          "FAULT_THSD_LATCH",
          "FAULT_TSD_WARN_LATCH",
          "FAULT_VINUVLO_LATCH",
          "FAULT_VIN_OVV_LATCH",
          "FAULT_XEF0",
          "FAULT_XEF1",
          "I2CWDG_LATCH",
          "MODE1_LATCH",
          "SUPPLY_LATCH"}},
        {"Number MB ",
         {"ARM_MB_NOREAD", "ARM_MB_STATE", "EN_FORCE_LOW", "EN_PIN_STATE", "MODID_ECC_ERR",
          "MRI_ECC_ERR", "MRI_ECC_ERR_FATAL", "NON_ZERO_PASS_KEY", "PASS_KEY_ECC_ERR",
          "PASS_KEY_ECC_ERR_FATAL"}},
        {"Number YB ",
         {"FAULT_A", "FAULT_B", "FAULT_C", "FAULT_D", "FAULT_E", "FAULT_NVM", "FAULT_UV",
          "FAULT_OV"}},
        {"Number ", {"Qorn NTC", "Fesk NTC"}},
    };
}

}  // namespace

MeterixProfile healthyMeterix() {
    MeterixProfile profile;
    // Published by others, or by the same group under another subgroup: not the projector's, although
    // some look like it.
    profile.channels = {
        {"CPU", "CPU Core Performance States", "V0P0", 7},
        {"Q71ISP", "Q71ISP Frames", "Number Frames Out", 12},
        {"Q71ISP", "Q71ISP Event", "Number Wakes", 3},
        {"q71isp", "q71isp events", "Number Lower Case", 1},
    };
    for (const Family& family : projectorFamilies()) {
        for (const std::string_view counter : family.counters) {
            profile.channels.push_back({std::string(kGroup), std::string(kSubgroup),
                                        std::string(family.prefix) + std::string(counter)});
        }
    }
    return profile;
}

}  // namespace simulator
