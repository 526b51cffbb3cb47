#include "host/zrlab/session_reports.h"

#include <filesystem>
#include <set>
#include <system_error>
#include <utility>

#include <fmt/format.h>

#include "host/record/problem.h"
#include "host/report/frame_table.h"
#include "host/report/image_table.h"
#include "host/report/report_forms.h"
#include "host/zrlab/file_template.h"
#include "host/zrlab/terminal.h"

namespace host {

SessionReports::SessionReports(const SessionOptions& options, const SessionRecord& session) {
    const ReportForm& format = *reportFormNamed(options.format);
    if (options.output.empty() || options.output == "-") {
        const TextStyle style{.colour = Terminal::outputTakesColour(options.colour),
                              .verbose = options.verbose};
        _listeners.push_back(format.open(
            [this](std::string_view text) {
                if (!Terminal::shared().output(text)) {
                    _outputFailed = true;
                }
            },
            style));
        _noteFrames(format);
    } else {
        const std::string path = fileNameOf("--output", options.output, session);
        const ReportForm* meant = reportFormOf(path);
        if (meant != nullptr && meant != &format) {
            throw Problem(kExitUsage, "--output " + path + ": its ending says " +
                                          std::string(meant->name) + ", the format is " +
                                          options.format +
                                          "; a further report is asked for with --report");
        }
        _addFile(path, format, options.verbose);
    }
    for (const std::string& pattern : options.reports) {
        const std::string path = fileNameOf("--report", pattern, session);
        const ReportForm* form = reportFormOf(path);
        if (form == nullptr) {
            throw Problem(kExitUsage, "--report " + path + ": its ending is not one of " +
                                          fmt::format("{}", fmt::join(reportEndings(), ", ")));
        }
        _addFile(path, *form, options.verbose);
    }
    _addTables(options, session);
    if (!options.record.empty()) {
        _files.push_back(
            {fileNameOf("--record", options.record, session), true, [this](ReportSink sink) {
                 _recorder = std::make_shared<SessionRecorder>(std::move(sink));
                 return _recorder;
             }});
    }
    _refuseClashes({deviceArgument(options.device), options.limits, options.store});
    for (const File& file : _files) {
        requireWritable(file.path);
    }
    for (File& file : _files) {
        file.content = openOutputFile(file.path, file.streams);
        _listeners.push_back(
            file.open([content = file.content](std::string_view text) { content->append(text); }));
    }
}

void SessionReports::_addFile(const std::string& path, const ReportForm& form, bool verbose) {
    const TextStyle style{.colour = false, .verbose = verbose, .heading = true};
    _files.push_back({path, form.streams, [&form, style](ReportSink sink) {
                          return form.open(std::move(sink), style);
                      }});
    _noteFrames(form);
}

void SessionReports::_addTables(const SessionOptions& options, const SessionRecord& session) {
    struct Table {
        std::string_view ending;
        std::shared_ptr<RunListener> (*open)(ReportSink sink);
    };
    const auto add = [&](std::string_view option, const std::string& pattern,
                         const std::vector<Table>& tables) {
        const std::string path = fileNameOf(option, pattern, session);
        const std::string ending = endingOf(path);
        std::vector<std::string_view> endings;
        for (const Table& table : tables) {
            if (table.ending == ending) {
                _files.push_back({path, true, table.open});
                return;
            }
            endings.push_back(table.ending);
        }
        throw Problem(kExitUsage, fmt::format("{} {}: its ending is not {}", option, path,
                                              fmt::join(endings, " or ")));
    };
    if (!options.frames.empty()) {
        add("--frames", options.frames, {{".csv", openFramesCsv}, {".jsonl", openFramesJsonl}});
        _followFrames = _needsDetails = true;
    }
    if (!options.images.empty()) {
        add("--images", options.images, {{".csv", openImagesCsv}});
    }
}

void SessionReports::_noteFrames(const ReportForm& form) {
    _followFrames = _followFrames || (form.showsFrames && form.streams);
    _keepFrames = _keepFrames || (form.showsFrames && !form.streams);
}

// Two reports in one file, or a report over a file that the session reads.
void SessionReports::_refuseClashes(const std::vector<std::string>& inputs) const {
    std::set<std::filesystem::path> seen;
    const auto add = [&seen](const std::string& file) {
        std::error_code none;
        const auto path = std::filesystem::weakly_canonical(std::filesystem::absolute(file), none);
        const bool special =
            std::filesystem::exists(path, none) && !std::filesystem::is_regular_file(path, none);
        return special || seen.insert(path).second;
    };
    std::error_code none;
    for (const std::string& input : inputs) {
        if (std::filesystem::exists(input, none)) {
            add(input);
        }
    }
    for (const File& file : _files) {
        if (!add(file.path)) {
            throw Problem(
                kExitUsage,
                file.path +
                    ": already used for the device, the limits, the store or another report");
        }
    }
}

bool SessionReports::finish() {
    bool isWhole = true;
    const std::string missing = _recorder != nullptr ? _recorder->finish() : "";
    if (!missing.empty()) {
        Terminal::shared().complain(missing);
        isWhole = false;
    }
    for (const File& file : _files) {
        try {
            file.content->finish();
        } catch (const Problem& problem) {
            Terminal::shared().complain(problem.what());
            isWhole = false;
        }
    }
    if (_outputFailed) {
        Terminal::shared().complain("cannot write standard output");
        isWhole = false;
    }
    return isWhole;
}

}  // namespace host
