// What the forms of a report have in common: a report is a listener that writes text to a sink.
#ifndef ZR_HOST_REPORT_REPORT_FORM_H
#define ZR_HOST_REPORT_REPORT_FORM_H

#include <functional>
#include <memory>
#include <string>
#include <string_view>

#include "host/record/run_listener.h"

namespace host {

// Takes the report's text, piece by piece. It is called on the thread that makes the piece, one call at a
// time, possibly with the report's lock held: it must neither log nor throw. What it cannot write it
// remembers itself.
using ReportSink = std::function<void(std::string_view text)>;

// How the text form looks.
struct TextStyle {
    bool colour = false;   // escape sequences of a terminal
    bool verbose = false;  // show what is folded otherwise
    // Begin with the device, the time, the version and the command line: for a report that is kept.
    bool heading = false;
};

// Makes a report that writes to `sink`.
using OpenReport = std::shared_ptr<RunListener> (*)(ReportSink sink, const TextStyle& style);

// A form of report; see report_forms.h for all of them.
struct ReportForm {
    // Without defaults: a form is not complete, and does not compile, without all of them.
    constexpr ReportForm(std::string_view formName,
                         std::string_view fileEnding,
                         bool writesAsItGoes,
                         bool needsFrames,
                         OpenReport opens)
        : name(formName)
        , ending(fileEnding)
        , streams(writesAsItGoes)
        , showsFrames(needsFrames)
        , open(opens) {}

    std::string_view name;
    std::string_view ending;  // of a file in this form, with its dot
    bool streams;             // writes as the session goes on, else once at its end
    // Needs the frames: as they come when it writes as the session goes on, else RunRecord::frames.
    bool showsFrames;
    OpenReport open;
};

// A report that is written as a whole when the session has ended.
std::shared_ptr<RunListener> wholeReport(ReportSink sink,
                                         std::string (*write)(const SessionRecord& session));

}  // namespace host

#endif
