#include "input/nearest.h"

#include <algorithm>
#include <cctype>
#include <cstddef>
#include <numeric>
#include <utility>

namespace input {

namespace {

// The edit distance with neighbours swapped as one edit (optimal string alignment); of its table the
// last three rows.
std::size_t edits(std::string_view a, std::string_view b) {
    std::vector<std::size_t> beforeLast;
    std::vector<std::size_t> last(b.size() + 1);
    std::vector<std::size_t> row(b.size() + 1);
    std::iota(row.begin(), row.end(), std::size_t{0});
    const auto same = [](char x, char y) {
        return std::tolower(static_cast<unsigned char>(x)) ==
               std::tolower(static_cast<unsigned char>(y));
    };
    for (std::size_t i = 0; i < a.size(); ++i) {
        beforeLast = std::exchange(last, row);
        row[0] = i + 1;
        for (std::size_t j = 0; j < b.size(); ++j) {
            row[j + 1] =
                std::min({last[j] + (same(a[i], b[j]) ? 0 : 1), last[j + 1] + 1, row[j] + 1});
            if (i > 0 && j > 0 && same(a[i], b[j - 1]) && same(a[i - 1], b[j])) {
                row[j + 1] = std::min(row[j + 1], beforeLast[j - 1] + 1);
            }
        }
    }
    return row.back();
}

}  // namespace

std::string nearest(std::string_view given, const std::vector<std::string>& names) {
    std::string best;
    std::size_t fewest = std::max(given.size() / 3, std::size_t{1}) + 1;
    for (const std::string& name : names) {
        const std::size_t count = edits(given, name);
        if (count < fewest) {
            fewest = count;
            best = name;
        }
    }
    if (!best.empty() || given.size() < 3) {
        return best;
    }
    const auto begun = std::find_if(names.begin(), names.end(), [given](const std::string& name) {
        return edits(given, std::string_view(name).substr(0, given.size())) == 0;
    });
    return begun != names.end() ? *begun : "";
}

std::string didYouMean(std::string_view given, const std::vector<std::string>& names) {
    const std::string best = nearest(given, names);
    return best.empty() ? "" : "; did you mean " + best + "?";
}

}  // namespace input
