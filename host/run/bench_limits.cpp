#include "host/run/bench_limits.h"

#include <algorithm>
#include <filesystem>
#include <iterator>
#include <string_view>
#include <utility>

#include "host/record/problem.h"
#include "host/run/figure.h"
#include "input/json_reader.h"
#include "input/nearest.h"
#include "input/text_file.h"

namespace host {

namespace {

using input::JsonNode;

// Far outside of what is measured, and so near that bounds can be compared and written as they are.
constexpr double kGreatest = 1e15;

struct Draft {
    std::optional<BoundRecord> lower;
    std::optional<BoundRecord> upper;
    std::optional<bool> partOfVerdict;
};

void setBound(const JsonNode& value, bool open, std::optional<BoundRecord>& bound) {
    if (bound.has_value()) {
        value.fail("a second bound on the same side");
    }
    bound = BoundRecord{value.asDouble(-kGreatest, kGreatest), open};
}

// Nothing writes such a file, hence no writers.
constexpr input::JsonKey<Draft> kLimitKeys[] = {
    {"atLeast", [](const JsonNode& value, Draft& limit) { setBound(value, false, limit.lower); },
     nullptr},
    {"above", [](const JsonNode& value, Draft& limit) { setBound(value, true, limit.lower); },
     nullptr},
    {"atMost", [](const JsonNode& value, Draft& limit) { setBound(value, false, limit.upper); },
     nullptr},
    {"below", [](const JsonNode& value, Draft& limit) { setBound(value, true, limit.upper); },
     nullptr},
    {"partOfVerdict",
     [](const JsonNode& value, Draft& limit) { limit.partOfVerdict = value.asBool(); }, nullptr},
};

Draft readLimit(const JsonNode& node) {
    Draft limit;
    readObject(node, kLimitKeys, limit);
    if (!limit.lower.has_value() && !limit.upper.has_value()) {
        node.fail("no bound: atLeast, above, atMost or below");
    }
    if (limit.lower.has_value() && limit.upper.has_value()) {
        const bool admitsOne = !limit.lower->open && !limit.upper->open;
        if (limit.lower->value > limit.upper->value ||
            (limit.lower->value == limit.upper->value && !admitsOne)) {
            node.fail("no value is within these bounds");
        }
    }
    return limit;
}

// What the file says, before what it says of all limits is known.
struct File {
    std::string name;
    bool partOfVerdict = false;
    std::vector<std::pair<BenchLimit, std::optional<bool>>> limits;
};

class Reader {
  public:
    Reader(File& file, const std::vector<std::string>& runnable)
        : _file(file), _runnable(runnable) {}

    void read(const JsonNode& document) {
        document.forEachKey([&](const std::string& key, const JsonNode& value) {
            if (key == "$schema" || key == "summary") {
                value.asText();
            } else if (key == "name") {
                _file.name = value.asText();
                if (_file.name.empty() || _file.name != input::oneLine(_file.name)) {
                    value.fail("not a line of text");
                }
            } else if (key == "partOfVerdict") {
                _file.partOfVerdict = value.asBool();
            } else if (key == "limits") {
                value.forEachKey(
                    [&](const std::string& run, const JsonNode& groups) { _readRun(run, groups); });
            } else {
                failUnknownKey(value, key, {"summary", "name", "partOfVerdict", "limits"});
            }
        });
        document.requireKeys({"limits"}, "no limits");
    }

  private:
    void _readRun(const std::string& run, const JsonNode& groups) {
        if (std::find(_runnable.begin(), _runnable.end(), run) == _runnable.end()) {
            failUnknownName(groups, run, _runnable, "diagnostic or experiment",
                            "zrlab list shows them");
        }
        groups.forEachKey([&](const std::string& key, const JsonNode& value) {
            if (key == "measurements") {
                value.forEachKey([&](const std::string& name, const JsonNode& limit) {
                    _add({run, std::nullopt, name, {}, false}, limit);
                });
            } else if (key == "frames" || key == "images") {
                _readFigures(run, key == "frames" ? FigureGroup::Frames : FigureGroup::Images,
                             value);
            } else {
                failUnknownKey(value, key, {"measurements", "frames", "images"});
            }
        });
    }

    void _readFigures(const std::string& run, FigureGroup group, const JsonNode& node) {
        node.forEachKey([&](const std::string& key, const JsonNode& limit) {
            std::vector<std::string> known;
            for (std::size_t at = 0; at < kFigureCount; ++at) {
                if (kFigures[at].group == group) {
                    if (kFigures[at].key == key) {
                        _add({run, at, "", {}, false}, limit);
                        return;
                    }
                    known.emplace_back(kFigures[at].key);
                }
            }
            failUnknownKey(limit, key, known);
        });
    }

    void _add(BenchLimit limit, const JsonNode& node) {
        const Draft draft = readLimit(node);
        limit.limit.lower = draft.lower;
        limit.limit.upper = draft.upper;
        _file.limits.emplace_back(std::move(limit), draft.partOfVerdict);
    }

    File& _file;
    const std::vector<std::string>& _runnable;
};

}  // namespace

std::vector<BenchLimit> readBenchLimits(const std::string& path,
                                        const std::vector<std::string>& runnable) {
    File file;
    file.name = std::filesystem::path(path).stem().string();
    std::vector<std::string> problems;
    try {
        const input::Json document =
            input::parseJson(input::readTextFile(path, "a file of limits"));
        Reader(file, runnable).read(JsonNode(document, problems));
        if (problems.empty() && file.limits.empty()) {
            problems.emplace_back("no limits");
        }
    } catch (const input::DocumentProblem& problem) {
        problems.emplace_back(problem.what());
    }
    if (!problems.empty()) {
        const std::string& first = problems.front();
        throw Problem(
            kExitUsage,
            input::oneLine("--limits " + (first.starts_with(path) ? first : path + ": " + first)));
    }
    std::vector<BenchLimit> limits;
    for (auto& [limit, own] : file.limits) {
        limit.limit.name = file.name;
        limit.partOfVerdict = own.value_or(file.partOfVerdict);
        limits.push_back(std::move(limit));
    }
    return limits;
}

}  // namespace host
