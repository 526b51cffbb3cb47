#include "host/report/text_report.h"

#include <algorithm>
#include <cmath>
#include <cstddef>
#include <iterator>
#include <limits>
#include <span>
#include <utility>
#include <vector>

#include <fmt/format.h>

#include "host/record/clean_text.h"
#include "host/record/run_text.h"

namespace host {

namespace {

// Rows shown of a long table unless the report is verbose: as many from its start and its end.
constexpr std::size_t kRowsAtEachEnd = 15;

// Repetitions that did not pass and are listed unless the report is verbose.
constexpr std::size_t kRunsListed = 10;

class Writer {
  public:
    explicit Writer(const TextStyle& style) : _style(style) {}

    std::string verdict(Verdict verdict) const {
        // Green, red, magenta, magenta.
        static constexpr std::string_view kColours[] = {"1;32", "1;31", "1;35", "1;35"};
        return _painted(kColours[static_cast<std::size_t>(verdict)], verdictText(verdict));
    }
    std::string bad(std::string_view text) const { return _painted("31", text); }
    std::string strong(std::string_view text) const { return _painted("1", text); }
    std::string faint(std::string_view text) const { return _painted("2", text); }
    // A line of its own; the colour ends before the line does.
    std::string faintLine(std::string_view text) const { return faint(text) + "\n"; }

    bool verbose() const { return _style.verbose; }

