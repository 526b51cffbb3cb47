#include <variant>

#include <fmt/format.h>

#include "host/record/clean_text.h"
#include "host/report/html/page_frame.h"
#include "host/report/html/table.h"
#include "host/results/answer_forms.h"
#include "host/results/selection.h"

namespace host {

namespace {

std::string drawn(const LinePlot& plot) {
    return linePlot(plot);
}
std::string drawn(const BarPlot& plot) {
    return barPlot(plot);
}

std::string drawingsHtml(const Answer& answer) {
    std::string figures;
    for (Drawing drawing : answer.drawings) {
        figures += std::visit(
            [](auto& plot) {
                plot.figure.level = 3;
                return drawn(plot);
            },
            drawing);
    }
    return figures.empty()
               ? ""
               : "<section>\n<h2 class=\"part\">Drawings</h2>\n<div class=\"figures\">\n" +
                     figures + "</div>\n</section>\n";
}

// A share in two lines: what it is, and how far to trust it.
std::string cellHtml(const Datum& datum, ColumnKind kind) {
    const auto* share = std::get_if<Share>(&datum);
    return share == nullptr ? htmlText(datumText(datum, kind))
                            : fmt::format("{} % <span class=\"trust\">{} of {} ({} … {})</span>",
                                          percentText(share->value()), share->count, share->of,
                                          percentText(share->low), percentText(share->high));
}

std::string tableHtml(const Answer& answer) {
    std::vector<Column> columns;
    for (const AnswerColumn& column : answer.columns) {
        columns.push_back({column.title, isLinedUpRight(column.kind) ? "number" : ""});
    }
    Table table(answer.title, columns);
    for (const auto& row : answer.rows) {
        std::vector<std::string> cells;
        for (std::size_t at = 0; at < row.size(); ++at) {
            cells.push_back(cellHtml(row[at], answer.columns[at].kind));
        }
        table.row(cells);
    }
    const std::string html = table.html();
    return html.empty() ? ""
                        : "<section>\n<h2 class=\"part\">Figures</h2>\n" + html + "</section>\n";
}

std::string notesHtml(const Answer& answer) {
    std::string items;
    for (const std::string& note : answer.notes) {
        items += "<li>" + htmlText(note) + "</li>\n";
    }
    return items.empty() ? ""
                         : "<section>\n<h2 class=\"part\">What the figures mean</h2>\n<ul "
                           "class=\"notes\">\n" +
                               items + "</ul>\n</section>\n";
}

}  // namespace

std::string htmlAnswer(const Answer& answer) {
    std::string scope;
    for (const auto& [name, value] : answer.scope) {
        scope += factHtml(name, value);
    }
    return pageStart(answer.title) +
           fmt::format(R"(<header class="masthead hue-a">
<div class="sheet">
<p class="subject">{}</p>
<h1>{}</h1>
<dl class="facts">
{}</dl>
</div>
</header>
<main class="sheet" id="results">
{}{}{}</main>
<footer class="sheet">
<h2>How this was made</h2>
<dl>
{}{}</dl>
</footer>
)",
                       runsText(answer), htmlText(answer.title), scope, drawingsHtml(answer),
                       tableHtml(answer), notesHtml(answer),
                       factHtml("Command", answer.commandLine),
                       factHtml("Asked", momentText(answer.asked) + " UTC")) +
           std::string(kPageEnd);
}

}  // namespace host
