// Every row of the table of forms makes a report, and is found by its name and its files' ending.
#include "host/report/report_forms.h"

#include <set>
#include <string>

#include <gmock/gmock.h>

#include "tests/host/report/sample_sessions.h"

namespace {

using testing::HasSubstr;

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

}  // namespace
