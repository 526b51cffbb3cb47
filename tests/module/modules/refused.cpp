// A module that registers names that another module has taken, and that exports a weak symbol.
#include "frame/host_interface.h"

extern "C" [[gnu::weak]] int takenModule() {
    return 0;
}

namespace {

[[gnu::constructor]] void registerWithLab() {
    ZRLab::defaultLab().addExperimentWithName("VantorFaultExperiment",
                                              [] { return std::shared_ptr<ZRExperiment>(); });
}

}  // namespace
