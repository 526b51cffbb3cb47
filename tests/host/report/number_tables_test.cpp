// The tables of frames and images.
#include <algorithm>
#include <chrono>
#include <cmath>
#include <cstdint>
#include <memory>
#include <string>
#include <vector>

#include <gmock/gmock.h>
#include <nlohmann/json.hpp>

#include "host/report/frame_table.h"
#include "host/report/image_table.h"
#include "host/report/replay.h"
#include "tests/host/report/sample_sessions.h"

namespace {

using testing::EndsWith;
using testing::HasSubstr;
using testing::StartsWith;

std::vector<std::string> linesOf(const std::string& text, const std::string& end) {
    std::vector<std::string> lines;
    for (std::size_t at = 0; at < text.size();) {
        const std::size_t to = text.find(end, at);
        lines.push_back(text.substr(at, to - at));
        at = to + end.size();
    }
    return lines;
}

// Two runs of a name that needs quotes: frames with everything that metadata can hold, events before, between
// and behind them.
std::string framesTable(std::shared_ptr<host::RunListener> (*open)(host::ReportSink)) {
    std::string text;
    const auto table = open([&text](std::string_view piece) { text += piece; });
    table->sessionStarted({});
    for (const std::uint64_t number : {1, 2}) {
        host::RunRecord run;
        run.plan.name = "a,\"b\"";
        run.number = number;
        run.uuid = "u" + std::to_string(number);
        run.started = platform::Date(std::chrono::system_clock::time_point());
        table->runStarted(run);
        host::FrameBatch batch;
        batch.frames.resize(3);
        for (std::size_t at = 0; at < 3; ++at) {
            batch.frames[at].number = at + 1;
            batch.frames[at].sensorNumber = at == 2 ? 9 : at + 1;
            batch.frames[at].presentation = 0.1 * static_cast<double>(at);
            batch.frames[at].delivered = 1.5;
        }
        batch.metadata = {platform::Dictionary{{"FrameNumber", 1},
                                               {"NTCTemperatureIdle", 0.1 + 0.2},
                                               {"DIETemperatureIdle", 0.1F},
                                               {"HardwareEvents", std::uint64_t{1} << 63}},
                          platform::Dictionary{{"HardwareEvents", "a\r\nb"},
                                               {"DIETemperatureIdle", std::nan("")},
                                               {"Lens", platform::List{1, "x"}}},
                          platform::Dictionary()};
        batch.events = {{4, -1, 0, 1.25, 0}, {5, 0, 0.1, 1.5, 2}, {6, 0, 0.2, 1.5, 3}};
        table->framesDelivered(batch);
    }
    return text;
}

TEST(FrameTable, CsvHasOneRowPerFrameAndEventInTheirOrder) {
    const std::string text = framesTable(host::openFramesCsv);
    const auto rows = linesOf(text, "\r\n");
    // A text of two lines stays one field, which this does not count as a line: the field's own end is here.
    ASSERT_EQ(rows.size(), 1U + 2 * (6 + 1));
    EXPECT_THAT(rows[0], StartsWith("run,number,uuid,kind,time,delivered,presentation,frame,"
                                    "lostBefore,eventCode,eventInfo,FrameNumber,"));
    const auto commas = std::count(rows[0].begin(), rows[0].end(), ',');
    EXPECT_THAT(rows[1],
                StartsWith("\"a,\"\"b\"\"\",1,u1,event,1970-01-01T00:00:01.250Z,1.25,0,,,4,-1,"));
    EXPECT_EQ(std::count(rows[1].begin(), rows[1].end(), ','), commas + 1);
    EXPECT_THAT(rows[2], HasSubstr(",frame,1970-01-01T00:00:01.500Z,1.5,0,1,0,,,1,"));
    EXPECT_THAT(rows[2], HasSubstr(",0.30000000000000004,,,0.1,,,9223372036854775808,"));
    EXPECT_THAT(rows[3], HasSubstr(",nan,,,\"a"));
    EXPECT_EQ(rows[4], "b\",\"{\"\"Lens\"\":[1,\"\"x\"\"]}\"");
    EXPECT_THAT(rows[5], HasSubstr(",event,"));
    EXPECT_THAT(rows[6], HasSubstr(",0.2,3,6,,,,"));
    EXPECT_THAT(rows[7], HasSubstr(",,,6,0,,"));
    EXPECT_THAT(rows[9], HasSubstr(",2,u2,frame,"));
    EXPECT_THAT(rows[9], HasSubstr(",1,0,,,1,"))
        << "the second run has no gap before its first frame";
}

TEST(FrameTable, JsonLinesHaveTheMetadataAsItIs) {
    const auto rows = linesOf(framesTable(host::openFramesJsonl), "\n");
    ASSERT_EQ(rows.size(), 12U);
    EXPECT_EQ(rows[0], R"({"run":"a,\"b\"","number":1,"uuid":"u1","kind":"event",)"
                       R"("time":"1970-01-01T00:00:01.250Z","delivered":1.25,"presentation":0.0,)"
                       R"("code":4,"info":-1})");
    EXPECT_THAT(rows[1],
                EndsWith(R"("frame":1,"lostBefore":0,"metadata":{"DIETemperatureIdle":0.1,)"
                         R"("FrameNumber":1,"HardwareEvents":9223372036854775808,)"
                         R"("NTCTemperatureIdle":0.30000000000000004}})"));
    EXPECT_THAT(rows[2], HasSubstr(R"("DIETemperatureIdle":"nan","HardwareEvents":"a\r\nb")"));
    EXPECT_THAT(rows[4], HasSubstr(R"("lostBefore":6,"metadata":{})"));
}

TEST(ImageTable, HasARowForEachImageAndLosesNothing) {
    std::string text;
    const auto table = host::openImagesCsv([&text](std::string_view piece) { text += piece; });
    host::replay(test::imagesSession(70), *table);
    auto rows = linesOf(text, "\r\n");
    ASSERT_EQ(rows.size(), 71U);
    EXPECT_THAT(rows[0], StartsWith("run,number,uuid,image,frameID,timestampInMilliseconds,"
                                    "tmonDataInC,dScanI0,"));
    EXPECT_THAT(rows[0], EndsWith(",dScanQ47,other"));
    EXPECT_THAT(rows[1], StartsWith("ImageExperiment,1,,1,100,5000,36.5,"));
    EXPECT_THAT(rows[8], HasSubstr(",8,107,5280,nan,"));
    for (const std::string& row : rows) {
        EXPECT_EQ(std::count(row.begin(), row.end(), ','), 4 + 3 + 96);
    }

    text.clear();
    host::RunRecord run;
    const platform::List many(platform::MutableList(49, platform::Value(7)));
    run.auxiliaryData = {
        {"images", platform::List{platform::Dictionary{
                       {"dScanI", many}, {"dScanQ", platform::List{1, 2}}, {"gain", 3}}}}};
    table->partEnded(run, host::Part::Experiment);
    EXPECT_THAT(text, HasSubstr(",1,2,,"));
    EXPECT_THAT(text, HasSubstr(R"("{""dScanI"":[7,7,)"));
    EXPECT_THAT(text, EndsWith("],\"\"gain\"\":3}\"\r\n"));
}

}  // namespace
