#include <memory>
#include <string>
#include <vector>

#include <gmock/gmock.h>

#include "frame/host_interface.h"

namespace {

using testing::ElementsAre;
using testing::IsEmpty;

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

// One lab a process, so the test works with names of its own.
TEST(Lab, KeepsTheFirstOfANameAndRemembersTheRefusal) {
    ZRLab& lab = ZRLab::defaultLab();
    lab.addExperimentWithName("first", factory("one"));
    lab.addExperimentWithName("second", factory("two"));
    lab.addExperimentWithName("first", factory("three"));
    lab.addDiagnosticWithName("first", "a diagnostic may share the name", "first", "none");

    EXPECT_THAT(lab.experimentNames(), ElementsAre("first", "second"));
    EXPECT_EQ(lab.makeExperiment("first")->experimentDescription().summary(), "one");
    EXPECT_NE(lab.makeExperiment("first"), lab.makeExperiment("first"));
    ASSERT_EQ(lab.refusals().size(), 1U);
    EXPECT_EQ(lab.refusals().front().kind + " " + lab.refusals().front().name, "experiment first");
    EXPECT_EQ(lab.diagnosticNamed("first")->experimentName, "first");

    EXPECT_EQ(lab.makeExperiment("firs"), nullptr);
    EXPECT_EQ(lab.makeAnalysis("first"), nullptr);
    EXPECT_FALSE(lab.diagnosticNamed("second").has_value());
}

// The host asks an instance for the optional protocols; a class without them must not answer.
TEST(Lab, OptionalProtocolsAreFoundOnTheInstance) {
    class WithTeardown final : public ZRExperiment, public ZRTeardown {
      public:
        ZRDescription experimentDescription() const override { return ZRDescription(""); }
        ZRExperimentResultRef run(platform::ErrorSlot) override { return nullptr; }
        bool teardown(platform::ErrorSlot) override { return true; }
    };
    const std::shared_ptr<ZRExperiment> plain = factory("")();
    const std::shared_ptr<ZRExperiment> tornDown = std::make_shared<WithTeardown>();
    EXPECT_EQ(dynamic_cast<ZRTeardown*>(plain.get()), nullptr);
    EXPECT_NE(dynamic_cast<ZRTeardown*>(tornDown.get()), nullptr);
    EXPECT_EQ(dynamic_cast<ZRSetup*>(tornDown.get()), nullptr);
}

}  // namespace
