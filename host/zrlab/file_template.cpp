#include "host/zrlab/file_template.h"

#include <algorithm>
#include <cstddef>

#include <fmt/format.h>

#include "host/record/problem.h"
#include "input/nearest.h"

namespace host {

namespace {

std::string diagnosticsOf(const SessionRecord& session) {
    std::string names;
    for (const RunPlan& plan : session.planned) {
        names += (names.empty() ? "" : "+") + plan.name;
    }
    return names;
}

// The time in the basic form of ISO 8601, which has no colons.
std::string startOf(const SessionRecord& session) {
    std::string text = session.started.timestamp();
    std::erase_if(text, [](char c) { return c == '-' || c == ':'; });
    return text;
}

struct Placeholder {
    std::string_view name;
    std::string (*value)(const SessionRecord& session);
};
constexpr Placeholder kPlaceholders[] = {
    {"unit", [](const SessionRecord& session) { return session.identity.unit; }},
    {"part", [](const SessionRecord& session) { return session.identity.part; }},
    {"lot", [](const SessionRecord& session) { return session.identity.lot; }},
    {"station", [](const SessionRecord& session) { return session.identity.station; }},
    {"operator", [](const SessionRecord& session) { return session.identity.operatorName; }},
    {"diagnostic", diagnosticsOf},
    {"started", startOf},
};

// A leading dot would hide a file, or climb; a leading hyphen looks like an option. The rest is what some
// file system or shell takes for something else; "%" itself keeps different values apart.
std::string safeName(std::string_view value) {
    std::string safe;
    for (std::size_t at = 0; at < value.size(); ++at) {
        const auto c = static_cast<unsigned char>(value[at]);
        const bool isUnsafe =
            c < 0x20 || c == 0x7F ||
            std::string_view("/\\:*?\"<>|%").find(value[at]) != std::string::npos ||
            (at == 0 && (c == '.' || c == '-'));
        safe += isUnsafe ? fmt::format("%{:02X}", c) : std::string(1, value[at]);
    }
    return safe;
}

std::string valueOf(const std::string& name, const SessionRecord& session) {
    for (const Placeholder& one : kPlaceholders) {
        if (one.name == name) {
            const std::string value = one.value(session);
            if (value.empty()) {
                throw Problem(kExitUsage,
                              fmt::format("{{{0}}} has no value; give it with --{0}", name));
            }
            return safeName(value);
        }
    }
    const std::string meant = input::didYouMean(name, placeholderNames());
    throw Problem(kExitUsage,
                  fmt::format("unknown placeholder {{{}}}{}", name,
                              !meant.empty() ? meant
                                             : fmt::format("; they are {}",
                                                           fmt::join(placeholderNames(), ", "))));
}

std::string expanded(std::string_view pattern, const SessionRecord& session) {
    std::string file;
    for (std::size_t at = 0; at < pattern.size(); ++at) {
        const char c = pattern[at];
        if (c != '{' && c != '}') {
            file += c;
            continue;
        }
        if (pattern.substr(at + 1).starts_with(c)) {
            file += c;
            ++at;
            continue;
        }
        const std::size_t end = pattern.find_first_of("{}", at + 1);
        if (c == '}' || end == std::string_view::npos || pattern[end] == '{') {
            throw Problem(kExitUsage,
                          fmt::format("a \"{0}\" without its partner; \"{0}{0}\" stands "
                                      "for the character",
                                      c));
        }
        file += valueOf(std::string(pattern.substr(at + 1, end - at - 1)), session);
        at = end;
    }
    return file;
}

}  // namespace

std::string fileNameOf(std::string_view option,
                       std::string_view pattern,
                       const SessionRecord& session) {
    try {
        return expanded(pattern, session);
    } catch (const Problem& problem) {
        throw Problem(problem.status(), fmt::format("{} {}: {}", option, pattern, problem.what()));
    }
}

std::vector<std::string> placeholderNames() {
    std::vector<std::string> names;
    for (const Placeholder& one : kPlaceholders) {
        names.emplace_back(one.name);
    }
    return names;
}

}  // namespace host
