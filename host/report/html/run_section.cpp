#include "host/report/html/run_section.h"

#include <algorithm>
#include <cmath>
#include <cstddef>
#include <cstdint>
#include <iterator>
#include <string_view>
#include <vector>

#include <fmt/format.h>

#include "host/record/clean_text.h"
#include "host/record/frame_gap.h"
#include "host/record/run_text.h"
#include "host/report/html/figures.h"
#include "host/report/html/table.h"

namespace host {

namespace {

// Log lines shown: as many from the start and from the end.
constexpr std::size_t kLinesAtEachEnd = 500;

// Findings listed of a repetition, and gaps of a run's frames.
constexpr std::size_t kMostFindings = 5;

// The sections of a run, and the links to them. A section without content is left out.
class Sections {
  public:
    explicit Sections(const std::string& id) : _id(id) {}

    void add(std::string_view title, const std::string& content) {
        if (content.empty()) {
            return;
        }
        const std::string id = fmt::format("{}-{}", _id, ++_count);
        _links += fmt::format("<li><a href=\"#{}\">{}</a></li>\n", id, title);
        _html +=
            fmt::format("<section>\n<h3 id=\"{}\">{}</h3>\n{}</section>\n", id, title, content);
    }

    std::string html(const std::string& name) const {
        if (_count == 0) {
            return "";
        }
        return fmt::format("<nav class=\"contents\" aria-label=\"{}\">\n<ul>\n{}</ul>\n</nav>\n",
                           htmlText("Sections of " + name), _links) +
               _html;
    }

