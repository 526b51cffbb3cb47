#include "host/report/html/page.h"

#include <algorithm>
#include <cstddef>
#include <cstdint>

#include <fmt/format.h>

#include "host/record/clean_text.h"
#include "host/record/run_text.h"
#include "host/report/html/page_frame.h"
#include "host/report/html/run_section.h"

namespace host {

namespace {

std::string sectionId(std::size_t at) {
    return fmt::format("run-{}", at + 1);
}

// The run's name; with its place among the runs of that name when there are several.
std::string titleOf(const SessionRecord& session, std::size_t at) {
    const std::string& name = session.runs[at].plan.name;
    std::size_t place = 0;
    std::size_t count = 0;
    for (std::size_t other = 0; other < session.runs.size(); ++other) {
        if (session.runs[other].plan.name == name) {
            ++count;
            place = other <= at ? count : place;
        }
    }
    return count == 1 ? name : fmt::format("{} ({} of {})", name, place, count);
}

std::size_t namesIn(const SessionRecord& session) {
    return session.runs.size() + session.notStarted().size();
}

// What was run, and its outcome, in one line each.
std::string subjectOf(const SessionRecord& session) {
    if (namesIn(session) != 1) {
        return plural(namesIn(session), "run", "runs");
    }
    return session.runs.empty() ? session.planned.front().name : session.runs.front().plan.name;
}

std::string outcomeOf(const SessionRecord& session) {
    if (session.verdict == Verdict::Interrupted) {
        return interruptionText(session);
    }
    std::uint64_t runs = session.runs.size();
    auto passed = static_cast<std::uint64_t>(
        std::count_if(session.runs.begin(), session.runs.end(),
                      [](const RunRecord& run) { return run.verdict == Verdict::Passed; }));
    if (!session.repeats.empty()) {
        runs = passed = 0;
        for (const RepeatRecord& repeat : session.repeats) {
            runs += repeat.runs;
            passed += repeat.passed;
        }
    } else if (runs == 1) {
        return headline(session.runs.front());
    }
    return fmt::format("{} of {} passed", passed, plural(runs, "run", "runs"));
}

// The unit first, then the rest of what was given about it and the place.
std::string identityHtml(const SessionRecord& session) {
    std::string facts;
    for (const auto& [name, text] : identityTexts(session.identity)) {
        std::string label = htmlText(name);
        if (label.front() >= 'a' && label.front() <= 'z') {
            label.front() = static_cast<char>(label.front() - 'a' + 'A');
        }
        facts += factHtml(label, text);
    }
    return facts;
}

std::string headHtml(const SessionRecord& session) {
    return fmt::format(R"(<header class="masthead {0}">
<div class="sheet">
<p class="subject">{1}</p>
<h1>{2} <span class="headline">{3}</span></h1>
<dl class="facts">
{4}</dl>
</div>
</header>
)",
                       verdictName(session.verdict), htmlText(subjectOf(session)),
                       verdictHtml(session.verdict), htmlText(outcomeOf(session)),
                       identityHtml(session) +
                           factHtml("Device", session.deviceName, session.deviceSummary) +
                           factHtml("Started", session.started.text()) +
                           factHtml("Took", fmt::format("{:.2f} s", session.seconds)) +
                           factHtml("Bench", "zrlab " + session.version));
}

// With several names: a link to each run, its outcome, and which names were not started.
std::string contentsHtml(const SessionRecord& session) {
    if (namesIn(session) < 2) {
        return "";
    }
    std::string entries;
    for (std::size_t at = 0; at < session.runs.size(); ++at) {
        const RunRecord& run = session.runs[at];
        entries += fmt::format(
            "<li><a href=\"#{}\">{} {}</a> <span class=\"faint\">{}</span></li>\n", sectionId(at),
            verdictHtml(run.verdict), htmlText(titleOf(session, at)), htmlText(headline(run)));
    }
    for (const RunPlan& plan : session.notStarted()) {
        entries += fmt::format("<li>{} <span class=\"faint\">not started</span></li>\n",
                               htmlText(plan.name));
    }
    return "<nav class=\"sheet\" aria-label=\"Runs\">\n<ol>\n" + entries + "</ol>\n</nav>\n";
}

std::string footHtml(const SessionRecord& session) {
    std::string facts;
    for (const auto& [name, text] : session.deviceFacts) {
        facts += factHtml("Device: " + htmlText(name), text);
    }
    facts += factHtml("Station", session.identity.station);
    for (std::size_t at = 0; at < session.runs.size(); ++at) {
        facts += factHtml("Run: " + htmlText(titleOf(session, at)), session.runs[at].uuid);
    }
    return fmt::format(R"(<footer class="sheet">
<h2>How this was made</h2>
<dl>
<div><dt>Device</dt><dd>{}: {}</dd></div>
{}<div><dt>Command line</dt><dd><code>{}</code></dd></div>
</dl>
</footer>
)",
                       htmlText(session.deviceName), htmlText(session.deviceSummary), facts,
                       htmlText(session.commandLine));
}

}  // namespace

std::string htmlReport(const SessionRecord& session) {
    const std::string& unit = session.identity.unit;
    std::string page = pageStart(fmt::format("{} · {}{}", verdictText(session.verdict),
                                             subjectOf(session), unit.empty() ? "" : " · " + unit));
    const bool manyRuns = namesIn(session) > 1 || !session.repeats.empty();
    page += headHtml(session) + contentsHtml(session) + "<main class=\"sheet\" id=\"results\">\n";
    for (std::size_t at = 0; at < session.runs.size(); ++at) {
        page += runHtml(session.runs[at], session.repeatOf(at),
                        {sectionId(at), titleOf(session, at), manyRuns});
    }
    return page + "</main>\n" + footHtml(session) + std::string(kPageEnd);
}

std::shared_ptr<RunListener> openHtmlReport(ReportSink sink, const TextStyle& /*style*/) {
    return wholeReport(std::move(sink), htmlReport);
}

}  // namespace host
