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
#include "host/record/run_text.h"
#include "host/report/html/figures.h"

namespace host {

namespace {

// Log lines shown: as many from the start and from the end.
constexpr std::size_t kLinesAtEachEnd = 500;

struct Column {
    std::string_view name;
    std::string_view style{};  // class of its cells: "number" lines them up at the right
};

// A table: a caption, one head cell per column, and rows whose first cell names the row.
class Table {
  public:
    Table(std::string caption, std::vector<Column> columns)
        : _caption(std::move(caption)), _columns(std::move(columns)) {}

    // Cells are HTML, one for each column.
    void row(const std::vector<std::string>& cells, std::string_view style = "") {
        _rows += style.empty() ? "<tr>" : fmt::format("<tr class=\"{}\">", style);
        for (std::size_t at = 0; at < cells.size(); ++at) {
            const std::string attributes =
                (at == 0 ? " scope=\"row\"" : "") + _classOf(_columns[at]);
            _rows += fmt::format("<{0}{1}>{2}</{0}>", at == 0 ? "th" : "td", attributes, cells[at]);
        }
        _rows += "</tr>\n";
    }

    // Nothing when there are no rows. A table wider than the screen scrolls on its own.
    std::string html() const {
        if (_rows.empty()) {
            return "";
        }
        std::string head;
        for (const Column& column : _columns) {
            head += fmt::format("<th scope=\"col\"{}>{}</th>", _classOf(column), column.name);
        }
        const std::string caption = htmlText(_caption);
        return fmt::format(
            "<div class=\"scroll\" role=\"region\" aria-label=\"{0}\" tabindex=\"0\">\n"
            "<table>\n<caption>{0}</caption>\n<thead><tr>{1}</tr></thead>\n<tbody>\n{2}</tbody>\n"
            "</table>\n</div>\n",
            caption, head, _rows);
    }

  private:
    static std::string _classOf(const Column& column) {
        return column.style.empty() ? "" : fmt::format(" class=\"{}\"", column.style);
    }

