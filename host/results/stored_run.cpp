#include "host/results/stored_run.h"

#include <algorithm>
#include <cctype>
#include <cstdint>
#include <optional>
#include <vector>

#include <fmt/format.h>

#include "host/record/clean_text.h"
#include "host/record/problem.h"
#include "host/results/selection.h"

namespace host {

namespace {

constexpr std::size_t kMostListed = 4;

}  // namespace

SessionRecord storedRun(Store& store, const std::string& beginning) {
    std::string wanted = beginning;
    std::transform(wanted.begin(), wanted.end(), wanted.begin(),
                   [](unsigned char c) { return static_cast<char>(std::tolower(c)); });
    // Not by a comparison: the order of texts is not that of bytes on every server.
    const Rows rows = store.query(
        "SELECT uuid FROM runs WHERE substr(uuid, 1, CAST($2 AS INTEGER)) = $1 ORDER BY started "
        "DESC LIMIT 5",
        {wanted, static_cast<std::int64_t>(wanted.size())});
    std::vector<std::string> uuids;
    for (const Row& row : rows) {
        uuids.push_back(textAt(row, 0));
    }
    if (uuids.size() > 1) {
        const bool areMore = uuids.size() > kMostListed;
        uuids.resize(std::min(uuids.size(), kMostListed));
        throw Problem(kExitUsage,
                      fmt::format("results: the UUIDs of several runs begin with \"{}\": {}{}",
                                  wanted, fmt::join(uuids, ", "), areMore ? ", …" : ""));
    }
    std::optional<SessionRecord> session = uuids.empty() ? std::nullopt : store.load(uuids.front());
    if (!session.has_value()) {
        throw Problem(kExitUsage, fmt::format("results: no run in {} has a UUID that begins with "
                                              "\"{}\"; zrlab results list shows "
                                              "the newest",
                                              store.name(), plainLine(beginning)));
    }
    return std::move(*session);
}

}  // namespace host
