#include "host/zrlab/file_template.h"

#include <chrono>
#include <string>
#include <utility>

#include <gtest/gtest.h>

#include "host/record/problem.h"

namespace {

host::SessionRecord session() {
    host::SessionRecord session;
    session.identity = {.unit = "SN-7",
                        .part = "../../etc/x",
                        .lot = "",
                        .station = "-a:b\x01%",
                        .operatorName = ".",
                        .metadata = {}};
    session.planned.resize(2);
    session.planned[0].name = "First";
    session.planned[1].name = "Second";
    session.started = platform::Date(
        std::chrono::system_clock::time_point(std::chrono::milliseconds(1'795'607'609'125)));
    return session;
}

TEST(FileTemplate, PutsSafeValuesInPlaceOfNames) {
    const std::pair<const char*, const char*> rows[] = {
        {"out/report.html", "out/report.html"},
        {"{unit}.html", "SN-7.html"},
        {"{unit}-{diagnostic}-{started}.html", "SN-7-First+Second-20261125T115329.125Z.html"},
        {"out/{part}/{unit}.xml", "out/%2E.%2F..%2Fetc%2Fx/SN-7.xml"},
        {"{station}", "%2Da%3Ab%01%25"},
        {"{operator}", "%2E"},
        {"{{unit}}-{{{unit}}}", "{unit}-{SN-7}"},
    };
    for (const auto& [pattern, file] : rows) {
        EXPECT_EQ(host::fileNameOf("--report", pattern, session()), file);
    }
}

TEST(FileTemplate, RefusesWhatItCannotFill) {
    const std::pair<const char*, const char*> rows[] = {
        {"{unti}", "unknown placeholder {unti}; did you mean unit?"},
        {"{xyzzy}",
         "unknown placeholder {xyzzy}; they are unit, part, lot, station, operator, diagnostic, "
         "started"},
        {"{lot}", "{lot} has no value; give it with --lot"},
        {"a{unit", "a \"{\" without its partner; \"{{\" stands for the character"},
        {"a{b{unit}", "a \"{\" without its partner; \"{{\" stands for the character"},
        {"a}b", "a \"}\" without its partner; \"}}\" stands for the character"},
    };
    for (const auto& [pattern, reason] : rows) {
        try {
            FAIL() << host::fileNameOf("--report", pattern, session());
        } catch (const host::Problem& problem) {
            EXPECT_EQ(problem.status(), host::kExitUsage);
            EXPECT_EQ(problem.what(), "--report " + std::string(pattern) + ": " + reason);
        }
    }
}

}  // namespace
