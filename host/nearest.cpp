#include "host/nearest.h"

#include <algorithm>
#include <cctype>
#include <cstddef>
#include <numeric>

namespace host {

namespace {

// Levenshtein's distance, one row at a time.
std::size_t edits(std::string_view a, std::string_view b) {
    std::vector<std::size_t> row(b.size() + 1);
    std::iota(row.begin(), row.end(), std::size_t{0});
    const auto lower = [](char c) { return std::tolower(static_cast<unsigned char>(c)); };
    for (std::size_t i = 0; i < a.size(); ++i) {
        std::size_t diagonal = row[0];
        row[0] = i + 1;
        for (std::size_t j = 0; j < b.size(); ++j) {
            const std::size_t replaced = diagonal + (lower(a[i]) == lower(b[j]) ? 0 : 1);
            diagonal = row[j + 1];
            row[j + 1] = std::min({row[j] + 1, row[j + 1] + 1, replaced});
        }
    }
    return row.back();
}

}  // namespace

std::string nearest(std::string_view given, const std::vector<std::string>& names) {
    std::string best;
    std::size_t fewest = given.size() / 3 + 1;
    for (const std::string& name : names) {
        const std::size_t count = edits(given, name);
        if (count < fewest) {
            fewest = count;
            best = name;
        }
    }
    return best;
}

std::string didYouMean(std::string_view given, const std::vector<std::string>& names) {
    const std::string best = nearest(given, names);
    return best.empty() ? "" : "; did you mean " + best + "?";
}

}  // namespace host
