#include "host/report/html/table.h"

#include <cstddef>

#include <fmt/format.h>

#include "host/record/clean_text.h"

namespace host {

namespace {

std::string classOf(const Column& column) {
    return column.style.empty() ? "" : fmt::format(" class=\"{}\"", column.style);
}

}  // namespace

void Table::row(const std::vector<std::string>& cells, std::string_view style) {
    _rows += style.empty() ? "<tr>" : fmt::format("<tr class=\"{}\">", style);
    for (std::size_t at = 0; at < cells.size(); ++at) {
        const Column& column = _columns[at];
        _rows += at == 0 ? fmt::format("<th scope=\"row\"{}>{}</th>", classOf(column), cells[at])
                         : fmt::format("<td data-name=\"{}\"{}>{}</td>", column.name,
                                       classOf(column), cells[at]);
    }
    _rows += "</tr>\n";
}

std::string Table::html() const {
    if (_rows.empty()) {
        return "";
    }
    std::string head;
    for (const Column& column : _columns) {
        head += fmt::format("<th scope=\"col\"{}>{}</th>", classOf(column), column.name);
    }
    const std::string caption = htmlText(_caption);
    return fmt::format(
        "<div class=\"scroll\" role=\"group\" aria-label=\"{0}\" tabindex=\"0\">\n"
        "<table>\n<caption>{0}</caption>\n<thead><tr>{1}</tr></thead>\n<tbody>\n{2}</tbody>\n"
        "</table>\n</div>\n",
        caption, head, _rows);
}

}  // namespace host
