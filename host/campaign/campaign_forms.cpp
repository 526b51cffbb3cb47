#include "host/campaign/campaign_forms.h"

#include <algorithm>
#include <cctype>

#include <fmt/format.h>
#include <nlohmann/json.hpp>

#include "host/campaign/kind_lines.h"
#include "host/record/clean_text.h"
#include "host/record/run_text.h"

namespace host {

namespace {

constexpr CampaignForm kForms[] = {{"text", ".txt", textCampaign},
                                   {"json", ".json", jsonCampaign},
                                   {"html", ".html", htmlCampaign},
                                   {"markdown", ".md", markdownCampaign}};

// What begins the faults of a group.
std::string groupText(const CampaignCounts& counts) {
    return caughtText(counts) + (counts.benchCaught == 0
                                     ? std::string()
                                     : fmt::format(", {} more by the bench", counts.benchCaught));
}

using Json = nlohmann::ordered_json;

Json jsonOf(const CampaignCounts& counts) {
    return {{"faults", counts.faults},
            {"caught", counts.caught},
            {"caughtByTheBench", counts.benchCaught},
            {"notReached", counts.notReached},
            {"notCaught", counts.notCaught},
            {"crashedOrHung", counts.broken}};
}

std::string padded(const std::string& text, std::size_t width) {
    return text + std::string(width - std::min(width, widthOf(text)), ' ');
}

// | and line ends would end a cell.
std::string cellText(std::string_view text) {
    std::string cell;
    for (const char character : plainLine(text)) {
        cell += character == '|' ? "\\|" : std::string(1, character);
    }
    return cell;
}

}  // namespace

std::span<const CampaignForm> campaignForms() {
    return kForms;
}

const CampaignForm* campaignFormNamed(std::string_view name) {
    const auto* form = std::find_if(std::begin(kForms), std::end(kForms),
                                    [&](const CampaignForm& each) { return each.name == name; });
    return form == std::end(kForms) ? nullptr : form;
}

const CampaignForm* campaignFormOf(const std::string& file) {
    const auto* form = std::find_if(
        std::begin(kForms), std::end(kForms),
        [&](const CampaignForm& each) { return std::string_view(file).ends_with(each.ending); });
    return form == std::end(kForms) ? nullptr : form;
}

std::string_view outcomeText(TrialOutcome outcome) {
    static constexpr std::string_view kTexts[] = {
        "CAUGHT", "CAUGHT BY THE BENCH", "NOT REACHED", "NOT CAUGHT", "CRASHED", "HUNG"};
    return kTexts[static_cast<std::size_t>(outcome)];
}

std::string trialText(const std::optional<TrialResult>& result) {
    if (!result.has_value()) {
        return "–";
    }
    return std::string(outcomeText(result->outcome)) +
           (result->why.empty() ? "" : ": " + plainLine(result->why));
}

std::string shareText(const CampaignCounts& counts) {
    return fmt::format("{:.1f} %", counts.faults == 0 ? 0
                                                      : 100 * static_cast<double>(counts.caught) /
                                                            static_cast<double>(counts.faults));
}

std::string caughtText(const CampaignCounts& counts) {
    return fmt::format("{} of {} caught ({})", counts.caught,
                       plural(counts.faults, "fault", "faults"), shareText(counts));
}

std::string campaignHeadline(const CampaignRecord& campaign) {
    const CampaignCounts counts = countsOf(campaign);
    std::string text = caughtText(counts);
    if (!campaign.limits.empty()) {
        text += fmt::format(", {} more by the bench with {}", counts.benchCaught,
                            plainLine(campaign.limits));
    } else if (counts.benchCaught != 0) {
        text += fmt::format(", {} more by the bench", counts.benchCaught);
    }
    return text;
}

std::vector<std::string> campaignNotes(const CampaignRecord& campaign) {
    const CampaignCounts counts = countsOf(campaign);
    const auto note = [](std::size_t count, std::string_view what) {
        return fmt::format("{} {}", plural(count, "fault", "faults"), what);
    };
    std::vector<std::string> notes;
    if (counts.broken != 0) {
        notes.push_back(note(counts.broken, "crashed or hung a run"));
    }
    if (counts.notCaught != 0) {
        notes.push_back(note(counts.notCaught, "not caught by anything"));
    }
    if (counts.notReached != 0) {
        notes.push_back(note(counts.notReached, "did not come about: the run ended before"));
    }
    return notes;
}

std::string textCampaign(const CampaignRecord& campaign) {
    const std::vector<GroupTable> tables = groupTables(campaign);
    std::size_t width = 0;
    for (const GroupTable& table : tables) {
        for (const KindLine& line : table.lines) {
            width = std::max(width, widthOf(line.kind) + 2);
        }
    }
    std::string text = campaignHeadline(campaign) + "\n";
    for (const std::string& note : campaignNotes(campaign)) {
        text += note + "\n";
    }
    text += fmt::format("device  {}: {}\n", plainLine(campaign.deviceName),
                        plainLine(campaign.deviceSummary));
    for (const RunPlan& run : campaign.runs) {
        text += fmt::format("run     {}\n", planText(run));
    }
    for (const GroupTable& table : tables) {
        text += fmt::format("\n{}: {}\n{}  faults  caught  by the bench  not caught\n", table.group,
                            groupText(table.counts), padded("", width));
        for (const KindLine& line : table.lines) {
            text +=
                fmt::format("  {}  {:>6}  {:>6}  {:>12}  {:>10}\n", padded(line.kind, width - 2),
                            line.all.faults, line.all.caught, line.all.benchCaught,
                            line.all.faults - line.all.caught - line.all.benchCaught);
            if (!line.missed.empty()) {
                text += fmt::format("    {}\n", line.missed);
            }
        }
    }
    return text;
}

std::string markdownCampaign(const CampaignRecord& campaign) {
    std::string text =
        "# What the diagnostics catch\n\n" + cellText(campaignHeadline(campaign)) + ".\n";
    for (const std::string& note : campaignNotes(campaign)) {
        text += cellText(note) + ".\n";
    }
    text += fmt::format(
        "\nMade by `zrlab campaign`: it gives a device ({}) one fault at a time and runs\n\n",
        plainLine(campaign.deviceName));
    for (const RunPlan& run : campaign.runs) {
        text += fmt::format("- {}\n", cellText(planText(run)));
    }
    text +=
        "\nA fault is caught when a run that uses what is wrong does not pass. \"By the bench\" "
        "are "
        "those\nthat only a limit of the bench, or a rule of the device's interfaces, showed. Each "
        "fault, with what\neach run made of it, is in `zrlab campaign --output faults.html` and "
        "`faults.json`.\n";
    for (const GroupTable& table : groupTables(campaign)) {
        std::string heading = table.group;
        heading.front() =
            static_cast<char>(std::toupper(static_cast<unsigned char>(heading.front())));
        text += fmt::format(
            "\n## {}\n\n{}.\n\n"
            "| what is wrong | faults | caught | by the bench | how | not caught |\n"
            "|---|--:|--:|--:|---|---|\n",
            cellText(heading), groupText(table.counts));
        for (const KindLine& line : table.lines) {
            text += fmt::format("| {} | {} | {} | {} | {} | {} |\n", cellText(line.kind),
                                line.all.faults, line.all.caught, line.all.benchCaught,
                                cellText(line.how), cellText(line.missed));
        }
    }
    return text;
}

std::string jsonCampaign(const CampaignRecord& campaign) {
    Json json = {{"version", campaign.version},
                 {"commandLine", cleanText(campaign.commandLine)},
                 {"started", campaign.started.timestamp()},
                 {"seconds", campaign.seconds},
                 {"device",
                  {{"name", cleanText(campaign.deviceName)},
                   {"summary", cleanText(campaign.deviceSummary)}}},
                 {"limits", campaign.limits.empty() ? Json() : Json(cleanText(campaign.limits))},
                 {"runs", Json::array()},
                 {"counts", jsonOf(countsOf(campaign))}};
    for (const RunPlan& run : campaign.runs) {
        Json parameters = Json::object();
        for (const auto& [name, value] : run.experiment.parameters) {
            parameters[name] = cleanText(value.text());
        }
        json["runs"].push_back({{"name", run.name}, {"parameters", std::move(parameters)}});
    }
    Json& groups = json["groups"] = Json::array();
    for (const GroupTable& table : groupTables(campaign)) {
        groups.push_back({{"group", cleanText(table.group)}, {"counts", jsonOf(table.counts)}});
    }
    Json& faults = json["faults"] = Json::array();
    for (const CampaignFault& fault : campaign.faults) {
        Json runs = Json::object();
        for (std::size_t at = 0; at < fault.runs.size(); ++at) {
            const auto& result = fault.runs[at];
            if (result.has_value()) {
                runs[campaign.runs[at].name] = {{"outcome", outcomeText(result->outcome)},
                                                {"why", cleanText(result->why)}};
            }
        }
        const auto outcome = outcomeOf(fault);
        faults.push_back({{"group", cleanText(fault.group)},
                          {"kind", cleanText(fault.kind)},
                          {"subject", cleanText(fault.subject)},
                          {"outcome", outcomeText(outcome.value_or(TrialOutcome::NotCaught))},
                          {"runs", std::move(runs)}});
    }
    return json.dump(2) + "\n";
}

}  // namespace host
