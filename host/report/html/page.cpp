#include "host/report/html/page.h"

#include <algorithm>
#include <cstddef>
#include <cstdint>

#include <fmt/format.h>

#include "host/record/clean_text.h"
#include "host/record/run_text.h"
#include "host/report/html/run_section.h"
#include "host/report/html/style.h"

namespace host {

namespace {

std::string sectionId(std::size_t at) {
    return fmt::format("run-{}", at + 1);
}

const RepeatRecord* repeatOf(const SessionRecord& session, std::size_t at) {
    return at < session.repeats.size() ? &session.repeats[at] : nullptr;
}

// What was run, and its outcome, in one line each.
std::string subjectOf(const SessionRecord& session) {
    return session.runs.size() == 1 ? session.runs.front().plan.name
                                    : plural(session.runs.size(), "run", "runs");
}

std::string outcomeOf(const SessionRecord& session) {
    if (!session.repeats.empty()) {
        std::uint64_t runs = 0;
        std::uint64_t passed = 0;
        for (const RepeatRecord& repeat : session.repeats) {
            runs += repeat.runs;
            passed += repeat.passed;
        }
        return fmt::format("{} of {} passed", passed, plural(runs, "run", "runs"));
    }
    if (session.runs.size() == 1) {
        return headline(session.runs.front());
    }
    const auto passed =
        std::count_if(session.runs.begin(), session.runs.end(),
                      [](const RunRecord& run) { return run.verdict == Verdict::Passed; });
    return fmt::format("{} of {} passed", passed, plural(session.runs.size(), "run", "runs"));
}

std::string factHtml(std::string_view name, std::string_view value, std::string_view more = "") {
    return fmt::format("<div><dt>{}</dt><dd>{}{}</dd></div>\n", name, htmlText(value),
                       more.empty() ? "" : fmt::format(" <span>{}</span>", htmlText(more)));
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
                       verdictClass(session.verdict), htmlText(subjectOf(session)),
                       verdictHtml(session.verdict), htmlText(outcomeOf(session)),
                       factHtml("Device", session.deviceName, session.deviceSummary) +
                           factHtml("Started", session.started.text()) +
                           factHtml("Took", fmt::format("{:.2f} s", session.seconds)) +
                           factHtml("Bench", "zrlab " + session.version));
}

// With several runs: a link to each, and its outcome.
std::string contentsHtml(const SessionRecord& session) {
    if (session.runs.size() < 2) {
        return "";
    }
    std::string entries;
    for (std::size_t at = 0; at < session.runs.size(); ++at) {
        const RunRecord& run = session.runs[at];
        entries += fmt::format(
            "<li><a href=\"#{}\">{} {}</a> <span class=\"faint\">{}</span></li>\n", sectionId(at),
            verdictHtml(run.verdict), htmlText(run.plan.name), htmlText(headline(run)));
    }
    return "<nav class=\"sheet\" aria-label=\"Runs\">\n<ol>\n" + entries + "</ol>\n</nav>\n";
}

std::string footHtml(const SessionRecord& session) {
    std::string facts;
    for (const auto& [name, text] : session.deviceFacts) {
        facts += factHtml("Device: " + htmlText(name), text);
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
    std::string page = fmt::format(
        R"(<!DOCTYPE html>
<html lang="en">
<head>
<meta charset="utf-8">
<meta name="viewport" content="width=device-width, initial-scale=1">
<meta name="color-scheme" content="light dark">
<meta http-equiv="Content-Security-Policy" content="default-src 'none'; style-src 'unsafe-inline'">
<title>{} · {} · zrlab</title>
<style>
{}</style>
</head>
<body>
<a class="skip" href="#results">Skip to the results</a>
)",
        verdictText(session.verdict), htmlText(subjectOf(session)), kReportStyle);
    const bool manyRuns = session.runs.size() > 1 || !session.repeats.empty();
    page += headHtml(session) + contentsHtml(session) + "<main class=\"sheet\" id=\"results\">\n";
    for (std::size_t at = 0; at < session.runs.size(); ++at) {
        page += runHtml(session.runs[at], repeatOf(session, at), sectionId(at), manyRuns);
    }
    return page + "</main>\n" + footHtml(session) + "</body>\n</html>\n";
}

std::shared_ptr<RunListener> openHtmlReport(ReportSink sink, const TextStyle& /*style*/) {
    return wholeReport(std::move(sink), htmlReport);
}

}  // namespace host
