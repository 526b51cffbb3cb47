// The tables of a campaign: one for each group of faults, in it a line for each kind.
#ifndef ZR_HOST_CAMPAIGN_KIND_LINES_H
#define ZR_HOST_CAMPAIGN_KIND_LINES_H

#include <string>
#include <vector>

#include "host/campaign/campaign_record.h"

namespace host {

struct KindLine : CampaignKind {
    std::string how;  // why runs did not pass, the most frequent reasons first; some of them
    // The subjects of faults that were not caught; some of them, and how many more.
    std::string missed;
};

struct GroupTable {
    std::string group;
    CampaignCounts counts;
    std::vector<CampaignCounts> runs;  // of the faults that the run could notice
    std::vector<KindLine> lines;
};

// Valid as long as the record.
std::vector<GroupTable> groupTables(const CampaignRecord& campaign);

// A run with its parameters: "VantorFaultDiagnostic (frameCount 30, timeout 3)".
std::string planText(const RunPlan& plan);

}  // namespace host

#endif