  private:
    std::string _painted(std::string_view code, std::string_view text) const {
        return _style.colour ? fmt::format("\x1b[{}m{}\x1b[0m", code, text) : std::string(text);
    }
    TextStyle _style;
};

std::string parametersText(const PartPlan& part) {
    std::string text;
    for (const auto& [name, value] : part.parameters) {
        text += fmt::format("{}{} {}", text.empty() ? "" : ", ", name, value.text());
    }
    return text;
}

// The widest name of the rows that are shown, to line the values up.
template <class Rows>
std::size_t nameWidth(const Rows& rows) {
    std::size_t width = 0;
    for (const auto& row : rows) {
        width = std::max(width, row.name.size());
    }
    return width;
}

std::string resultRows(const std::vector<ResultRecord>& results, const Writer& writer) {
    const std::size_t width = nameWidth(results);
    std::string out;
    for (const ResultRecord& result : results) {
        const bool outside = result.judgement == Judgement::Outside;
        const std::string value = fmt::format("{:>14}", valueText(result.value, result.unit));
        out += fmt::format("  {} {:<{}}  {}  {}\n", outside ? writer.bad("✗") : " ", result.name,
                           width, outside ? writer.bad(value) : value,
                           writer.faint(limitLine(result.limit, result.unit)));
    }
    return out;
}

// What the bench's limits found, apart from the module's results: those not met, or all when verbose. What was
// not measured is only counted when the run did not come to its end.
std::string benchRows(const RunRecord& run, const Writer& writer) {
    if (run.benchResults.empty()) {
        return "";
    }
    const bool isWhole = run.failures.empty() && run.verdict != Verdict::Interrupted;
    std::vector<BenchResult> shown;
    std::copy_if(run.benchResults.begin(), run.benchResults.end(), std::back_inserter(shown),
                 [&](const BenchResult& result) {
                     return writer.verbose() || result.judgement == Judgement::Outside ||
                            (isWhole && result.judgement == Judgement::NotMeasured);
                 });
    const std::size_t width = nameWidth(shown);
    std::string out = fmt::format("  {}\n", benchHeadline(run));
    for (const BenchResult& result : shown) {
        const bool isMet = result.judgement == Judgement::Within;
        const std::string mark = result.judgement == Judgement::Outside ? "✗" : "?";
        const std::string value = fmt::format("{:>14}", result.judgement == Judgement::NotMeasured
                                                            ? "not measured"
                                                            : valueText(result.value, result.unit));
        std::string more = limitLine(result.limit, result.unit);
        more += result.partOfVerdict ? "" : "; not part of the verdict";
        more += result.note.empty() ? "" : "; " + result.note;
        out += fmt::format("  {} {:<{}}  {}  {}\n", isMet ? " " : writer.bad(mark), result.name,
                           width, isMet ? value : writer.bad(value), writer.faint(plainLine(more)));
    }
    return out;
}

std::string measurementRows(const std::vector<MeasurementRecord>& measurements) {
    const std::size_t width = nameWidth(measurements);
    std::string out;
    for (const MeasurementRecord& measurement : measurements) {
        out += fmt::format("    {:<{}}  {:>14}\n", measurement.name, width,
                           valueText(measurement.value, measurement.unit));
    }
    return out;
}

// The figures of results over the repetitions: of those that differed or were outside, or all when verbose.
std::string statisticsRows(const std::vector<ResultStatistics>& results,
                           const Writer& writer,
                           std::string_view one,
                           std::string_view many) {
    std::vector<ResultStatistics> shown;
    std::copy_if(results.begin(), results.end(), std::back_inserter(shown),
                 [&writer](const ResultStatistics& result) {
                     return writer.verbose() || result.outside > 0 || result.notMeasured > 0 ||
                            result.minimum != result.maximum || !result.limit.has_value();
                 });
    std::string out;
    if (!shown.empty()) {
        const std::size_t width = nameWidth(shown);
        out += writer.faintLine(fmt::format("    {:<{}}  {:>10}  {:>10}  {:>10}  {}", "", width,
                                            "minimum", "median", "maximum", "outside"));
        for (const ResultStatistics& result : shown) {
            const bool isBad = result.outside > 0 || result.notMeasured > 0;
            std::string outside = fmt::format("{} of {}", result.outside, result.runs);
            if (result.notMeasured > 0) {
                outside += fmt::format(", {} not measured", result.notMeasured);
            }
            out += fmt::format("  {} {:<{}}  {:>10}  {:>10}  {:>10}  {}  {}\n",
                               isBad ? writer.bad("✗") : " ", result.name, width,
                               numberText(result.minimum), numberText(result.median),
                               numberText(result.maximum), isBad ? writer.bad(outside) : outside,
                               writer.faint(limitLine(result.limit, result.unit)));
        }
    }
    const std::size_t folded = results.size() - shown.size();
    if (folded > 0) {
        out += writer.faintLine(fmt::format(
            "    {} {} and the same in every run, --verbose lists them", plural(folded, one, many),
            one == "result" ? (folded == 1 ? "within its limit" : "within their limits") : "met"));
    }
    return out;
}

std::string errorText(const FailureRecord& failure, const RunRecord& run, const Writer& writer) {
    std::string out = fmt::format("  {} {}: {}\n", writer.bad("✗"), placeText(failure, run),
                                  writer.strong(plainLine(failureText(failure))));
    if (failure.error == nullptr) {
        return out;
    }
    out += fmt::format("    {} {}\n", plainLine(failure.error->domain()), failure.error->code());
    for (platform::ErrorRef under = failure.error->underlyingError(); under != nullptr;
         under = under->underlyingError()) {
        out += fmt::format("    caused by: {}\n      {} {}\n",
                           plainLine(under->localizedDescription()), plainLine(under->domain()),
                           under->code());
    }
    return out;
}

// A small picture of samples: one block per pair of samples, its height the larger of the two between
// the least and the greatest sample of the whole run.
std::string sparkline(const platform::List& samples, double least, double greatest) {
    static constexpr std::string_view kBlocks[] = {"▁", "▂", "▃", "▄", "▅", "▆", "▇", "█"};
    std::string out;
    for (std::size_t at = 0; at < samples.size(); at += 2) {
        double value = samples[at].asNumber().asDouble();
        if (at + 1 < samples.size()) {
            value = std::max(value, samples[at + 1].asNumber().asDouble());
        }
        const double share = greatest > least ? (value - least) / (greatest - least) : 0.0;
        const auto level = static_cast<std::size_t>(std::lround(share * (std::size(kBlocks) - 1)));
        out += kBlocks[std::min(level, std::size(kBlocks) - 1)];
    }
    return out;
}

std::string imageRows(const platform::List& images, const Writer& writer) {
    double least = std::numeric_limits<double>::max();
    double greatest = std::numeric_limits<double>::lowest();
    for (const platform::Value& image : images) {
        const ImageView view(image);
        for (const platform::List* samples : {view.samplesI, view.samplesQ}) {
            for (std::size_t at = 0; samples != nullptr && at < samples->size(); ++at) {
                least = std::min(least, (*samples)[at].asNumber().asDouble());
                greatest = std::max(greatest, (*samples)[at].asNumber().asDouble());
            }
        }
    }
    std::string out = writer.faintLine(
        fmt::format("  {:>10}  {:>10}  {:>8}  {:<24}  {}", "frame", "time ms", "°C", "I", "Q"));
    const auto picture = [least, greatest](const platform::List* samples) {
        return samples != nullptr ? sparkline(*samples, least, greatest) : "";
    };
    for (std::size_t at = 0; at < images.size(); ++at) {
        if (!writer.verbose() && at == kRowsAtEachEnd && images.size() > 2 * kRowsAtEachEnd) {
            const std::size_t folded = images.size() - 2 * kRowsAtEachEnd;
            out += writer.faintLine(fmt::format("  {:>10}  {} folded, --verbose shows them", "…",
                                                plural(folded, "image", "images")));
            at += folded;
        }
        const ImageView image(images[at]);
        out += fmt::format("  {:>10}  {:>10}  {:>8.2f}  {}  {}\n", image.frameId.text(),
                           image.milliseconds.text(), image.celsius.asDouble(),
                           picture(image.samplesI), picture(image.samplesQ));
    }
    return out;
}

std::string body(const RunRecord& run, const Writer& writer) {
    std::string out;
    for (const FailureRecord& failure : run.failures) {
        out += errorText(failure, run, writer);
    }
    std::vector<ResultRecord> outside;
    std::vector<ResultRecord> others;
    for (const ResultRecord& result : run.results) {
        (result.judgement == Judgement::Outside ? outside : others).push_back(result);
    }
    out += resultRows(outside, writer);
    if (writer.verbose()) {
        out += resultRows(others, writer);
    } else if (!others.empty()) {
        out += writer.faintLine(fmt::format("    {} within the limits, --verbose lists them",
                                            plural(others.size(), "result", "results")));
    }
    out += benchRows(run, writer);
    if (!run.plan.isDiagnostic() || writer.verbose()) {
        if (run.plan.isDiagnostic() && !run.measurements.empty()) {
            out += writer.faintLine("  as measured by the experiment");
        }
        out += measurementRows(run.measurements);
    } else if (run.results.empty() && !run.measurements.empty()) {
        // It did not come to its results: these are what it has found.
        out += writer.faintLine(
            fmt::format("    {} of the experiment, --verbose lists them",
                        plural(run.measurements.size(), "measurement", "measurements")));
    }
    if (run.framesLost.value_or(0) > 0) {
        out += fmt::format("  {} {}\n", writer.bad("!"), framesText(run));
    }
    const platform::List* images = imagesOf(run.auxiliaryData);
    if (images != nullptr) {
        out += fmt::format("  {}\n", plural(images->size(), "image", "images"));
        out += images->empty() ? "" : imageRows(*images, writer);
    }
    return out;
}

// The unit and the place in one line; empty when nobody named them.
std::string identityLine(const SessionRecord& session) {
    std::string line;
    for (const auto& [name, text] : identityTexts(session.identity)) {
        line += fmt::format("{}{} {}", line.empty() ? "" : ", ", plainLine(name), plainLine(text));
    }
    return line;
}

std::string headingOf(const SessionRecord& session) {
    std::string out = fmt::format("zrlab {}, {}\n{}\ndevice {}: {}\n", session.version,
                                  session.started.text(), plainLine(session.commandLine),
                                  plainLine(session.deviceName), plainLine(session.deviceSummary));
    for (const auto& [name, text] : session.deviceFacts) {
        out += fmt::format("  {}: {}\n", plainLine(name), plainLine(text));
    }
    const std::string identity = identityLine(session);
    // A report that is kept says where it was made.
    return out + (identity.empty() ? "station " + plainLine(session.identity.station) : identity) +
           "\n";
}

class TextReport final : public RunListener {
  public:
    TextReport(ReportSink sink, const TextStyle& style) : _sink(std::move(sink)), _style(style) {}

