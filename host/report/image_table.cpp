#include "host/report/image_table.h"

#include <algorithm>
#include <cstddef>
#include <iterator>
#include <string>
#include <string_view>
#include <utility>

#include <fmt/format.h>

#include "host/record/plugin_data.h"
#include "host/report/csv.h"

namespace host {

namespace {

// Rows that are handed to the sink together.
constexpr std::size_t kRowsAtOnce = 64;

constexpr std::string_view kNumbers[] = {"frameID", "timestampInMilliseconds", "tmonDataInC"};
constexpr std::string_view kSamples[] = {"dScanI", "dScanQ"};

std::string head() {
    std::string row = "run,number,uuid,image";
    for (const std::string_view name : kNumbers) {
        row += fmt::format(",{}", name);
    }
    for (const std::string_view name : kSamples) {
        for (std::size_t at = 0; at < kImageSamples; ++at) {
            row += fmt::format(",{}{}", name, at);
        }
    }
    return row + ",other" + std::string(kCsvLineEnd);
}

// The columns of what an image holds.
std::string fieldsOf(const platform::Value& image) {
    std::string row;
    platform::MutableDictionary others;
    if (const platform::Dictionary* entries = image.dictionary()) {
        others = entries->entries();
    } else {
        others.set("value", image);
    }
    for (const std::string_view name : kNumbers) {
        row += ',';
        row += csvField(image[name]);
        others.remove(name);
    }
    for (const std::string_view name : kSamples) {
        const platform::List* samples = image[name].list();
        const bool fits = samples != nullptr && samples->size() <= kImageSamples;
        for (std::size_t at = 0; at < kImageSamples; ++at) {
            row += ',';
            row += fits && at < samples->size() ? csvField((*samples)[at]) : "";
        }
        if (fits) {
            others.remove(name);
        }
    }
    row += ',';
    row += csvObject(others);
    return row.append(kCsvLineEnd);
}

class ImageTable final : public RunListener {
  public:
    explicit ImageTable(ReportSink sink) : _sink(std::move(sink)) {}

    void sessionStarted(const SessionRecord& /*session*/) override { _sink(head()); }

    void partEnded(const RunRecord& run, Part part) override {
        const platform::List* images = imagesOf(run.auxiliaryData);
        if (part != Part::Experiment || images == nullptr) {
            return;
        }
        const std::string start = fmt::format("{},{},{}", csvField(std::string_view(run.plan.name)),
                                              run.number, run.uuid);
        std::string rows;
        for (std::size_t at = 0; at < images->size(); ++at) {
            rows += fmt::format("{},{}{}", start, at + 1, fieldsOf((*images)[at]));
            if (at % kRowsAtOnce == kRowsAtOnce - 1) {
                _sink(rows);
                rows.clear();
            }
        }
        _sink(rows);
    }

  private:
    const ReportSink _sink;
};

}  // namespace

std::shared_ptr<RunListener> openImagesCsv(ReportSink sink) {
    return std::make_shared<ImageTable>(std::move(sink));
}

}  // namespace host
