// A campaign as a page: the shares of the groups, the matrix of kinds of faults and runs, then every fault.
#include <fmt/format.h>

#include "host/campaign/campaign_forms.h"
#include "host/campaign/kind_lines.h"
#include "host/record/clean_text.h"
#include "host/report/html/page_frame.h"
#include "host/report/html/table.h"

namespace host {

namespace {

// How a cell of the matrix looks: all, some or none of the faults caught.
std::string_view styleOf(const CampaignCounts& counts) {
    const std::size_t caught = counts.caught + counts.benchCaught;
    return counts.broken != 0        ? "broken"
           : caught == counts.faults ? "all"
           : caught == 0             ? "none"
                                     : "some";
}

std::string cellHtml(const CampaignCounts& counts) {
    if (counts.faults == 0) {
        return "<span class=\"faint\">–</span>";
    }
    std::string text = std::to_string(counts.caught);
    if (counts.benchCaught != 0) {
        text += fmt::format(" + {}", counts.benchCaught);
    }
    text += fmt::format(" of {}", counts.faults);
    if (counts.broken != 0) {
        text += fmt::format(", {} broken", counts.broken);
    }
    return fmt::format("<span class=\"caught {}\">{}</span>", styleOf(counts), text);
}

// Which runs could notice a fault of the group; the others have no column.
std::vector<std::size_t> runsOf(const GroupTable& table) {
    std::vector<std::size_t> runs;
    for (std::size_t at = 0; at < table.runs.size(); ++at) {
        if (table.runs[at].faults != 0) {
            runs.push_back(at);
        }
    }
    return runs;
}

std::string groupsHtml(const std::vector<GroupTable>& groups, const CampaignRecord& campaign) {
    std::vector<Column> columns = {{"Group"}, {"Share", "judged"}, {"All runs"}};
    for (const RunPlan& run : campaign.runs) {
        columns.push_back({run.name});
    }
    Table table("every group", columns);
    for (const GroupTable& group : groups) {
        std::vector<std::string> cells = {htmlText(group.group), shareText(group.counts),
                                          cellHtml(group.counts)};
        for (const CampaignCounts& counts : group.runs) {
            cells.push_back(cellHtml(counts));
        }
        table.row(cells);
    }
    return table.html();
}

std::string matrixHtml(const std::vector<GroupTable>& groups, const CampaignRecord& campaign) {
    std::string html;
    for (const GroupTable& group : groups) {
        const std::vector<std::size_t> runs = runsOf(group);
        std::vector<Column> columns = {{"What is wrong"}, {"All runs"}};
        for (const std::size_t run : runs) {
            columns.push_back({campaign.runs[run].name});
        }
        Table table(group.group, columns);
        for (const KindLine& line : group.lines) {
            std::vector<std::string> cells = {htmlText(line.kind), cellHtml(line.all)};
            for (const std::size_t run : runs) {
                cells.push_back(cellHtml(line.runs[run]));
            }
            table.row(cells);
        }
        html += table.html();
    }
    return html;
}

std::string faultsHtml(const std::vector<GroupTable>& groups, const CampaignRecord& campaign) {
    std::string html;
    for (const GroupTable& group : groups) {
        const std::vector<std::size_t> runs = runsOf(group);
        std::vector<Column> columns = {{"Fault"}};
        for (const std::size_t run : runs) {
            columns.push_back({campaign.runs[run].name, "message"});
        }
        for (const KindLine& line : group.lines) {
            Table table(group.group + ": " + line.kind, columns);
            for (const CampaignFault* fault : line.faults) {
                std::vector<std::string> cells = {htmlText(fault->subject)};
                for (const std::size_t run : runs) {
                    cells.push_back(htmlText(trialText(fault->runs[run])));
                }
                table.row(cells, isCaught(*fault) ? "" : "outside");
            }
            html += fmt::format("<details>\n<summary>{}: {} ({})</summary>\n{}</details>\n",
                                htmlText(group.group), htmlText(line.kind), line.all.faults,
                                table.html());
        }
    }
    return html;
}

}  // namespace

std::string htmlCampaign(const CampaignRecord& campaign) {
    const std::vector<GroupTable> groups = groupTables(campaign);
    std::string notes;
    for (const std::string& note : campaignNotes(campaign)) {
        notes += "<li>" + htmlText(note) + "</li>\n";
    }
    std::string facts = factHtml("Device", campaign.deviceName, campaign.deviceSummary);
    for (const RunPlan& run : campaign.runs) {
        facts += factHtml("Run", planText(run));
    }
    const std::string headline = campaignHeadline(campaign);
    const std::size_t scoreEnd = headline.find(" (");
    return pageStart("What the diagnostics catch") +
           fmt::format(R"(<header class="masthead hue-a">
<div class="sheet">
<p class="subject">What the diagnostics catch</p>
<h1>{} <span class="headline">{}</span></h1>
<dl class="facts">
{}</dl>
</div>
</header>
<main class="sheet" id="results">
<section>
<h2 class="part">What was caught</h2>
<ul class="notes">
{}<li>A fault is caught when a run that uses what is wrong does not pass; "+" counts those that only a limit of the bench, or a rule of the device's interfaces, showed; "–" is a run that does not use what is wrong</li>
</ul>
{}{}</section>
<section>
<h2 class="part">Every fault</h2>
{}</section>
</main>
<footer class="sheet">
<h2>How this was made</h2>
<dl>
{}{}{}</dl>
</footer>
)",
                       htmlText(headline.substr(0, scoreEnd)),
                       htmlText(headline.substr(scoreEnd + 1)), facts, notes,
                       groupsHtml(groups, campaign), matrixHtml(groups, campaign),
                       faultsHtml(groups, campaign), factHtml("Command", campaign.commandLine),
                       factHtml("Started", campaign.started.timestamp()),
                       factHtml("Took", fmt::format("{:.0f} s", campaign.seconds))) +
           std::string(kPageEnd);
}

}  // namespace host
