// Every row of the table of forms makes a report, and is found by its name and its files' ending.
#include "host/report/report_forms.h"

#include <iterator>
#include <set>
#include <string>
#include <utility>
#include <vector>

#include <gmock/gmock.h>

#include "host/report/replay.h"
#include "tests/host/report/sample_sessions.h"

namespace {

using testing::HasSubstr;
using testing::Not;

std::string reportOf(const char* form,
                     const host::SessionRecord& session,
                     const host::TextStyle& style = {}) {
    std::string text;
    host::replay(session, *host::reportFormNamed(form)->open(
                              [&text](std::string_view piece) { text += piece; }, style));
    return text;
}

TEST(ReportForms, EachWritesASessionAndIsFound) {
    std::set<std::string_view> names;
    for (const host::ReportForm& form : host::reportForms()) {
        EXPECT_TRUE(names.insert(form.name).second) << form.name;
        EXPECT_EQ(host::reportFormNamed(form.name), &form);
        EXPECT_EQ(host::reportFormOf("some.folder/a.b" + std::string(form.ending)), &form);

        std::string text;
        bool isEarly = false;
        host::SessionRecord session = test::judgedSession();
        const auto report = form.open([&text](std::string_view piece) { text += piece; }, {});
        report->sessionStarted(session);
        report->runStarted(session.runs.front());
        report->partStarted(session.runs.front(), host::Part::Experiment);
        report->partEnded(session.runs.front(), host::Part::Experiment);
        report->runEnded(session.runs.front());
        report->nameEnded(session);
        isEarly = !text.empty();
        report->sessionEnded(session);
        EXPECT_EQ(isEarly, form.streams) << form.name;
        EXPECT_THAT(text, HasSubstr(session.runs.front().plan.name)) << form.name;
        EXPECT_EQ(text.back(), '\n') << form.name;
    }
    EXPECT_EQ(host::reportFormOf("REPORT.HTML"), host::reportFormNamed("html"));
    EXPECT_EQ(host::reportFormOf("html"), nullptr);
    EXPECT_EQ(host::reportFormNamed("pdf"), nullptr);
}

// What each form shows of the unit and the place: texts in this order.
TEST(ReportForms, EachNamesTheUnitAndThePlace) {
    const std::pair<const char*, std::vector<std::string>> rows[] = {
        {"text", {"unit SN-7, part P-1, lot L<2>, station bench-3, operator Ann, fixture 7"}},
        {"json",
         {R"("identity": {)", R"("unit": "SN-7")", R"("part": "P-1")", R"("lot": "L<2>")",
          R"("station": "bench-3")", R"("operator": "Ann")", R"("fixture": "7")",
          R"("uuid": "6f0c1c1e-)"}},
        {"jsonl",
         {R"("dutInfo":{"dutInfoId":"SN-7")", R"("serialNumber":"SN-7","partNumber":"P-1")",
          R"("metadata":{"unit":"SN-7","part":"P-1","lot":"L<2>","station":"bench-3",)"
          R"("operator":"Ann","meta.fixture":"7","meta.unit":"of measure")",
          R"("extension":{"name":"run","content":{"uuid":"6f0c1c1e-)"}},
        {"junit",
         {R"(name="uuid" value="6f0c1c1e-)", R"(name="unit" value="SN-7")",
          R"(name="part" value="P-1")", R"(name="lot" value="L&lt;2>")",
          R"(name="station" value="bench-3")", R"(name="operator" value="Ann")",
          R"(name="meta.fixture" value="7")", R"(name="meta.note" value="")"}},
        {"html",
         {"· SN-7 · zrlab</title>", "<dt>Unit</dt><dd>SN-7</dd>", "<dt>Part</dt><dd>P-1</dd>",
          "<dt>Lot</dt><dd>L&lt;2&gt;</dd>", "<dt>Station</dt><dd>bench-3</dd>",
          "<dt>Operator</dt><dd>Ann</dd>", "<dt>Fixture</dt><dd>7</dd>", "<h2>How this was made",
          "6f0c1c1e-"}},
    };
    ASSERT_EQ(std::size(rows), host::reportForms().size());
    for (const auto& [form, texts] : rows) {
        const std::string report = reportOf(form, test::identifiedSession());
        std::size_t from = 0;
        for (const std::string& text : texts) {
            const std::size_t at = report.find(text, from);
            EXPECT_NE(at, std::string::npos) << form << ": " << text;
            from = at == std::string::npos ? from : at + text.size();
        }
    }
}

// A station alone, which every session has, is in the details only.
TEST(ReportForms, SayNothingOfWhatNobodyGave) {
    host::SessionRecord session = test::judgedSession();
    session.identity.station = "desk";
    EXPECT_THAT(reportOf("text", session), Not(HasSubstr("desk")));
    EXPECT_THAT(reportOf("text", session, {.heading = true}), HasSubstr("\nstation desk\n"));
    const std::string page = reportOf("html", session);
    EXPECT_THAT(page.substr(0, page.find("<main")), Not(HasSubstr("desk")));
    EXPECT_THAT(page.substr(page.find("<footer")), HasSubstr("<dt>Station</dt><dd>desk</dd>"));
    EXPECT_THAT(reportOf("json", session),
                HasSubstr("\"unit\": null,\n    \"part\": null,\n    \"lot\": null,\n"));
    EXPECT_THAT(reportOf("junit", session), Not(HasSubstr("\"unit\"")));
    EXPECT_THAT(reportOf("jsonl", session), HasSubstr(R"("metadata":{"station":"desk"})"));
}

}  // namespace
