#include "host/campaign/kind_lines.h"

#include <algorithm>
#include <cctype>
#include <map>
#include <utility>

#include <fmt/format.h>

namespace host {

namespace {

constexpr std::size_t kMostReasons = 3;
constexpr std::size_t kMostSubjects = 20;

// The first of the texts, and how many more there are.
std::string someOf(const std::vector<std::string>& texts, std::size_t most) {
    const std::vector<std::string> first(
        texts.begin(), texts.begin() + static_cast<std::ptrdiff_t>(std::min(most, texts.size())));
    return fmt::format("{}{}", fmt::join(first, "; "),
                       texts.size() > most ? fmt::format("; {} more", texts.size() - most) : "");
}

// A reason without what only names the fault's subject, or its number among the frames or reports, so that faults
// of one kind have one reason.
std::string generalReason(const std::string& why, const std::string& subject) {
    const std::string number = subject.substr(0, subject.find_first_not_of("0123456789"));
    std::string general = why;
    for (const std::string& word : {subject, number}) {
        std::size_t at = general.find(": ");  // what stands before is the error's domain and code
        while (!word.empty() && (at = general.find(word, at)) < general.size()) {
            const auto isPart = [&](std::size_t place) {
                return place < general.size() &&
                       std::isalnum(static_cast<unsigned char>(general[place])) != 0;
            };
            if (isPart(at - 1) || isPart(at + word.size())) {
                at += word.size();
            } else {
                general.replace(at, word.size(), "…");
            }
        }
    }
    return general;
}

std::string reasonsOf(const CampaignKind& kind) {
    std::map<std::string, std::size_t> counts;
    for (const CampaignFault* fault : kind.faults) {
        for (const auto& run : fault->runs) {
            if (run.has_value() && !run->why.empty()) {
                ++counts[generalReason(run->why, fault->subject)];
            }
        }
    }
    std::vector<std::pair<std::string, std::size_t>> ordered(counts.begin(), counts.end());
    std::stable_sort(ordered.begin(), ordered.end(),
                     [](const auto& a, const auto& b) { return a.second > b.second; });
    std::vector<std::string> reasons;
    reasons.reserve(ordered.size());
    for (auto& [reason, count] : ordered) {
        reasons.push_back(std::move(reason));
    }
    return someOf(reasons, kMostReasons);
}

std::string missedOf(const CampaignKind& kind) {
    std::vector<std::string> subjects;
    for (const CampaignFault* fault : kind.faults) {
        if (!isCaught(*fault)) {
            subjects.push_back(fault->subject);
        }
    }
    return someOf(subjects, kMostSubjects);
}

}  // namespace

std::vector<GroupTable> groupTables(const CampaignRecord& campaign) {
    std::vector<GroupTable> tables;
    for (CampaignKind& kind : kindsOf(campaign)) {
        if (tables.empty() || tables.back().group != kind.group) {
            tables.push_back({.group = kind.group,
                              .counts = {},
                              .runs = std::vector<CampaignCounts>(campaign.runs.size()),
                              .lines = {}});
        }
        GroupTable& table = tables.back();
        table.counts.add(kind.all);
        for (std::size_t at = 0; at < kind.runs.size(); ++at) {
            table.runs[at].add(kind.runs[at]);
        }
        std::string how = reasonsOf(kind);
        std::string missed = missedOf(kind);
        table.lines.push_back({std::move(kind), std::move(how), std::move(missed)});
    }
    return tables;
}

std::string planText(const RunPlan& plan) {
    std::vector<std::string> parameters;
    for (const auto& [name, value] : plan.experiment.parameters) {
        parameters.push_back(name + " " + value.text());
    }
    return plan.name +
           (parameters.empty() ? "" : fmt::format(" ({})", fmt::join(parameters, ", ")));
}

}  // namespace host
