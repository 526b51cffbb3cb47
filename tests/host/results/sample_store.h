// Stores with runs that are known, for questions to be asked of.
#ifndef ZR_TESTS_HOST_RESULTS_SAMPLE_STORE_H
#define ZR_TESTS_HOST_RESULTS_SAMPLE_STORE_H

#include <filesystem>
#include <string>
#include <vector>

#include "host/results/questions.h"
#include "host/store/store.h"
#include "tests/support/store_engines.h"

namespace test {

// What of a run matters to a question.
struct Sample {
    std::string unit = {};
    host::Verdict verdict = host::Verdict::Passed;
    std::string station = "left";
    int hour = 0;                     // since 2026-11-20 00:00 UTC
    std::vector<double> values = {};  // results "Offset", within -3 … 3 mm
    std::string diagnostic = "Alignment";
    std::string part = "P1";
    std::string lot = "L1";
    std::string version = "1.0";
    platform::ErrorRef error = nullptr;
    std::string message = {};  // of a failure without an error
    std::vector<host::BenchResult> bench = {};
};

// A new store that goes with the object.
class SampleStore {
  public:
    explicit SampleStore(const EngineRow& engine = kEngines[0]);
    ~SampleStore();
    SampleStore(const SampleStore&) = delete;
    SampleStore& operator=(const SampleStore&) = delete;

    // Returns the run's UUID.
    std::string add(const Sample& sample, double bound = 3);
    void addAll(const std::vector<Sample>& samples);

    host::Answer ask(std::string_view question, host::Asked asked = {});

    const std::string& address() const { return _address; }
    host::Store& store() { return _store; }

  private:
    std::filesystem::path _folder;
    std::string _address;
    host::Store _store;
    int _count = 0;
};

// The cell of the row under the column's key.
const host::Datum& cellOf(const host::Answer& answer, std::size_t row, std::string_view key);

}  // namespace test

#endif
