// Every question over a store of many runs: ZR_RESULTS is how many results it has, 64 a run; 64,000 without it.
// Prints how long each takes; `ZR_RESULTS=1000000 results_test --gtest_filter=ManyResults.*` gives the figures of
// docs/results.md.
#include <chrono>
#include <cstdio>
#include <cstdlib>

#include <gtest/gtest.h>

#include "tests/host/results/sample_store.h"

namespace {

// A run every minute on one of ten stations, every unit twice; every seventh first attempt fails in one result.
void fill(host::Store& store, std::int64_t runs) {
    store.query(
        "INSERT INTO stations (name) WITH RECURSIVE n(i) AS (SELECT 0 UNION ALL SELECT i + 1 FROM "
        "n WHERE i < 9) "
        "SELECT 'station-' || i FROM n");
    store.query(
        "INSERT INTO units (serial, part) WITH RECURSIVE n(i) AS (SELECT 0 UNION ALL SELECT i + 1 "
        "FROM n WHERE i < $1) "
        "SELECT 'SN' || i, 'P1' FROM n",
        {runs / 2});
    store.query(
        "INSERT INTO quantities (name, unit) WITH RECURSIVE n(i) AS (SELECT 0 UNION ALL SELECT i + "
        "1 FROM n WHERE i < "
        "63) SELECT 'Counter ' || i, 'events' FROM n");
    store.query(
        "INSERT INTO limits (name, bounds, lower, lower_open, upper, upper_open) VALUES "
        "('Limit', '0 … 0', 0, 0, 0, 0)");
    store.query(
        "INSERT INTO runs (uuid, started, day, seconds, diagnostic, summary, verdict, repetition, "
        "station_id, unit_id, "
        "part, lot, operator, metadata, version, command_line, session_started, device, "
        "device_summary, device_facts, "
        "frames_delivered, frames_lost, images_delivered, auxiliary) "
        "WITH RECURSIVE n(i) AS (SELECT 0 UNION ALL SELECT i + 1 FROM n WHERE i < $1 - 1) "
        "SELECT 'run-' || i, CAST(1700000000000000 AS BIGINT) + CAST(i AS BIGINT) * 60000000, "
        "'2023-11-' || (14 + i / "
        "1440), 1.0, 'Counters', '', CASE WHEN i % 7 = 0 AND i % 2 = 0 THEN 'fail' ELSE 'pass' "
        "END, 1, "
        "i % 10 + 1, i / 2 + 1, 'P1', 'L' || (i / 1000), '', '[]', '1.0', '', 0, '', '', '[]', 0, "
        "0, 0, '{}' FROM n",
        {runs});
    store.query(
        "INSERT INTO results (run_id, of_analysis, place, quantity_id, value, limit_id, judgement) "
        "SELECT runs.id, 1, quantities.id - 1, quantities.id, CASE WHEN verdict = 'fail' AND "
        "quantities.id = 7 THEN 1.0 "
        "ELSE 0.0 END, 1, CASE WHEN verdict = 'fail' AND quantities.id = 7 THEN 2 ELSE 1 END FROM "
        "runs CROSS JOIN "
        "quantities ORDER BY runs.id, quantities.id");
}

TEST(ManyResults, EveryQuestion) {
    const char* given = std::getenv("ZR_RESULTS");
    const std::int64_t runs = (given != nullptr ? std::atoll(given) : 64'000) / 64;
    test::SampleStore store;
    store.store().setPatience(std::chrono::minutes(5));
    fill(store.store(), runs);
    for (const host::Question& question : host::questions()) {
        const auto began = std::chrono::steady_clock::now();
        const host::Answer answer =
            store.ask(question.name, {.subject = question.name == "unit" ? "SN5" : "Counter 6",
                                      .by = "station",
                                      .limit = question.limit});
        const std::chrono::duration<double> took = std::chrono::steady_clock::now() - began;
        std::printf("%-8s over %lld results: %.3f s, %zu rows\n",
                    std::string(question.name).c_str(), static_cast<long long>(64 * runs),
                    took.count(), answer.rows.size());
        EXPECT_FALSE(answer.rows.empty()) << question.name;
        if (question.name == "yield") {
            // Every unit's first run is the even one, on an even station.
            std::int64_t units = 0;
            std::int64_t passed = 0;
            for (std::size_t row = 0; row < answer.rows.size(); ++row) {
                if (const auto* share =
                        std::get_if<host::Share>(&test::cellOf(answer, row, "firstPass"))) {
                    units += share->of;
                    passed += share->count;
                }
            }
            EXPECT_EQ(units, (runs + 1) / 2);
            EXPECT_EQ(units - passed, (runs + 13) / 14);
        }
    }
}

}  // namespace
