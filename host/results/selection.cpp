#include "host/results/selection.h"

#include <charconv>
#include <chrono>
#include <cstdio>
#include <limits>

#include <fmt/format.h>

#include "host/record/clean_text.h"
#include "host/record/problem.h"
#include "host/store/run_json.h"
#include "input/nearest.h"

namespace host {

namespace {

using std::chrono::microseconds;

constexpr std::int64_t kMicroseconds = 1'000'000;

// A text of the filter: what it is called, and the column that must have it.
struct NameFilter {
    std::string Filter::*text;
    std::string_view name;
    std::string_view column;
};
constexpr NameFilter kNameFilters[] = {
    {&Filter::station, "station", "stations.name"},
    {&Filter::part, "part", "runs.part"},
    {&Filter::lot, "lot", "runs.lot"},
    {&Filter::diagnostic, "diagnostic", "runs.diagnostic"},
    {&Filter::version, "program version", "runs.version"},
};

// Seconds before now: a whole number and a unit.
std::optional<std::int64_t> ago(std::string_view text) {
    static constexpr std::pair<char, std::int64_t> kUnits[] = {
        {'m', 60}, {'h', 3600}, {'d', 86400}, {'w', 7 * 86400}};
    std::int64_t count = 0;
    const auto [end, error] = std::from_chars(text.data(), text.data() + text.size(), count);
    if (error != std::errc() || end + 1 != text.data() + text.size() || count < 0 ||
        count > 1'000'000) {
        return std::nullopt;
    }
    for (const auto& [unit, seconds] : kUnits) {
        if (*end == unit) {
            return count * seconds;
        }
    }
    return std::nullopt;
}

}  // namespace

std::vector<std::pair<std::string, std::string>> Filter::scope() const {
    std::vector<std::pair<std::string, std::string>> scope;
    if (since.has_value()) {
        scope.emplace_back("since", momentText(*since));
    }
    if (until.has_value()) {
        scope.emplace_back("before", momentText(*until));
    }
    for (const NameFilter& one : kNameFilters) {
        if (!(this->*one.text).empty()) {
            scope.emplace_back(one.name, this->*one.text);
        }
    }
    return scope;
}

std::int64_t momentOf(std::string_view option,
                      const std::string& text,
                      std::int64_t now,
                      bool toEnd) {
    if (const auto seconds = ago(text)) {
        return now - *seconds * kMicroseconds;
    }
    int year = 0;
    unsigned month = 0;
    unsigned day = 0;
    unsigned hour = 0;
    unsigned minute = 0;
    unsigned second = 0;
    char separator = ' ';
    int dateEnd = -1;
    int minuteEnd = -1;
    int secondEnd = -1;
    std::sscanf(text.c_str(), "%4d-%2u-%2u%n%c%2u:%2u%n:%2u%n", &year, &month, &day, &dateEnd,
                &separator, &hour, &minute, &minuteEnd, &second, &secondEnd);
    const int end = std::max({dateEnd, minuteEnd, secondEnd});
    const std::string rest = end < 0 ? "?" : text.substr(static_cast<std::size_t>(end));
    const auto date = std::chrono::year(year) / std::chrono::month(month) / std::chrono::day(day);
    const bool isDateAlone = end == dateEnd;
    if (!date.ok() || hour > 23 || minute > 59 || second > 59 ||
        !(rest.empty() || (rest == "Z" && !isDateAlone)) ||
        (separator != ' ' && separator != 'T')) {
        throw Problem(kExitUsage, fmt::format("results: {} {}: it is not a time; write 2026-11-25, "
                                              "\"2026-11-25 14:30\" (UTC) or a "
                                              "time ago: 90m, 12h, 7d, 2w",
                                              option, plainLine(text)));
    }
    const std::chrono::sys_days midnight(date);
    const auto moment = midnight + std::chrono::hours(isDateAlone && toEnd ? 24 : hour) +
                        std::chrono::minutes(minute) + std::chrono::seconds(second);
    return std::chrono::duration_cast<microseconds>(moment.time_since_epoch()).count();
}

std::string momentText(std::int64_t moment) {
    return dateOf(moment).text().substr(0, 19);
}

std::string dayText(std::int64_t moment) {
    return momentText(moment).substr(0, 10);
}

Selection::Selection(const Filter& filter) : _condition("TRUE") {
    if (filter.since.has_value()) {
        _condition += " AND runs.started >= " + add(*filter.since);
    }
    if (filter.until.has_value()) {
        _condition += " AND runs.started < " + add(*filter.until);
    }
    for (const NameFilter& one : kNameFilters) {
        if (!(filter.*one.text).empty()) {
            _condition += fmt::format(" AND {} = {}", one.column, add(filter.*one.text));
        }
    }
}

std::string Selection::add(Cell value) {
    _parameters.push_back(std::move(value));
    return fmt::format("${}", _parameters.size());
}

Rows Selection::rows(Store& store, std::string_view sql) const {
    const std::pair<std::string_view, std::string_view> words[] = {
        {"{runs}", kRuns}, {"{selected}", _condition}, {"{source}", kSource}};
    return store.query(withWords(sql, words), _parameters);
}

std::vector<std::string> unknownNames(Store& store, const Filter& filter) {
    std::vector<std::string> notes;
    for (const NameFilter& one : kNameFilters) {
        const std::string& wanted = filter.*one.text;
        if (wanted.empty()) {
            continue;
        }
        const auto select = [&](std::string_view end, Row parameters) {
            return store.query(
                fmt::format("SELECT DISTINCT {} FROM {} {}", one.column, Selection::kRuns, end),
                std::move(parameters));
        };
        if (select(fmt::format("WHERE {} = $1", one.column), {wanted}).empty()) {
            std::vector<std::string> names;
            for (const Row& row : select("", {})) {
                names.push_back(textAt(row, 0));
            }
            notes.push_back(fmt::format("No run has the {} \"{}\"{}", one.name, wanted,
                                        input::didYouMean(wanted, names)));
        }
    }
    return notes;
}

std::string sourceName(std::int64_t source) {
    static constexpr std::string_view kNames[] = {"analysis", "experiment", "bench"};
    return std::string(kNames[source]);
}

std::int64_t integerAt(const Row& row, std::size_t column) {
    const auto* integer = std::get_if<std::int64_t>(&row.at(column));
    return integer != nullptr ? *integer : static_cast<std::int64_t>(numberAt(row, column));
}

double numberAt(const Row& row, std::size_t column) {
    return optionalAt(row, column).value_or(std::numeric_limits<double>::quiet_NaN());
}

std::optional<double> optionalAt(const Row& row, std::size_t column) {
    if (const auto* number = std::get_if<double>(&row.at(column))) {
        return *number;
    }
    const auto* integer = std::get_if<std::int64_t>(&row.at(column));
    return integer != nullptr ? std::optional(static_cast<double>(*integer)) : std::nullopt;
}

const std::string& textAt(const Row& row, std::size_t column) {
    static const std::string kNone;
    const auto* text = std::get_if<std::string>(&row.at(column));
    return text != nullptr ? *text : kNone;
}

}  // namespace host
