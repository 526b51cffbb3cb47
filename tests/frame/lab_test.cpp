#include <memory>
#include <string>
#include <vector>

#include <gtest/gtest.h>

#include "frame/host_interface.h"

namespace {

class EmptyExperiment final : public ZRExperiment {
  public:
    explicit EmptyExperiment(std::string summary) : _summary(std::move(summary)) {}
    ZRDescription experimentDescription() const override { return ZRDescription(_summary); }
    ZRExperimentResultRef run(platform::ErrorSlot) override { return nullptr; }

  private:
    std::string _summary;
};

ZRLab::ExperimentFactory factory(const std::string& summary) {
    return [summary] { return std::make_shared<EmptyExperiment>(summary); };
}

// Reports and stores know units and domains by these texts.
TEST(HostInterface, NamesItsUnitsAndDomains) {
    EXPECT_EQ(ZRDimensionlessUnit::events().symbol(), "events");
    EXPECT_EQ(ZRDimensionlessUnit::frames().symbol(), "frames");
    EXPECT_EQ(ZRDimensionlessUnit::errors().symbol(), "errors");
    EXPECT_EQ(ZRErrorDomain, "ZRErrorDomain");
    EXPECT_EQ(ZRCapturePlugInErrorDomain, "ZRCapturePlugInErrorDomain");
    EXPECT_EQ(ZRMeterixErrorDomain, "ZRMeterixErrorDomain");
    EXPECT_EQ(ZRKirraImageExperimentErrorDomain, "ZRKirraImageExperimentErrorDomain");
}

// One lab a process, so the test works with names of its own.
TEST(Lab, KeepsTheFirstOfANameAndRemembersTheRefusal) {
    ZRLab& lab = ZRLab::defaultLab();
    lab.addExperimentWithName("first", factory("one"));
    lab.addExperimentWithName("first", factory("three"));
    lab.addDiagnosticWithName("first", "a diagnostic may share the name", "first", "none");

    EXPECT_EQ(lab.makeExperiment("first")->experimentDescription().summary(), "one");
    lab.addDiagnosticWithName("first", "again", "none", "none");
    lab.addAnalysisWithName("twice", [] { return nullptr; });
    lab.addAnalysisWithName("twice", [] { return nullptr; });
    std::vector<std::string> refused;
    for (const auto& refusal : lab.refusals()) {
        refused.push_back(refusal.kind + " " + refusal.name);
    }
    EXPECT_EQ(refused,
              (std::vector<std::string>{"experiment first", "diagnostic first", "analysis twice"}));
    EXPECT_EQ(lab.diagnosticNamed("first")->summary, "a diagnostic may share the name");
    EXPECT_EQ(lab.diagnosticNamed("first")->experimentName, "first");

    EXPECT_EQ(lab.makeExperiment("firs"), nullptr);
    EXPECT_EQ(lab.makeAnalysis("first"), nullptr);
    EXPECT_FALSE(lab.diagnosticNamed("second").has_value());
}

}  // namespace