  private:
    const std::string& _id;
    int _count = 0;
    std::string _links;
    std::string _html;
};

std::string folded(const std::string& summary, const std::string& content) {
    return content.empty() ? ""
                           : fmt::format("<details>\n<summary>{}</summary>\n{}</details>\n",
                                         htmlText(summary), content);
}

// How far the value lies from the bound that it breaks: "3 above", "2 below".
std::string deviationText(double value, const LimitRecord& limit) {
    if (std::isnan(value)) {
        return "not a number";
    }
    const auto text = [value](double bound, std::string_view side) {
        const double distance = std::abs(value - bound);
        return distance > 0 ? fmt::format("{:.6g} {}", distance, side)
                            : std::string("on the open bound");
    };
    if (limit.lower.has_value() && !(value > limit.lower->value)) {
        if (value < limit.lower->value || limit.lower->open) {
            return text(limit.lower->value, "below");
        }
    }
    return limit.upper.has_value() ? text(limit.upper->value, "above") : "";
}

std::string rangeHtml(const std::optional<LimitRecord>& limit, std::string_view unit = "") {
    return limit.has_value() ? htmlText(limitText(*limit, unit)) : "";
}

std::string limitName(const std::optional<LimitRecord>& limit) {
    return limit.has_value() ? htmlText(limit->name) : "";
}

std::string judgementHtml(Judgement judgement) {
    switch (judgement) {
        case Judgement::Within:
            return "<span class=\"pass\"><span aria-hidden=\"true\">✓</span> within</span>";
        case Judgement::Outside:
            return "<span class=\"fail\"><span aria-hidden=\"true\">✗</span> outside</span>";
        case Judgement::NotMeasured:
            return R"(<span class="fail"><span aria-hidden="true">?</span> not measured</span>)";
        case Judgement::Information:
            break;
    }
    return "<span class=\"faint\">no limit</span>";
}

// A square for each result: how many are outside, and where among them, at a glance.
std::string resultStrip(const RunRecord& run) {
    static constexpr std::string_view kClasses[] = {"information", "within", "outside"};
    if (run.results.empty()) {
        return "";
    }
    std::string squares;
    for (const ResultRecord& result : run.results) {
        squares += fmt::format("<i class=\"{}\"></i>",
                               kClasses[static_cast<std::size_t>(result.judgement)]);
    }
    return fmt::format("<div class=\"strip\" role=\"img\" aria-label=\"{}\">{}</div>\n",
                       htmlText(headline(run)), squares);
}

std::string errorHtml(const FailureRecord& failure, const RunRecord& run) {
    std::string causes;
    if (failure.error == nullptr) {
        causes = fmt::format("<li><p>{}</p></li>\n", htmlText(failureText(failure)));
    }
    for (const platform::Error* error = failure.error.get(); error != nullptr;
         error = error->underlyingError().get()) {
        causes += fmt::format("<li><p>{}{}</p><code>{} {}</code></li>\n",
                              causes.empty() ? "" : "<span class=\"faint\">caused by</span> ",
                              htmlText(error->localizedDescription()), htmlText(error->domain()),
                              error->code());
    }
    return fmt::format("<div class=\"failure error\">\n<h4>{}</h4>\n<ol>\n{}</ol>\n</div>\n",
                       htmlText(placeText(failure, run)), causes);
}

// The limits of the bench that kept the run from passing.
std::string benchFailuresHtml(const RunRecord& run) {
    Table table("Limits of the bench not met",
                {{"Quantity"}, {"Measured", "judged"}, {"Limit"}, {"Range"}, {"Deviation"}});
    for (const BenchResult& result : run.benchResults) {
        if (!isBenchFinding(result)) {
            continue;
        }
        const bool isMeasured = result.judgement != Judgement::NotMeasured;
        table.row(
            {htmlText(result.name),
             fmt::format("<strong class=\"fail\">{}</strong> {}",
                         isMeasured ? numberText(result.value) : "not measured",
                         htmlText(result.unit)),
             limitName(result.limit), rangeHtml(result.limit, result.unit),
             htmlText(isMeasured ? deviationText(result.value, *result.limit) : result.note)});
    }
    return table.html();
}

std::string failuresHtml(const RunRecord& run) {
    std::string errors;
    for (const FailureRecord& failure : run.failures) {
        errors += errorHtml(failure, run);
    }
    Table table("Results outside their limits",
                {{"Result"}, {"Measured", "judged"}, {"Limit"}, {"Range"}, {"Deviation"}});
    for (const ResultRecord& result : run.results) {
        if (result.judgement == Judgement::Outside) {
            table.row({htmlText(result.name),
                       fmt::format("<strong class=\"fail\">{}</strong> {}",
                                   numberText(result.value), htmlText(result.unit)),
                       limitName(result.limit), rangeHtml(result.limit, result.unit),
                       htmlText(deviationText(result.value, *result.limit))});
        }
    }
    return errors + table.html() + benchFailuresHtml(run);
}

// Every limit of the bench, apart from the module's own.
std::string benchHtml(const RunRecord& run) {
    if (run.benchResults.empty()) {
        return "";
    }
    Table table("Limits of the bench, which the module does not judge", {{"Quantity"},
                                                                         {"Value", "number"},
                                                                         {"Unit"},
                                                                         {"Limit"},
                                                                         {"Range"},
                                                                         {"Judgement", "judged"},
                                                                         {"Part of the verdict"}});
    for (const BenchResult& result : run.benchResults) {
        const bool isMeasured = result.judgement != Judgement::NotMeasured;
        table.row(
            {htmlText(result.name) + (isMeasured ? ""
                                                 : fmt::format(" <span class=\"faint\">{}</span>",
                                                               htmlText(result.note))),
             isMeasured ? numberText(result.value) : "–", htmlText(result.unit),
             limitName(result.limit), rangeHtml(result.limit), judgementHtml(result.judgement),
             result.partOfVerdict ? "yes" : "no"},
            result.judgement == Judgement::Within ? "" : "outside");
    }
    return fmt::format("<p>{}.</p>\n", htmlText(benchHeadline(run))) + table.html();
}

std::string resultsHtml(const RunRecord& run) {
    Table table(
        "Every result and its limit",
        {{"Result"}, {"Value", "number"}, {"Unit"}, {"Limit"}, {"Range"}, {"Judgement", "judged"}});
    for (const ResultRecord& result : run.results) {
        table.row(
            {htmlText(result.name), numberText(result.value), htmlText(result.unit),
             limitName(result.limit), rangeHtml(result.limit), judgementHtml(result.judgement)},
            result.judgement == Judgement::Outside ? "outside" : "");
    }
    return table.html();
}

std::string figuresHtml(const std::string& figures) {
    return figures.empty() ? "" : "<div class=\"figures\">\n" + figures + "</div>\n";
}

// What is known of a repetition that did not pass; the JSON report has all of it.
std::string findingsHtml(const Repetition& one) {
    std::vector<std::string> findings;
    for (const FailureRecord& failure : one.failures) {
        const std::string symptom =
            failure.error != nullptr
                ? fmt::format(" <code>{}</code>", htmlText(symptomText(failure, " ")))
                : "";
        findings.push_back(htmlText(failureText(failure)) + symptom);
    }
    for (const ResultRecord& result : one.outside) {
        findings.push_back(
            fmt::format("{} <strong class=\"fail\">{}</strong> <span "
                        "class=\"faint\">{}</span>",
                        htmlText(result.name), htmlText(valueText(result.value, result.unit)),
                        htmlText(limitLine(result.limit, result.unit))));
    }
    for (const BenchResult& result : one.bench) {
        findings.push_back(fmt::format("{} <span class=\"faint\">{}</span>", htmlText(result.name),
                                       htmlText(benchLine(result, false))));
    }
    if (findings.empty()) {
        return htmlText(one.why);
    }
    std::string items;
    for (std::size_t at = 0; at < std::min(findings.size(), kMostFindings); ++at) {
        items += "<li>" + findings[at] + "</li>";
    }
    if (findings.size() > kMostFindings) {
        items +=
            fmt::format("<li class=\"faint\">and {} more</li>", findings.size() - kMostFindings);
    }
    return "<ul>" + items + "</ul>";
}

std::string notPassedHtml(const RepeatRecord& repeat) {
    Table runs("Runs that did not pass",
               {{"Run"}, {"Verdict", "judged"}, {"Took", "number"}, {"Why", "message"}});
    for (const Repetition& one : repeat.notPassed) {
        runs.row({std::to_string(one.number),
                  fmt::format("<span class=\"{}\">{}</span>", verdictName(one.verdict),
                              verdictText(one.verdict)),
                  fmt::format("{:.2f} s", one.seconds), findingsHtml(one)});
    }
    const std::uint64_t more = repeat.notPassedCount() - repeat.notPassed.size();
    return runs.html() + (more > 0 ? fmt::format("<p>{} did not pass.</p>\n",
                                                 plural(more, "more run", "more runs"))
                                   : "");
}

// The share of each verdict, and below it the order in which they came.
std::string outcomesHtml(const RepeatRecord& repeat) {
    std::string shares;
    for (const auto& [verdict, count] :
         {std::pair(Verdict::Passed, repeat.passed), std::pair(Verdict::Failed, repeat.failed),
          std::pair(Verdict::Error, repeat.errors),
          std::pair(Verdict::Interrupted, repeat.interrupted)}) {
        if (count > 0) {
            shares += fmt::format(R"(<i class="{}" style="flex-grow:{}"></i>)",
                                  verdictName(verdict), count);
        }
    }
    std::string squares;
    for (const RepetitionOutcome& one : repeat.outcomes) {
        squares += fmt::format("<i class=\"{}\"></i>", verdictName(one.verdict));
    }
    std::string html =
        fmt::format("<div class=\"shares\" role=\"img\" aria-label=\"{}\">{}</div>\n",
                    countsText(repeat), shares);
    if (!squares.empty()) {
        const std::string label =
            repeat.outcomes.size() < repeat.runs
                ? fmt::format("The first {} runs in their order", repeat.outcomes.size())
                : "The runs in their order";
        html += fmt::format(
            "<p class=\"faint\">{0}</p>\n<div class=\"strip\" role=\"img\" "
            "aria-label=\"{0}\">{1}</div>\n",
            label, squares);
    }
    return html;
}

std::string statisticsHtml(const std::vector<ResultStatistics>& results, bool ofBench) {
    const std::vector<Column> columns = {
        {"Result"}, {"Least", "number"}, {"Median", "number"}, {"Greatest", "number"}, {"Unit"},
        {"Limit"},  {"Range"},           {"Outside", "judged"}};
    const std::string_view what = ofBench ? "Limits of the bench" : "Results";
    Table table(fmt::format("{} that differed from run to run, or were {}", what,
                            ofBench ? "not met" : "outside their limits"),
                columns);
    Table alike(fmt::format("{} {} and alike in every run", what,
                            ofBench ? "that were met" : "within their limits"),
                columns);
    std::uint64_t alikeCount = 0;
    for (const ResultStatistics& result : results) {
        const bool isBad = result.outside > 0 || result.notMeasured > 0;
        const bool isAlike = !isBad && result.minimum == result.maximum;
        alikeCount += isAlike ? 1 : 0;
        std::string outside = fmt::format("{} of {}", result.outside, result.runs);
        if (result.notMeasured > 0) {
            outside += fmt::format(", {} not measured", result.notMeasured);
        }
        (isAlike ? alike : table)
            .row({htmlText(result.name), numberText(result.minimum), numberText(result.median),
                  numberText(result.maximum), htmlText(result.unit), limitName(result.limit),
                  rangeHtml(result.limit),
                  isBad ? fmt::format("<span class=\"fail\"><span aria-hidden=\"true\">✗</span> "
                                      "{}</span>",
                                      outside)
                        : outside},
                 isBad ? "outside" : "");
    }
    const std::string_view one = ofBench ? "bench limit" : "result";
    return table.html() + folded(fmt::format("{} alike in every run",
                                             plural(alikeCount, one, fmt::format("{}s", one))),
                                 alike.html());
}

std::string repetitionsHtml(const RepeatRecord* repeat,
                            const RunRecord& run,
                            const std::string& id) {
    if (repeat == nullptr) {
        return "";
    }
    return fmt::format(
               "<p>{}: {}. The other sections show run {}, {}.</p>\n",
               plural(repeat->runs, "run", "runs"), countsText(*repeat), run.number,
               run.verdict == Verdict::Passed ? "the last" : "the first that did not pass") +
           outcomesHtml(*repeat) + notPassedHtml(*repeat) + statisticsHtml(repeat->results, false) +
           statisticsHtml(repeat->benchResults, true) + figuresHtml(repetitionFigure(*repeat, id));
}

std::string measurementsHtml(const RunRecord& run) {
    Table table("As measured by the experiment", {{"Measurement"}, {"Value", "number"}, {"Unit"}});
    for (const MeasurementRecord& one : run.measurements) {
        table.row({htmlText(one.name), numberText(one.value), htmlText(one.unit)});
    }
    const std::string html = table.html();
    // For a diagnostic the results repeat them.
    return run.results.empty()
               ? html
               : folded(plural(run.measurements.size(), "measurement", "measurements"), html);
}

std::string parametersHtml(const RunRecord& run) {
    Table table("Parameters as they were given to each part",
                {{"Parameter"}, {"Value", "number"}, {"Part"}});
    const auto add = [&](Part part) {
        const PartPlan& plan = partOf(run, part);
        for (const auto& [name, value] : plan.parameters) {
            table.row({htmlText(name), htmlText(value.text()),
                       fmt::format("{} {}", partText(part), htmlText(plan.name))});
        }
    };
    add(Part::Experiment);
    if (run.analysisSeconds.has_value()) {
        add(Part::Analysis);
    }
    return table.html();
}

std::string logHtml(const RunRecord& run) {
    Table table("Lines that the run logged, with their time of day in UTC",
                {{"Time", "time"}, {"Level"}, {"Message", "message"}});
    std::size_t errors = 0;
    std::size_t late = 0;
    for (std::size_t at = 0; at < run.log.size(); ++at) {
        const LogRecord& line = run.log[at];
        const bool isError = line.level == platform::LogLevel::Error;
        errors += isError ? 1 : 0;
        late += line.late ? 1 : 0;
        if (run.log.size() > 2 * kLinesAtEachEnd && at >= kLinesAtEachEnd &&
            at < run.log.size() - kLinesAtEachEnd) {
            if (at == kLinesAtEachEnd) {
                table.row(
                    {"…", "",
                     fmt::format("{} left out here; the JSON report has them",
                                 plural(run.log.size() - 2 * kLinesAtEachEnd, "line", "lines"))});
            }
            continue;
        }
        const std::string time = line.time.timestamp();
        table.row({time.substr(time.find('T') + 1, 12), levelText(line), htmlText(line.message)},
                  isError ? "outside" : "");
    }
    std::string summary = plural(run.log.size(), "line", "lines");
    summary += errors > 0 ? fmt::format(", {} of level error", errors) : "";
    summary += late > 0 ? fmt::format(", {} that came when the run had ended", late) : "";
    return folded(summary, table.html());
}

// How many frames came, and where frames were lost.
std::string framesHtml(const RunRecord& run) {
    std::string text = framesText(run);
    if (text.empty()) {
        return "";
    }
    const std::vector<FrameGap> gaps = gapsIn(run.frames);
    std::string items;
    for (std::size_t at = 0; at < std::min(gaps.size(), kMostFindings); ++at) {
        items += "<li>" + htmlText(gapText(gaps[at])) + "</li>\n";
    }
    if (gaps.size() > kMostFindings) {
        items += fmt::format("<li class=\"faint\">and {}</li>\n",
                             plural(gaps.size() - kMostFindings, "more gap", "more gaps"));
    }
    if (!run.framesLost.has_value()) {
        text += ". The device does not number its frames, so that lost ones cannot be counted";
    }
    return "<p>" + htmlText(text) + ".</p>\n" +
           (items.empty() ? "" : "<ul class=\"gaps\">\n" + items + "</ul>\n");
}

}  // namespace

std::string verdictHtml(Verdict verdict) {
    // A tick, a cross, an exclamation mark, a pause sign, each in a disc.
    static constexpr std::string_view kMarks[] = {"M7 12.5l3.4 3.5 6.6-7.5", "M8 8l8 8M16 8l-8 8",
                                                  "M12 6.5v7M12 17v.01", "M9 7.5v9M15 7.5v9"};
    return fmt::format(
        "<span class=\"verdict {}\"><svg class=\"disc\" viewBox=\"0 0 24 24\" "
        "aria-hidden=\"true\"><circle cx=\"12\" cy=\"12\" r=\"11\"/><path d=\"{}\"/></svg>"
        "{}</span>",
        verdictName(verdict), kMarks[static_cast<std::size_t>(verdict)], verdictText(verdict));
}

std::string runHtml(const RunRecord& run, const RepeatRecord* repeat, const SectionPlace& place) {
    const std::string outcome =
        fmt::format("<p class=\"outcome\">{} {} <span class=\"faint\">in {:.2f} s</span></p>\n",
                    verdictHtml(run.verdict), htmlText(headline(run)), run.seconds);
    Sections sections(place.id);
    sections.add("What failed", failuresHtml(run));
    sections.add("Limits of the bench", benchHtml(run));
    sections.add("Repetitions", repetitionsHtml(repeat, run, place.id));
    sections.add("Frames", framesHtml(run) + figuresHtml(frameFigures(run, place.id)));
    sections.add("Images", figuresHtml(imageFigures(run, place.id)));
    sections.add("Results and limits", resultsHtml(run));
    sections.add("Measurements", measurementsHtml(run));
    sections.add("Parameters", parametersHtml(run));
    sections.add("Log", logHtml(run));
    return fmt::format(
        "<section class=\"run\" id=\"{0}\" aria-labelledby=\"{0}-name\">\n"
        "<header>\n<h2 id=\"{0}-name\">{1}</h2>\n{2}<p class=\"summary\">{3}</p>\n{4}</header>\n"
        "{5}</section>\n",
        place.id, htmlText(place.title), place.withOutcome ? outcome : "",
        htmlText(run.plan.summary), resultStrip(run), sections.html(place.title));
}

}  // namespace host