    void sessionStarted(const SessionRecord& session) override {
        if (_style.heading) {
            _sink(headingOf(session) + "\n");
        } else if (const std::string line = identityLine(session); !line.empty()) {
            _sink(Writer(_style).faintLine(line) + "\n");
        }
    }

    void nameEnded(const SessionRecord& session) override {
        const RunRecord& run = session.runs.back();
        std::string text = session.runs.size() > 1 ? "\n" : "";
        if (!session.repeats.empty()) {
            text += textReport(session.repeats.back(), _style) + "\n";
            text += fmt::format("run {}:\n", run.number);
        }
        _sink(text + textReport(run, _style));
    }

    // What came of all names, when there are several.
    void sessionEnded(const SessionRecord& session) override {
        const std::span<const RunPlan> notStarted = session.notStarted();
        if (session.runs.size() + notStarted.size() < 2 && !session.runs.empty()) {
            return;
        }
        const Writer writer(_style);
        std::string text = fmt::format(
            "{}{}  {}: {}\n", session.runs.empty() ? "" : "\n", writer.verdict(session.verdict),
            plural(session.runs.size(), "run", "runs"), countsText(session));
        for (const RunPlan& plan : notStarted) {
            text += writer.faintLine(fmt::format("      not started: {}", plan.name));
        }
        _sink(text);
    }

