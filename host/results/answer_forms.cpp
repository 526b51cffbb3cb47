#include "host/results/answer_forms.h"

#include <algorithm>
#include <cmath>

#include <fmt/format.h>
#include <nlohmann/json.hpp>

#include "host/record/clean_text.h"
#include "host/record/run_text.h"
#include "host/report/csv.h"
#include "host/report/json_value.h"
#include "host/results/selection.h"

namespace host {

namespace {

using Json = nlohmann::ordered_json;

constexpr std::string_view kUndefined = "–";

Json jsonOfDatum(const Datum& datum) {
    struct Writer {
        Json operator()(std::monostate) const { return nullptr; }
        Json operator()(std::int64_t count) const { return count; }
        Json operator()(double number) const { return jsonOf(number); }
        Json operator()(const std::string& text) const { return cleanText(text); }
        Json operator()(const Share& share) const {
            return {{"count", share.count},
                    {"of", share.of},
                    {"share", share.value()},
                    {"low", share.low},
                    {"high", share.high}};
        }
    };
    return std::visit(Writer(), datum);
}

std::string_view kindName(ColumnKind kind) {
    static constexpr std::string_view kNames[] = {"text",  "time",    "count", "number",
                                                  "index", "percent", "share"};
    return kNames[static_cast<std::size_t>(kind)];
}

constexpr std::string_view kShareFields[] = {"count", "of", "share", "low", "high"};

std::vector<std::string> csvFields(const Datum& datum, ColumnKind kind) {
    if (kind == ColumnKind::Share) {
        const auto* share = std::get_if<Share>(&datum);
        return share == nullptr
                   ? std::vector<std::string>(std::size(kShareFields))
                   : std::vector<std::string>{fmt::to_string(share->count),
                                              fmt::to_string(share->of), numberText(share->value()),
                                              numberText(share->low), numberText(share->high)};
    }
    if (const auto* number = std::get_if<double>(&datum)) {
        return {numberText(*number)};
    }
    if (const auto* text = std::get_if<std::string>(&datum)) {
        return {csvField(std::string_view(*text))};
    }
    const auto* count = std::get_if<std::int64_t>(&datum);
    return {count != nullptr ? fmt::to_string(*count) : ""};
}

}  // namespace

bool isLinedUpRight(ColumnKind kind) {
    return kind != ColumnKind::Text && kind != ColumnKind::Time && kind != ColumnKind::Share;
}

std::string percentText(double share) {
    const double percent = 100 * share;
    const double toEnd = std::min(percent, 100 - percent);
    const int digits = toEnd <= 0 || toEnd >= 1 ? 1 : toEnd >= 0.1 ? 2 : toEnd >= 0.01 ? 3 : 4;
    return toEnd <= 0 ? fmt::format("{:.0f}", percent) : fmt::format("{:.{}f}", percent, digits);
}

std::string datumText(const Datum& datum, ColumnKind kind) {
    struct Writer {
        ColumnKind kind;
        std::string operator()(std::monostate) const { return std::string(kUndefined); }
        std::string operator()(std::int64_t count) const { return fmt::to_string(count); }
        std::string operator()(double number) const {
            return kind == ColumnKind::Percent
                       ? percentText(number / 100)
                       : fmt::format("{:.{}g}", number, kind == ColumnKind::Index ? 3 : 6);
        }
        std::string operator()(const std::string& text) const {
            return text.empty() && kind == ColumnKind::Text ? std::string(kUndefined)
                                                            : plainLine(text);
        }
        std::string operator()(const Share& share) const {
            return fmt::format("{} of {}, {} % ({} … {})", share.count, share.of,
                               percentText(share.value()), percentText(share.low),
                               percentText(share.high));
        }
    };
    return std::visit(Writer{kind}, datum);
}

std::string textAnswer(const Answer& answer) {
    std::string text = plainLine(answer.title) + "\n";
    for (const auto& [name, value] : answer.scope) {
        text += fmt::format("{} {}, ", name, plainLine(value));
    }
    text += runsText(answer) + "\n";
    if (!answer.rows.empty()) {
        std::vector<std::vector<std::string>> lines(1);
        std::vector<std::size_t> widths;
        for (const AnswerColumn& column : answer.columns) {
            lines.front().push_back(column.title);
            widths.push_back(widthOf(column.title));
        }
        for (const auto& row : answer.rows) {
            std::vector<std::string>& line = lines.emplace_back();
            for (std::size_t at = 0; at < row.size(); ++at) {
                line.push_back(datumText(row[at], answer.columns[at].kind));
                widths[at] = std::max(widths[at], widthOf(line.back()));
            }
        }
        text += "\n";
        for (const auto& line : lines) {
            std::string out;
            for (std::size_t at = 0; at < line.size(); ++at) {
                const std::string blanks(widths[at] - widthOf(line[at]), ' ');
                out += at > 0 ? "  " : "";
                out +=
                    isLinedUpRight(answer.columns[at].kind) ? blanks + line[at] : line[at] + blanks;
            }
            out.erase(out.find_last_not_of(' ') + 1);
            text += out + "\n";
        }
    }
    text += answer.notes.empty() ? "" : "\n";
    for (const std::string& note : answer.notes) {
        text += plainLine(note) + "\n";
    }
    return text;
}

std::string jsonAnswer(const Answer& answer) {
    Json json = {{"question", answer.question},
                 {"title", cleanText(answer.title)},
                 {"asked", momentText(answer.asked) + "Z"},
                 {"commandLine", cleanText(answer.commandLine)}};
    Json& scope = json["scope"] = Json::object();
    for (const auto& [name, value] : answer.scope) {
        scope[name] = cleanText(value);
    }
    json["confidence"] = kConfidence;
    json["runs"] = {{"all", answer.runs},
                    {"pass", answer.verdicts[0]},
                    {"fail", answer.verdicts[1]},
                    {"error", answer.verdicts[2]},
                    {"interrupted", answer.verdicts[3]}};
    Json& columns = json["columns"] = Json::array();
    for (const AnswerColumn& column : answer.columns) {
        columns.push_back(
            {{"key", column.key}, {"title", column.title}, {"kind", kindName(column.kind)}});
    }
    Json& rows = json["rows"] = Json::array();
    for (const auto& row : answer.rows) {
        Json object = Json::object();
        for (std::size_t at = 0; at < row.size(); ++at) {
            object[answer.columns[at].key] = jsonOfDatum(row[at]);
        }
        rows.push_back(std::move(object));
    }
    Json& notes = json["notes"] = Json::array();
    for (const std::string& note : answer.notes) {
        notes.push_back(cleanText(note));
    }
    return json.dump(2) + "\n";
}

std::string csvAnswer(const Answer& answer) {
    std::vector<std::string> head;
    for (const AnswerColumn& column : answer.columns) {
        if (column.kind != ColumnKind::Share) {
            head.push_back(column.key);
            continue;
        }
        for (const std::string_view field : kShareFields) {
            head.push_back(fmt::format("{}.{}", column.key, field));
        }
    }
    std::string csv = fmt::format("{}{}", fmt::join(head, ","), kCsvLineEnd);
    for (const auto& row : answer.rows) {
        std::vector<std::string> fields;
        for (std::size_t at = 0; at < row.size(); ++at) {
            for (std::string& field : csvFields(row[at], answer.columns[at].kind)) {
                fields.push_back(std::move(field));
            }
        }
        csv += fmt::format("{}{}", fmt::join(fields, ","), kCsvLineEnd);
    }
    return csv;
}

std::span<const AnswerForm> answerForms() {
    static constexpr AnswerForm kForms[] = {
        {"text", ".txt", false, textAnswer},
        {"json", ".json", false, jsonAnswer},
        {"csv", ".csv", false, csvAnswer},
        {"html", ".html", true, htmlAnswer},
    };
    return kForms;
}

}  // namespace host
