// The forms in which a campaign is shown.
#ifndef ZR_HOST_CAMPAIGN_CAMPAIGN_FORMS_H
#define ZR_HOST_CAMPAIGN_CAMPAIGN_FORMS_H

#include <span>
#include <string>
#include <string_view>

#include "host/campaign/campaign_record.h"

namespace host {

struct CampaignForm {
    std::string_view name;
    std::string_view ending;  // of a file in this form, with its dot
    std::string (*write)(const CampaignRecord& campaign);
};

std::span<const CampaignForm> campaignForms();

// The form of that name, and the one that the file's ending means; or null.
const CampaignForm* campaignFormNamed(std::string_view name);
const CampaignForm* campaignFormOf(const std::string& file);

// For a terminal: the shares of faults that were caught, group by group and kind by kind, then the faults that
// were not.
std::string textCampaign(const CampaignRecord& campaign);

// The same as a page in Markdown, without anything that differs between two campaigns that found the same.
std::string markdownCampaign(const CampaignRecord& campaign);

// Every fault with what each run made of it; see docs/reports.md.
std::string jsonCampaign(const CampaignRecord& campaign);

// One self-contained page, in the look of the HTML report: the matrix of kinds and runs, then every fault.
std::string htmlCampaign(const CampaignRecord& campaign);

// What all forms begin with: "812 of 1034 faults caught (78.5 %), 40 more by the bench with
// coverage.json".
std::string campaignHeadline(const CampaignRecord& campaign);

// How many of the faults were caught: "812 of 1034 faults caught (78.5 %)".
std::string caughtText(const CampaignCounts& counts);

// "78.5 %"
std::string shareText(const CampaignCounts& counts);

// The other sentences about all faults, such as those that were not caught, one each.
std::vector<std::string> campaignNotes(const CampaignRecord& campaign);

// "CAUGHT", "CAUGHT BY THE BENCH", "NOT REACHED", "NOT CAUGHT", "CRASHED", "HUNG"; the same word in every form.
std::string_view outcomeText(TrialOutcome outcome);

// What became of a fault in one run, for people: its outcome's word and why; "–" when the run does not use what
// is wrong.
std::string trialText(const std::optional<TrialResult>& result);

}  // namespace host

#endif
