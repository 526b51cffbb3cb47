#include "host/report/frame_table.h"

#include <algorithm>
#include <chrono>
#include <cstddef>
#include <cstdint>
#include <iterator>
#include <string>
#include <utility>

#include <fmt/format.h>
#include <nlohmann/json.hpp>

#include "host/record/frame_gap.h"
#include "host/record/run_text.h"
#include "host/report/csv.h"
#include "host/report/json_value.h"
#include "platform/sync.h"
#include "platform/wall_clock.h"

namespace host {

namespace {

// What the rows of a run have in common.
struct RowsOf {
    std::string name;
    std::uint64_t number = 0;
    std::string uuid;
    platform::Date started = platform::Date::now();

    // The moment that many seconds after the run began.
    std::string timeOf(double delivered) const {
        using std::chrono::system_clock;
        const std::chrono::duration<double> since(delivered);
        return platform::Date(started.moment() +
                              std::chrono::duration_cast<system_clock::duration>(since))
            .timestamp();
    }
};

// Calls the writer with each frame and each event in their order. A writer makes text; `lost` are the frames
// lost before a frame.
template <class Writer>
class FrameTable final : public RunListener {
  public:
    explicit FrameTable(ReportSink sink) : _sink(std::move(sink)) {}

    void sessionStarted(const SessionRecord& /*session*/) override { _sink(Writer::head()); }

    void runStarted(const RunRecord& run) override {
        const platform::MutexLock lock(_mutex);
        _writer.begin({run.plan.name, run.number, run.uuid, run.started});
        _lostFrames = {};
    }

    void framesDelivered(const FrameBatch& batch) override {
        const platform::MutexLock lock(_mutex);
        std::string rows;
        std::size_t event = 0;
        const auto writeEvents = [&](std::size_t framesBefore) ZR_REQUIRES(_mutex) {
            for (; event < batch.events.size() && batch.events[event].framesBefore <= framesBefore;
                 ++event) {
                _writer.write(batch.events[event], rows);
            }
        };
        for (std::size_t at = 0; at < batch.frames.size(); ++at) {
            writeEvents(at);
            const FrameRecord& frame = batch.frames[at];
            _writer.write(frame, batch.metadata[at], _lostFrames.before(frame.sensorNumber), rows);
        }
        writeEvents(batch.frames.size());
        _sink(rows);
    }

  private:
    const ReportSink _sink;
    platform::Mutex _mutex;
    Writer _writer ZR_GUARDED_BY(_mutex);
    LostFrames _lostFrames ZR_GUARDED_BY(_mutex);
};

class CsvWriter {
  public:
    static std::string head() {
        std::string row =
            "run,number,uuid,kind,time,delivered,presentation,frame,lostBefore,eventCode,eventInfo";
        for (const std::string_view key : kFrameColumns) {
            row += fmt::format(",{}", key);
        }
        return row + ",otherMetadata" + std::string(kCsvLineEnd);
    }

    void begin(RowsOf run) {
        _run = std::move(run);
        _start =
            fmt::format("{},{},{}", csvField(std::string_view(_run.name)), _run.number, _run.uuid);
    }

    void write(const FrameRecord& frame,
               const platform::Dictionary& metadata,
               std::uint64_t lost,
               std::string& rows) const {
        _beginRow("frame", frame.delivered, frame.presentation, rows);
        fmt::format_to(std::back_inserter(rows), ",{},{},,", frame.number, lost);
        std::size_t known = 0;
        for (const std::string_view key : kFrameColumns) {
            const platform::Value& value = metadata[key];
            known += metadata.contains(key) ? 1 : 0;
            rows += ',';
            rows += csvField(value);
        }
        rows += ',';
        if (known < metadata.size()) {
            rows += _others(metadata);
        }
        rows += kCsvLineEnd;
    }

    void write(const EventRecord& event, std::string& rows) const {
        _beginRow("event", event.delivered, event.presentation, rows);
        fmt::format_to(std::back_inserter(rows), ",,,{},{}", event.code, event.info);
        rows.append(std::size(kFrameColumns) + 1, ',');
        rows += kCsvLineEnd;
    }

  private:
    void _beginRow(std::string_view kind,
                   double delivered,
                   double presentation,
                   std::string& rows) const {
        fmt::format_to(std::back_inserter(rows), "{},{},{},{},{}", _start, kind,
                       _run.timeOf(delivered), numberText(delivered), numberText(presentation));
    }

    // The entries without a column.
    static std::string _others(const platform::Dictionary& metadata) {
        platform::MutableDictionary others;
        for (const auto& [key, value] : metadata.entries()) {
            if (std::find(std::begin(kFrameColumns), std::end(kFrameColumns), key) ==
                std::end(kFrameColumns)) {
                others.set(key, value);
            }
        }
        return csvObject(others);
    }

    RowsOf _run;
    std::string _start;  // the first fields of each row
};

class JsonlWriter {
  public:
    static std::string head() { return ""; }

    void begin(RowsOf run) { _run = std::move(run); }

    void write(const FrameRecord& frame,
               const platform::Dictionary& metadata,
               std::uint64_t lost,
               std::string& rows) const {
        Json row = _row("frame", frame.delivered, frame.presentation);
        row["frame"] = frame.number;
        row["lostBefore"] = lost;
        row["metadata"] = jsonOf(platform::Value(metadata));
        _append(row, rows);
    }

    void write(const EventRecord& event, std::string& rows) const {
        Json row = _row("event", event.delivered, event.presentation);
        row["code"] = event.code;
        row["info"] = event.info;
        _append(row, rows);
    }

  private:
    using Json = nlohmann::ordered_json;

    Json _row(std::string_view kind, double delivered, double presentation) const {
        return {{"run", _run.name},
                {"number", _run.number},
                {"uuid", _run.uuid},
                {"kind", kind},
                {"time", _run.timeOf(delivered)},
                {"delivered", jsonOf(delivered)},
                {"presentation", jsonOf(presentation)}};
    }

    // Text that is not UTF-8 (it may come from a device) must not stop the table.
    static void _append(const Json& row, std::string& rows) {
        rows += row.dump(-1, ' ', false, Json::error_handler_t::replace) + "\n";
    }

    RowsOf _run;
};

}  // namespace

std::shared_ptr<RunListener> openFramesCsv(ReportSink sink) {
    return std::make_shared<FrameTable<CsvWriter>>(std::move(sink));
}

std::shared_ptr<RunListener> openFramesJsonl(ReportSink sink) {
    return std::make_shared<FrameTable<JsonlWriter>>(std::move(sink));
}

}  // namespace host