    std::string _caption;
    std::vector<Column> _columns;
    std::string _rows;
};

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
        _html += fmt::format(
            "<section aria-labelledby=\"{0}\">\n<h3 id=\"{0}\">{1}</h3>\n{2}"
            "</section>\n",
            id, title, content);
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

std::string failuresHtml(const RunRecord& run) {
    std::string errors;
    for (const FailureRecord& failure : run.failures) {
        errors += errorHtml(failure, run);
    }
    Table table("Results outside their limits",
                {{"Result"}, {"Measured", "number"}, {"Limit"}, {"Range"}, {"Deviation"}});
    for (const ResultRecord& result : run.results) {
        if (result.judgement == Judgement::Outside) {
            table.row({htmlText(result.name),
                       fmt::format("<strong class=\"fail\">{}</strong> {}",
                                   numberText(result.value), htmlText(result.unit)),
                       limitName(result.limit), rangeHtml(result.limit, result.unit),
                       htmlText(deviationText(result.value, *result.limit))});
        }
    }
    return errors + table.html();
}

std::string resultsHtml(const RunRecord& run) {
    Table table("Every result and its limit",
                {{"Result"}, {"Value", "number"}, {"Unit"}, {"Limit"}, {"Range"}, {"Judgement"}});
    for (const ResultRecord& result : run.results) {
        table.row(
            {htmlText(result.name), numberText(result.value), htmlText(result.unit),
             limitName(result.limit), rangeHtml(result.limit), judgementHtml(result.judgement)},
            result.judgement == Judgement::Outside ? "outside" : "");
    }
    return table.html();
}

std::string repetitionsHtml(const RepeatRecord* repeat, const RunRecord& run) {
    if (repeat == nullptr) {
        return "";
    }
    std::string shares;
    for (const auto& [style, count] :
         {std::pair("pass", repeat->passed), std::pair("fail", repeat->failed),
          std::pair("error", repeat->errors)}) {
        if (count > 0) {
            shares += fmt::format(R"(<i class="{}" style="flex-grow:{}"></i>)", style, count);
        }
    }
    const std::string counts =
        fmt::format("{}: {} passed, {} failed, {} in error", plural(repeat->runs, "run", "runs"),
                    repeat->passed, repeat->failed, repeat->errors);
    Table runs("Runs that did not pass", {{"Run", "number"}, {"Verdict"}, {"Why"}});
    for (const Repetition& one : repeat->notPassed) {
        runs.row({std::to_string(one.number),
                  fmt::format("<span class=\"{}\">{}</span>", verdictClass(one.verdict),
                              verdictText(one.verdict)),
                  htmlText(one.why)});
    }
    const std::uint64_t notListed = repeat->failed + repeat->errors - repeat->notPassed.size();
    const std::string more = notListed > 0 ? fmt::format("<p>{} did not pass.</p>\n",
                                                         plural(notListed, "more run", "more runs"))
                                           : "";
    const std::vector<Column> columns = {
        {"Result"}, {"Least", "number"}, {"Median", "number"}, {"Greatest", "number"}, {"Unit"},
        {"Limit"},  {"Range"},           {"Outside", "number"}};
    Table table("Results that differed from run to run, or were outside their limits", columns);
    Table alike("Results within their limits and alike in every run", columns);
    std::uint64_t alikeCount = 0;
    for (const ResultStatistics& result : repeat->results) {
        const bool isAlike = result.outside == 0 && result.minimum == result.maximum;
        alikeCount += isAlike ? 1 : 0;
        const std::string outside = fmt::format("{} of {}", result.outside, result.runs);
        (isAlike ? alike : table)
            .row({htmlText(result.name), numberText(result.minimum), numberText(result.median),
                  numberText(result.maximum), htmlText(result.unit), limitName(result.limit),
                  rangeHtml(result.limit),
                  result.outside > 0
                      ? fmt::format("<span class=\"fail\"><span aria-hidden=\"true\">✗</span> "
                                    "{}</span>",
                                    outside)
                      : outside},
                 result.outside > 0 ? "outside" : "");
    }
    return fmt::format(
        "<p>{0}. The other sections show run {1}, {2}.</p>\n"
        "<div class=\"shares\" role=\"img\" aria-label=\"{0}\">{3}</div>\n{4}",
        counts, run.number,
        run.verdict == Verdict::Passed ? "the last" : "the first that did not pass", shares,
        table.html() + runs.html() + more +
            folded(plural(alikeCount, "result alike in every run", "results alike in every run"),
                   alike.html()));
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
    for (std::size_t at = 0; at < run.log.size(); ++at) {
        const LogRecord& line = run.log[at];
        const bool isError = line.level == platform::LogLevel::Error;
        errors += isError ? 1 : 0;
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
        table.row({time.substr(time.find('T') + 1, 12), std::string(levelText(line.level)),
                   htmlText(line.message)},
                  isError ? "outside" : "");
    }
    std::string summary = plural(run.log.size(), "line", "lines");
    if (errors > 0) {
        summary += fmt::format(", {} of level error", errors);
    }
    return folded(summary, table.html());
}

}  // namespace

std::string_view verdictClass(Verdict verdict) {
    static constexpr std::string_view kClasses[] = {"pass", "fail", "error"};
    return kClasses[static_cast<std::size_t>(verdict)];
}

std::string verdictHtml(Verdict verdict) {
    // A tick, a cross, an exclamation mark, each in a disc.
    static constexpr std::string_view kMarks[] = {"M7 12.5l3.4 3.5 6.6-7.5", "M8 8l8 8M16 8l-8 8",
                                                  "M12 6.5v7M12 17v.01"};
    return fmt::format(
        "<span class=\"verdict {}\"><svg class=\"disc\" viewBox=\"0 0 24 24\" "
        "aria-hidden=\"true\"><circle cx=\"12\" cy=\"12\" r=\"11\"/><path d=\"{}\"/></svg>"
        "{}</span>",
        verdictClass(verdict), kMarks[static_cast<std::size_t>(verdict)], verdictText(verdict));
}

std::string runHtml(const RunRecord& run,
                    const RepeatRecord* repeat,
                    const std::string& id,
                    bool withOutcome) {
    const std::string outcome =
        fmt::format("<p class=\"outcome\">{} {} <span class=\"faint\">in {:.2f} s</span></p>\n",
                    verdictHtml(run.verdict), htmlText(headline(run)), run.seconds);
    const auto figures = [](const std::string& content) {
        return content.empty() ? "" : "<div class=\"figures\">\n" + content + "</div>\n";
    };
    Sections sections(id);
    sections.add("What failed", failuresHtml(run));
    sections.add("Results and limits", resultsHtml(run));
    sections.add("Repetitions", repetitionsHtml(repeat, run));
    sections.add("Measurements", measurementsHtml(run));
    sections.add("Frames", figures(frameFigures(run, id)));
    sections.add("Images", figures(imageFigures(run, id)));
    sections.add("Parameters", parametersHtml(run));
    sections.add("Log", logHtml(run));
    return fmt::format(
        "<section class=\"run\" id=\"{0}\" aria-labelledby=\"{0}-name\">\n"
        "<header>\n<h2 id=\"{0}-name\">{1}</h2>\n{2}<p class=\"summary\">{3}</p>\n{4}</header>\n"
        "{5}</section>\n",
        id, htmlText(run.plan.name), withOutcome ? outcome : "", htmlText(run.plan.summary),
        resultStrip(run), sections.html(run.plan.name));
}

}  // namespace host
