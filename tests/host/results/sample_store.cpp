#include "tests/host/results/sample_store.h"

#include <algorithm>
#include <cstdlib>
#include <stdexcept>

#include <fmt/format.h>

namespace test {

namespace {

std::filesystem::path newFolder() {
    std::string name = (std::filesystem::temp_directory_path() / "zrlab-results-XXXXXX").string();
    return mkdtemp(name.data());
}

}  // namespace

SampleStore::SampleStore(const EngineRow& engine)
    : _folder(newFolder()), _address(engine.address(_folder)), _store(_address) {
    _store.connect();
}

SampleStore::~SampleStore() {
    std::filesystem::remove_all(_folder);
}

std::string SampleStore::add(const Sample& sample, double bound) {
    using namespace std::chrono;
    host::SessionRecord session;
    session.version = sample.version;
    session.identity.unit = sample.unit;
    session.identity.part = sample.part;
    session.identity.lot = sample.lot;
    session.identity.station = sample.station;
    host::RunRecord run;
    run.uuid = fmt::format("0190{:04x}-0000-7000-8000-000000000000", ++_count);
    run.plan.name = sample.diagnostic;
    run.plan.experiment.name = "Experiment";
    run.plan.analysis.emplace().name = "Analysis";
    run.started =
        platform::Date(sys_days(year(2026) / 11 / 20) + hours(sample.hour) + microseconds(_count));
    session.started = run.started;
    run.experimentSeconds = 0.5;
    run.analysisSeconds = 0.5;
    run.seconds = 1;
    run.verdict = sample.verdict;
    for (const double value : sample.values) {
        const bool isWithin = value >= -bound && value <= bound;
        run.results.push_back({"Offset", value, "mm",
                               host::LimitRecord{"Limit", host::BoundRecord{-bound, false},
                                                 host::BoundRecord{bound, false}},
                               isWithin ? host::Judgement::Within : host::Judgement::Outside});
    }
    run.benchResults = sample.bench;
    run.plan.experiment.parameters = {{"frameCount", platform::Number(std::int32_t{90})}};
    run.framesDelivered = 3;
    if (sample.error != nullptr || !sample.message.empty()) {
        run.failures.push_back(
            {host::Part::Experiment, host::kStepRun, sample.error, sample.message});
    }
    if (!_store.write(session, run)) {
        throw std::runtime_error("the store has the run already");
    }
    return run.uuid;
}

void SampleStore::addAll(const std::vector<Sample>& samples) {
    for (const Sample& sample : samples) {
        add(sample);
    }
}

host::Answer SampleStore::ask(std::string_view question, host::Asked asked) {
    for (const host::Question& one : host::questions()) {
        if (one.name == question) {
            return answerTo(one, _store, asked);
        }
    }
    throw std::runtime_error("there is no such question");
}

const host::Datum& cellOf(const host::Answer& answer, std::size_t row, std::string_view key) {
    const auto column = std::find_if(answer.columns.begin(), answer.columns.end(),
                                     [&](const host::AnswerColumn& one) { return one.key == key; });
    return answer.rows.at(row).at(static_cast<std::size_t>(column - answer.columns.begin()));
}

}  // namespace test
