// zrlab campaign: gives a device one fault at a time, and shows what the diagnostics make of each.
#ifndef ZR_HOST_ZRLAB_CAMPAIGN_COMMAND_H
#define ZR_HOST_ZRLAB_CAMPAIGN_COMMAND_H

#include <cstdint>
#include <string>

#include "host/zrlab/session_options.h"

namespace host {

struct CampaignOptions {
    // Runs at a time; 0: two for each processor, since many wait for a time-out.
    std::uint64_t jobs = 0;
    std::string format;  // empty: what the output's ending says, else text
    std::string output;  // the file that gets the answer; empty or "-" for standard output
};

// Carries the campaign out on the names (each once), the device, the settings and the limits of `session`; without
// names it takes every diagnostic, and every experiment that is not part of one. Faults of services that none of
// them uses are left out. Returns the exit status: kExitPassed when every run ended, whatever it found; kExitFailed
// when one crashed or hung (a run hangs when it takes a minute longer than its time-out); 128 and the signal's
// number when the program was asked to stop, which then writes no answer.
//
// What an experiment counts and its time-out have small values unless they are set, and a device that takes a
// speed goes as fast as it can. When the answer goes to a file, standard output gets its headline. Throws a
// Problem: kExitUsage as `run` does; kExitError when a run does not pass on the device as it is, since nothing can
// be learnt from it then.
int campaignCommand(const CampaignOptions& options, const SessionOptions& session);

}  // namespace host

#endif
