// CampaignRecord: what the diagnostics made of each fault of a device, as plain data. Every form that shows it is
// made from this alone.
#ifndef ZR_HOST_CAMPAIGN_CAMPAIGN_RECORD_H
#define ZR_HOST_CAMPAIGN_CAMPAIGN_RECORD_H

#include <cstddef>
#include <optional>
#include <string>
#include <vector>

#include "host/record/run_plan.h"
#include "platform/wall_clock.h"

namespace host {

// What became of a run on a device with a fault, from the best to the worst.
enum class TrialOutcome {
    Caught,       // it did not pass
    BenchCaught,  // it passed, but for a limit of the bench or a rule of the device's interfaces
    NotReached,   // it passed, and ended before the fault came about
    NotCaught,    // it passed
    Crashed,      // the process ended
    Hung,         // the process did not end
};

struct TrialResult {
    TrialOutcome outcome = TrialOutcome::NotCaught;
    // In one line: the error, or the results outside their limits; empty when it passed.
    std::string why;
};

struct CampaignFault {
    std::string group;  // these three as in devices::DataFault
    std::string kind;
    std::string subject;
    // One entry per run; nothing where the run does not use what is wrong.
    std::vector<std::optional<TrialResult>> runs;
};

struct CampaignRecord {
    std::string version;      // of the program
    std::string commandLine;  // as given, passwords masked
    std::string deviceName;
    std::string deviceSummary;
    std::string limits;  // the file of the bench's limits; empty when there is none
    platform::Date started = platform::Date::now();
    double seconds = 0;
    std::vector<RunPlan> runs;
    std::vector<CampaignFault> faults;
};

// What the runs together made of a fault: the best of their outcomes, but a crash or a hang in any of them is one
// of the fault. Nothing when no run uses what is wrong; a campaign leaves such a fault out.
std::optional<TrialOutcome> outcomeOf(const CampaignFault& fault);

// Whether the diagnostics or the bench caught it.
bool isCaught(const CampaignFault& fault);

// How many faults had which outcome.
struct CampaignCounts {
    std::size_t faults = 0;
    std::size_t caught = 0;
    std::size_t benchCaught = 0;
    std::size_t notReached = 0;
    std::size_t notCaught = 0;  // those that no run uses included
    std::size_t broken = 0;     // crashes and hangs

    void add(const std::optional<TrialOutcome>& outcome);
    void add(const CampaignCounts& counts);
};

// The faults of one kind: what each run, and all of them together, made of them.
struct CampaignKind {
    std::string group;
    std::string kind;
    CampaignCounts all;
    std::vector<CampaignCounts> runs;  // of the faults that the run could notice
    std::vector<const CampaignFault*> faults;
};

// In the order of the faults, those of a group one after the other. Valid as long as the record.
std::vector<CampaignKind> kindsOf(const CampaignRecord& campaign);

CampaignCounts countsOf(const CampaignRecord& campaign);

}  // namespace host

#endif
