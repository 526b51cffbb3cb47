#include "frame/host_interface.h"

#include <algorithm>
#include <iterator>

// The protocols' destructors stand here, so that one library holds the type information that finds
// an optional protocol on an instance of another module.
ZRDiagnosticHost::~ZRDiagnosticHost() = default;
ZRExperiment::~ZRExperiment() = default;
ZRAnalysis::~ZRAnalysis() = default;
ZRSetup::~ZRSetup() = default;
ZRTeardown::~ZRTeardown() = default;

// The units and the lab are never destroyed: results and factories may outlive static destruction.
const ZRDimensionlessUnit& ZRDimensionlessUnit::events() {
    static const auto& unit = *new ZRDimensionlessUnit("events");
    return unit;
}
const ZRDimensionlessUnit& ZRDimensionlessUnit::frames() {
    static const auto& unit = *new ZRDimensionlessUnit("frames");
    return unit;
}
const ZRDimensionlessUnit& ZRDimensionlessUnit::errors() {
    static const auto& unit = *new ZRDimensionlessUnit("errors");
    return unit;
}

ZRLab& ZRLab::defaultLab() {
    static ZRLab& lab = *new ZRLab;
    return lab;
}

namespace {

// The three registries are alike: a list of (name, entry) in the order of registration.

template <class Registry>
auto findEntry(const Registry& registry, std::string_view name) {
    using Entry = typename Registry::value_type;
    const auto found = std::find_if(registry.begin(), registry.end(),
                                    [name](const auto& entry) { return entry.first == name; });
    using Found = std::optional<typename Entry::second_type>;
    return found != registry.end() ? Found(found->second) : Found();
}

template <class Registry, class Entry>
void addEntry(Registry& registry,
              std::vector<ZRLab::Refusal>& refusals,
              std::string_view kind,
              std::string_view name,
              Entry entry) {
    if (findEntry(registry, name).has_value()) {
        refusals.push_back({std::string(kind), std::string(name)});
    } else {
        registry.emplace_back(name, std::move(entry));
    }
}

template <class Registry>
std::vector<std::string> namesOf(const Registry& registry) {
    std::vector<std::string> names;
    std::transform(registry.begin(), registry.end(), std::back_inserter(names),
                   [](const auto& e) { return e.first; });
    return names;
}

}  // namespace

void ZRLab::addExperimentWithName(std::string_view name, ExperimentFactory block) {
    const platform::MutexLock lock(_mutex);
    addEntry(_experiments, _refusals, "experiment", name, std::move(block));
}

void ZRLab::addAnalysisWithName(std::string_view name, AnalysisFactory block) {
    const platform::MutexLock lock(_mutex);
    addEntry(_analyses, _refusals, "analysis", name, std::move(block));
}

void ZRLab::addDiagnosticWithName(std::string_view name,
                                  std::string_view summary,
                                  std::string_view experimentName,
                                  std::string_view analysisName) {
    Diagnostic diagnostic{std::string(name), std::string(summary), std::string(experimentName),
                          std::string(analysisName)};
    const platform::MutexLock lock(_mutex);
    addEntry(_diagnostics, _refusals, "diagnostic", name, std::move(diagnostic));
}

std::vector<std::string> ZRLab::experimentNames() const {
    const platform::MutexLock lock(_mutex);
    return namesOf(_experiments);
}

std::vector<std::string> ZRLab::analysisNames() const {
    const platform::MutexLock lock(_mutex);
    return namesOf(_analyses);
}

std::vector<ZRLab::Diagnostic> ZRLab::diagnostics() const {
    const platform::MutexLock lock(_mutex);
    std::vector<Diagnostic> all;
    for (const auto& [name, diagnostic] : _diagnostics) {
        all.push_back(diagnostic);
    }
    return all;
}

std::vector<ZRLab::Refusal> ZRLab::refusals() const {
    const platform::MutexLock lock(_mutex);
    return _refusals;
}

std::shared_ptr<ZRExperiment> ZRLab::makeExperiment(std::string_view name) const {
    std::optional<ExperimentFactory> factory;
    {
        const platform::MutexLock lock(_mutex);
        factory = findEntry(_experiments, name);
    }
    return factory.has_value() ? (*factory)() : nullptr;
}

std::shared_ptr<ZRAnalysis> ZRLab::makeAnalysis(std::string_view name) const {
    std::optional<AnalysisFactory> factory;
    {
        const platform::MutexLock lock(_mutex);
        factory = findEntry(_analyses, name);
    }
    return factory.has_value() ? (*factory)() : nullptr;
}

std::optional<ZRLab::Diagnostic> ZRLab::diagnosticNamed(std::string_view name) const {
    const platform::MutexLock lock(_mutex);
    return findEntry(_diagnostics, name);
}
