#include "host/zrlab/identity_options.h"

#include <algorithm>
#include <cstddef>

#include <unistd.h>

#include <climits>
#include <fmt/format.h>

#include "host/record/clean_text.h"
#include "host/record/problem.h"

namespace host {

namespace {

// One line of UTF-8, so that every report, file name and store can hold it as it is.
CLI::Validator oneLine() {
    return {[](const std::string& given) {
                return given.empty() ? std::string("the value is empty")
                       : plainLine(given) != given || cleanText(given) != given
                           ? fmt::format("\"{}\" is not one line of UTF-8 text",
                                         plainLine(cleanText(given)))
                           : std::string();
            },
            ""};
}

CLI::Validator keyAndValue() {
    return {[](const std::string& given) {
                const std::size_t equals = given.find('=');
                return equals == 0 || equals == std::string::npos
                           ? fmt::format("\"{}\" is not of the form KEY=VALUE", given)
                           : std::string();
            },
            ""};
}

std::string hostName() {
    char name[HOST_NAME_MAX + 1] = {};
    return gethostname(name, HOST_NAME_MAX) == 0 && name[0] != '\0' ? cleanText(name) : "unknown";
}

struct IdentityRow {
    const char* name;
    const char* type;
    const char* description;
    std::string Identity::*text;
};
constexpr IdentityRow kRows[] = {
    {"--unit", "SERIAL", "Serial number of the unit under test", &Identity::unit},
    {"--part", "PART", "Part number of the unit", &Identity::part},
    {"--lot", "LOT", "Lot of the unit", &Identity::lot},
    {"--station", "STATION", "Where the unit is tested; the host's name unless given",
     &Identity::station},
    {"--operator", "OPERATOR", "Who tests it", &Identity::operatorName},
};

}  // namespace

void addIdentityOptions(CLI::App& command, Identity& identity, std::vector<std::string>& metadata) {
    for (const IdentityRow& row : kRows) {
        command.add_option(row.name, identity.*row.text, row.description)
            ->type_name(row.type)
            ->check(oneLine());
    }
    command.add_option("--meta", metadata, "A further name and text for the reports")
        ->type_name("KEY=VALUE")
        ->check(oneLine())
        ->check(keyAndValue())
        ->take_all()
        ->allow_extra_args(false);
}

void completeIdentity(Identity& identity, const std::vector<std::string>& metadata) {
    identity.metadata.clear();
    for (const std::string& one : metadata) {
        const std::size_t equals = one.find('=');
        const std::string key = one.substr(0, equals);
        if (std::any_of(identity.metadata.begin(), identity.metadata.end(),
                        [&key](const auto& other) { return other.first == key; })) {
            throw Problem(kExitUsage, fmt::format("--meta {}: given more than once", key));
        }
        identity.metadata.emplace_back(key, one.substr(equals + 1));
    }
    if (identity.station.empty()) {
        identity.station = hostName();
    }
}

}  // namespace host
