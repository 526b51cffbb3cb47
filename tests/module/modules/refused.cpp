// A module that registers names that another module has taken.
#include "frame/host_interface.h"

namespace {

[[gnu::constructor]] void registerWithLab() {
    ZRLab::defaultLab().addExperimentWithName("VantorFaultExperiment",
                                              [] { return std::shared_ptr<ZRExperiment>(); });
}

}  // namespace
