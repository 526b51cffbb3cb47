// Sessions made by hand, for the reports to show.
#ifndef ZR_TESTS_HOST_REPORT_SAMPLE_SESSIONS_H
#define ZR_TESTS_HOST_REPORT_SAMPLE_SESSIONS_H

#include <cstddef>
#include <string>
#include <utility>
#include <vector>

#include "host/record/run_record.h"

namespace test {

// Text that must not be taken for markup, not break a line, and not be lost: the XML characters, control
// characters, a byte that is no UTF-8.
inline const std::string kHostile =
    "a<b>&\"c'\x01\n\xFF"
    "end";

// A diagnostic with one result on each side of every kind of bound, NaN among them, and one without a
// limit; its names are as given.
host::SessionRecord judgedSession(const std::string& name = "Diagnostic");

// An experiment that failed with a chain of errors, whose teardown threw, on a device that was misused.
host::SessionRecord brokenSession();

// A diagnostic that passed, with as many frames and log lines; some frames lack temperatures, and one
// was lost behind the 40th.
host::SessionRecord streamedSession(std::size_t frames);

// An experiment with as many images.
host::SessionRecord imagesSession(std::size_t images);

// A diagnostic that was repeated 20 times, failed in runs 7 and 10, and was in error in run 9.
host::SessionRecord repeatedSession();

// A diagnostic twice and an experiment: the first run passed, the second was given up after 37 frames.
host::SessionRecord interruptedSession();

// A diagnostic that passed its own limits and failed those of the bench: one met, one not met, one not measured,
// and one not met that is not part of the verdict.
host::SessionRecord benchSession();

// A session whose unit and place are named, by hostile texts among others; one run.
host::SessionRecord identifiedSession();

// All of the above as one session of several runs.
host::SessionRecord mixedSession();

// Every session above with a name for a file.
std::vector<std::pair<std::string, host::SessionRecord>> sampleSessions();

// Writes a report of a sample for the checks outside of this program: into the folder that the environment
// variable ZR_SAMPLES names, else into one under the folder for temporary files. A failure to write fails
// the test.
void writeSample(const std::string& file, const std::string& content);

}  // namespace test

#endif