  private:
    const ReportSink _sink;
    const TextStyle _style;
};

}  // namespace

std::shared_ptr<RunListener> openTextReport(ReportSink sink, const TextStyle& style) {
    return std::make_shared<TextReport>(std::move(sink), style);
}

std::string textReport(const RunRecord& run, const TextStyle& style) {
    const Writer writer(style);
    std::string out =
        fmt::format("{}  {}  {}  {}\n", writer.verdict(run.verdict), writer.strong(run.plan.name),
                    headline(run), writer.faint(fmt::format("{:.2f} s", run.seconds)));
    out += writer.faintLine(fmt::format("      {}", run.plan.summary));
    std::string parameters = parametersText(run.plan.experiment);
    if (run.analysisSeconds.has_value() && !run.plan.analysis->parameters.empty()) {
        parameters += fmt::format("{}analysis: {}", parameters.empty() ? "" : "; ",
                                  parametersText(*run.plan.analysis));
    }
    if (!parameters.empty()) {
        out += writer.faintLine(fmt::format("      {}", parameters));
    }
    const std::string rest = body(run, writer);
    return rest.empty() ? out : out + "\n" + rest;
}

std::string textLine(const RunRecord& run, const TextStyle& style) {
    const Writer writer(style);
    return fmt::format("{:>6}  {}  {}  {:.2f} s  {}", run.number, writer.verdict(run.verdict),
                       run.plan.name, run.seconds, whyText(run));
}

std::string textReport(const RepeatRecord& repeat, const TextStyle& style) {
    const Writer writer(style);
    std::string out = fmt::format("{}  {}: {}\n", writer.strong(repeat.name),
                                  plural(repeat.runs, "run", "runs"), countsText(repeat));
    const std::size_t listed =
        style.verbose ? repeat.notPassed.size() : std::min(repeat.notPassed.size(), kRunsListed);
    for (std::size_t at = 0; at < listed; ++at) {
        const Repetition& one = repeat.notPassed[at];
        out += fmt::format("  {:>6}  {}  {}\n", one.number, writer.verdict(one.verdict), one.why);
    }
    if (repeat.notPassedCount() > listed) {
        out += writer.faintLine(
            fmt::format("      …  {} did not pass",
                        plural(repeat.notPassedCount() - listed, "more run", "more runs")));
    }
    return out + statisticsRows(repeat.results, writer, "result", "results") +
           statisticsRows(repeat.benchResults, writer, "bench limit", "bench limits");
}

}  // namespace host
