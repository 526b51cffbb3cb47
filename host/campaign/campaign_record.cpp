#include "host/campaign/campaign_record.h"

#include <algorithm>

namespace host {

std::optional<TrialOutcome> outcomeOf(const CampaignFault& fault) {
    std::optional<TrialOutcome> all;
    for (const auto& run : fault.runs) {
        if (!run.has_value()) {
            continue;
        }
        const bool isBroken = run->outcome >= TrialOutcome::Crashed;
        if (!all.has_value() || (isBroken ? run->outcome > *all
                                          : *all < TrialOutcome::Crashed && run->outcome < *all)) {
            all = run->outcome;
        }
    }
    return all;
}

bool isCaught(const CampaignFault& fault) {
    return outcomeOf(fault).value_or(TrialOutcome::NotCaught) <= TrialOutcome::BenchCaught;
}

void CampaignCounts::add(const std::optional<TrialOutcome>& outcome) {
    ++faults;
    switch (outcome.value_or(TrialOutcome::NotCaught)) {
        case TrialOutcome::Caught:
            ++caught;
            break;
        case TrialOutcome::BenchCaught:
            ++benchCaught;
            break;
        case TrialOutcome::NotReached:
            ++notReached;
            break;
        case TrialOutcome::NotCaught:
            ++notCaught;
            break;
        case TrialOutcome::Crashed:
        case TrialOutcome::Hung:
            ++broken;
            break;
    }
}

void CampaignCounts::add(const CampaignCounts& counts) {
    faults += counts.faults;
    caught += counts.caught;
    benchCaught += counts.benchCaught;
    notReached += counts.notReached;
    notCaught += counts.notCaught;
    broken += counts.broken;
}

std::vector<CampaignKind> kindsOf(const CampaignRecord& campaign) {
    std::vector<CampaignKind> kinds;
    for (const CampaignFault& fault : campaign.faults) {
        auto kind = std::find_if(kinds.begin(), kinds.end(), [&](const CampaignKind& each) {
            return each.group == fault.group && each.kind == fault.kind;
        });
        if (kind == kinds.end()) {
            // Behind the others of its group.
            const auto last =
                std::find_if(kinds.rbegin(), kinds.rend(),
                             [&](const CampaignKind& each) { return each.group == fault.group; });
            kind = kinds.insert(last == kinds.rend() ? kinds.end() : last.base(),
                                CampaignKind{fault.group, fault.kind, {}, {}, {}});
            kind->runs.resize(campaign.runs.size());
        }
        kind->all.add(outcomeOf(fault));
        kind->faults.push_back(&fault);
        for (std::size_t at = 0; at < fault.runs.size(); ++at) {
            if (fault.runs[at].has_value()) {
                kind->runs[at].add(fault.runs[at]->outcome);
            }
        }
    }
    return kinds;
}

CampaignCounts countsOf(const CampaignRecord& campaign) {
    CampaignCounts counts;
    for (const CampaignFault& fault : campaign.faults) {
        counts.add(outcomeOf(fault));
    }
    return counts;
}

}  // namespace host
