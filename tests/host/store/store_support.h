// What the tests of stores share: folders, runs, and questions to a store.
#ifndef ZR_TESTS_HOST_STORE_STORE_SUPPORT_H
#define ZR_TESTS_HOST_STORE_STORE_SUPPORT_H

#include <chrono>
#include <cstdint>
#include <filesystem>
#include <functional>
#include <string>
#include <utility>
#include <vector>

#include <gtest/gtest.h>

#include "host/record/run_record.h"
#include "host/store/store.h"
#include "tests/support/store_engines.h"

namespace test {

inline constexpr host::Attachments kAll{.frames = true, .images = true};
// Patience with a store: with one that does not answer, and with one that will.
inline constexpr std::chrono::milliseconds kShort{300};
inline constexpr std::chrono::seconds kLong{60};

// A folder that lives as long as the object.
class Folder {
  public:
    Folder();
    ~Folder();
    Folder(const Folder&) = delete;
    Folder& operator=(const Folder&) = delete;

    const std::filesystem::path& path() const { return _path; }

  private:
    std::filesystem::path _path;
};

// A session of one run that passed, with as many results and a new uuid.
host::SessionRecord storedSession(std::size_t results = 64);

// Every run of the sample sessions, but for the long ones, as the only one of its session, with a uuid, and a
// name for messages.
std::vector<std::pair<std::string, host::SessionRecord>> sampleRuns();

// The one whole number that the SQL selects.
std::int64_t numberIn(host::Store& store, std::string_view sql);
inline std::int64_t runsIn(host::Store& store) {
    return numberIn(store, "SELECT COUNT(*) FROM runs");
}

// Runs the function in as many processes at once, and meanwhile the other one in this; returns the sum of what
// they return, which is below 100 each. A process that dies fails the test.
int inProcesses(
    int count,
    const std::function<int(int process)>& function,
    const std::function<void()>& meanwhile = [] {});

}  // namespace test

#endif
