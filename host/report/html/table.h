// Table: a table of an HTML page.
#ifndef ZR_HOST_REPORT_HTML_TABLE_H
#define ZR_HOST_REPORT_HTML_TABLE_H

#include <string>
#include <string_view>
#include <vector>

namespace host {

struct Column {
    std::string name;
    // Class of its cells: "number" lines them up at the right, "judged" stays beside the row's name on
    // a narrow screen.
    std::string_view style{};
};

// A table: a caption, one head cell per column, and rows whose first cell names the row.
class Table {
  public:
    Table(std::string caption, std::vector<Column> columns)
        : _caption(std::move(caption)), _columns(std::move(columns)) {}

    // Cells are HTML, one for each column. On a narrow screen each cell shows its column's name.
    void row(const std::vector<std::string>& cells, std::string_view style = "");

    // Nothing when there are no rows. A table wider than the screen scrolls on its own.
    std::string html() const;

  private:
    std::string _caption;
    std::vector<Column> _columns;
    std::string _rows;
};

}  // namespace host

#endif
