#include <filesystem>
#include <string>
#include <vector>

#include <gmock/gmock.h>

#include "frame/host_interface.h"
#include "host/record/problem.h"
#include "host/run/module_loader.h"
#include "host/run/planner.h"

namespace {

using testing::ElementsAre;
using testing::HasSubstr;
using testing::Pair;

std::string load(const std::string& path) {
    try {
        host::loadModule(path);
        return "loaded";
    } catch (const host::Problem& problem) {
        return problem.what();
    }
}

std::string broken(const std::string& name) {
    return std::string(ZR_BROKEN_MODULES) + "/" + name;
}

TEST(Module, RegistersItsTableInOrder) {
    ASSERT_EQ(load(ZR_PLUGIN), "loaded");
    const ZRLab& lab = ZRLab::defaultLab();
    EXPECT_THAT(
        lab.experimentNames(),
        ElementsAre("VantorMeterixExperiment", "VantorFaultExperiment", "KirraImageExperiment"));
    EXPECT_THAT(lab.analysisNames(), ElementsAre("VantorMeterixAnalysis", "VantorFaultAnalysis"));
    std::vector<std::vector<std::string>> diagnostics;
    for (const auto& one : lab.diagnostics()) {
        diagnostics.push_back({one.name, one.summary, one.experimentName, one.analysisName});
    }
    EXPECT_THAT(
        diagnostics,
        ElementsAre(
            ElementsAre("VantorMeterixDiagnostic",
                        "Measure the important Vantor Meterixs and ensure they are all present.",
                        "VantorMeterixExperiment", "VantorMeterixAnalysis"),
            ElementsAre(
                "VantorFaultDiagnostic",
                "Perform a 30fps Dense-Intereleaved stream and capture Q71ISP Meterix delta.",
                "VantorFaultExperiment", "VantorFaultAnalysis")));
    EXPECT_TRUE(lab.refusals().empty());
    for (const std::string& name : lab.experimentNames()) {
        EXPECT_NE(lab.makeExperiment(name), lab.makeExperiment(name)) << name;
    }
    // The optional protocols are found across the module's edge.
    const auto implements = [&lab](const char* name) {
        const auto experiment = lab.makeExperiment(name);
        return std::pair(dynamic_cast<ZRSetup*>(experiment.get()) != nullptr,
                         dynamic_cast<ZRTeardown*>(experiment.get()) != nullptr);
    };
    EXPECT_THAT(implements("VantorMeterixExperiment"), Pair(false, false));
    EXPECT_THAT(implements("VantorFaultExperiment"), Pair(true, true));
    EXPECT_THAT(implements("KirraImageExperiment"), Pair(true, false));

    EXPECT_EQ(load(ZR_PLUGIN), "loaded");  // a second time does nothing
    EXPECT_EQ(lab.experimentNames().size(), 3U);
}

TEST(Module, DeclaresItsParameters) {
    ASSERT_EQ(load(ZR_PLUGIN), "loaded");
    const auto declared = [](host::Part part, const char* name) {
        const auto description = host::describePart(ZRLab::defaultLab(), part, name);
        std::vector<std::string> lines{description->summary()};
        for (const auto& [parameter, declaration] : description->parameters()) {
            lines.push_back(parameter + (declaration.required() ? "! " : "? ") +
                            declaration.summary());
        }
        return lines;
    };
    using host::Part;
    EXPECT_THAT(declared(Part::Experiment, "VantorMeterixExperiment"),
                ElementsAre("Check for any Vantor IO  Reports."));
    EXPECT_THAT(
        declared(Part::Experiment, "VantorFaultExperiment"),
        ElementsAre("Stream the vantor camera in dense interleave for the requested duration.",
                    "frameCount! The number of frames to capture.",
                    "timeout! The max time to wait for frameCount, in seconds."));
    EXPECT_THAT(declared(Part::Analysis, "VantorFaultAnalysis"),
                ElementsAre("Analyse the results of a Vantor Stream with Meterix capture.",
                            "frameCount! The minimum number of frames required in this analysis."));
    EXPECT_THAT(declared(Part::Experiment, "KirraImageExperiment"),
                ElementsAre("Stream Kirra in active mode and capture frames.",
                            "images! The number of frames to capture.",
                            "timeout! The timeout in seconds."));
}

TEST(Module, ANameThatIsTakenIsRefusedAndRemembered) {
    ASSERT_EQ(load(ZR_PLUGIN), "loaded");
    EXPECT_EQ(load(broken("refused.so")), "loaded");
    const auto refusals = ZRLab::defaultLab().refusals();
    ASSERT_EQ(refusals.size(), 1U);
    EXPECT_EQ(refusals[0].name, "VantorFaultExperiment");
    EXPECT_NE(ZRLab::defaultLab().makeExperiment("VantorFaultExperiment"), nullptr);
}

TEST(Module, BrokenOnesAreNamedWithTheReason) {
    EXPECT_EQ(load("/no/such.so"), "plug-in module /no/such.so: no such file");
    EXPECT_EQ(load(ZR_BROKEN_MODULES),
              "plug-in module " + std::string(ZR_BROKEN_MODULES) + ": not a file");
    EXPECT_THAT(load(ZR_NOT_A_MODULE), HasSubstr("cannot be loaded: "));
    EXPECT_THAT(load(broken("unresolved.so")), HasSubstr("nobodyHasThisFunction"));
    EXPECT_EQ(load(broken("silent.so")),
              "plug-in module " + broken("silent.so") + ": it registers nothing");
}

}  // namespace
