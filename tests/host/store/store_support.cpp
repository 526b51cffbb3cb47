#include "tests/host/store/store_support.h"

#include <cstdlib>
#include <memory>
#include <variant>

#include <sys/wait.h>
#include <unistd.h>

#include <gtest/gtest.h>

#include "host/record/uuid.h"
#include "host/store/run_json.h"
#include "tests/host/report/sample_sessions.h"

namespace test {

Folder::Folder() {
    std::string name = (std::filesystem::temp_directory_path() / "zr_store_XXXXXX").string();
    if (mkdtemp(name.data()) == nullptr) {
        ADD_FAILURE() << "no folder for the test";
    }
    _path = name;
}

Folder::~Folder() {
    std::error_code ignored;
    std::filesystem::remove_all(_path, ignored);
}

host::SessionRecord storedSession(std::size_t results) {
    host::SessionRecord session;
    session.version = "1.0.0";
    session.identity.station = "bench-3";
    session.identity.unit = "SN-7";
    host::RunRecord run;
    run.uuid = host::newUuid();
    run.plan.name = "Diagnostic";
    run.plan.experiment.name = "Experiment";
    run.plan.analysis = host::PartPlan{"Analysis", "", {}};
    run.verdict = host::Verdict::Passed;
    const host::LimitRecord limit{"Max Reports", host::BoundRecord{0, false},
                                  host::BoundRecord{0, false}};
    for (std::size_t at = 0; at < results; ++at) {
        std::string name("Channel ");
        name += std::to_string(at);
        run.results.push_back({name, 0, "events", limit, host::Judgement::Within});
    }
    host::setOnlyRun(session, std::move(run));
    return session;
}

std::vector<std::pair<std::string, host::SessionRecord>> sampleRuns() {
    std::vector<std::pair<std::string, host::SessionRecord>> all;
    for (const auto& [name, sample] : sampleSessions()) {
        if (name.starts_with("long")) {  // for pages that thin their drawings out
            continue;
        }
        for (const host::RunRecord& run : sample.runs) {
            host::SessionRecord session = sample;
            session.repeats.clear();
            host::setOnlyRun(session, run);
            session.runs.front().uuid = host::newUuid();
            all.emplace_back(name, std::move(session));
        }
    }
    return all;
}

std::int64_t numberIn(host::Store& store, std::string_view sql) {
    return std::get<std::int64_t>(store.query(sql).at(0).at(0));
}

int inProcesses(int count,
                const std::function<int(int process)>& function,
                const std::function<void()>& meanwhile) {
    std::vector<pid_t> processes;
    for (int at = 0; at < count; ++at) {
        const pid_t process = fork();
        if (process == 0) {
            int result = 100;
            try {
                result = function(at);
            } catch (const std::exception& exception) {
                std::fprintf(stderr, "process %d: %s\n", at, exception.what());
            }
            _exit(result);
        }
        processes.push_back(process);
    }
    meanwhile();
    int sum = 0;
    for (const pid_t process : processes) {
        int status = 0;
        waitpid(process, &status, 0);
        EXPECT_TRUE(WIFEXITED(status) && WEXITSTATUS(status) < 100) << status;
        sum += WEXITSTATUS(status);
    }
    return sum;
}

}  // namespace test
