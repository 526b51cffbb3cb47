// Whatever a frame carries as metadata: the run ends as documented, and a description keeps each number's
// kind and value, in as many columns as the header has.
//
// Input: a timestamp (value, timescale, flags, in decimal, each up to ';'), then "!" and a value to attach,
// or "key=VALUE" pairs that change the metadata of a lit frame. A digit in place of a key stands for a column.
#include "fuzz/expect.h"
#include "fuzz/input.h"
#include "fuzz/one_stream.h"
#include "fuzz/queues.h"
#include "fuzz/reading.h"
#include "platform/log.h"
#include "vantor_fault/fault_experiment.h"
#include "vantor_fault/frame_description.h"

namespace {

using fuzz::expect;
using platform::Number;

std::vector<std::string> fieldsOf(const std::string& line) {
    expect(line.ends_with('\n') && line.find('\n') == line.size() - 1, "one line");
    std::vector<std::string> fields(1);
    for (const char character : line.substr(0, line.size() - 1)) {
        if (character == ',') {
            fields.emplace_back();
        } else {
            fields.back() += character;
        }
    }
    return fields;
}

// The columns' names: eighteen of them are keys.
const std::vector<std::string>& header() {
    static const auto names = fieldsOf(ZRVantorFrameDescription::csvRepresentationHeader());
    return names;
}
constexpr std::size_t kFirstKey = 3;
constexpr std::size_t kFlood = 13;

struct LastLine final : platform::LogSink {
    void write(const platform::LogLine& line) override {
        csv = line.message.starts_with("Frame,") ? std::string(line.message) : csv;
    }
    std::string csv;
};

bool isWhole(const platform::Dictionary& metadata) {
    for (std::size_t column = kFirstKey; column < header().size(); ++column) {
        if (column != kFlood && metadata[header()[column]].number() == nullptr) {
            return false;
        }
    }
    return true;
}

// The documented failure of a run of this one frame; empty when there is none.
std::string problemOf(const platform::Value& attached) {
    if (!attached.isPresent()) {
        return "206 Frame metadata is missing!";
    }
    if (attached.dictionary() == nullptr) {
        return "206 Frame metadata is not a dictionary!";
    }
    const platform::Dictionary& metadata = *attached.dictionary();
    if (!isWhole(metadata)) {
        return "206 Could not create a frame description of frame 1!";
    }
    const auto source =
        fuzz::readAs<std::int32_t>(metadata.number(kRylCaptureStreamMetadata_InfraredLightSource));
    const auto events = fuzz::readAs<std::int64_t>(metadata.number("HardwareEvents"));
    return source == 1 || source == 2  ? ""
           : ((events >> 13) & 1) != 0 ? "213 Frame 1 is not illuminated for safety reason!"
                                       : "206 Frame 1 is not illuminated for unknown reason!";
}

void expectColumns(const std::string& row,
                   const platform::Dictionary& metadata,
                   const platform::MediaTime& time) {
    const std::vector<std::string> fields = fieldsOf(row);
    expect(header().size() == 21 && fields.size() == 21, "21 columns");
    const double seconds = (time.flags & 1) == 0 || (time.flags & 16) != 0 ? NAN
                           : (time.flags & 4) != 0                         ? INFINITY
                           : (time.flags & 8) != 0                         ? -INFINITY
                                                   : static_cast<double>(time.value) /
                                                         static_cast<double>(time.timescale);
    char text[400];
    std::snprintf(text, sizeof text, "%lf", seconds);
    expect(fields[2] == (std::isnan(seconds) ? "nan" : text), "the seconds");
    for (std::size_t column = kFirstKey; column < header().size(); ++column) {
        const Number number = metadata.number(header()[column]);
        expect(fields[column] == number.text(), "the number's text");
        if (number.isFloating()) {
            const double read = std::strtod(fields[column].c_str(), nullptr);
            expect(number.kind() == Number::Kind::Float
                       ? std::strtof(fields[column].c_str(), nullptr) == number.asFloat() ||
                             std::isnan(read)
                       : read == number.asDouble() || std::isnan(read),
                   "a text that reads back");
        }
    }
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
    fuzz::Input input(data, size);
    platform::MediaTime time;
    time.value = std::strtoll(input.text(';').c_str(), nullptr, 10);
    time.timescale = static_cast<std::int32_t>(std::strtol(input.text(';').c_str(), nullptr, 10));
    time.flags = static_cast<std::uint32_t>(std::strtoul(input.text(';').c_str(), nullptr, 10));
    platform::Value attached;
    if (input.rest().starts_with('!')) {
        input.text('!');
        attached = input.value();
    } else {
        platform::MutableDictionary metadata;
        for (std::size_t column = kFirstKey; column < header().size(); ++column) {
            metadata.set(header()[column], 1);
        }
        for (const auto& [key, value] : input.dictionary('\0')) {
            const std::size_t column =
                kFirstKey + std::strtoul(std::string(key).c_str(), nullptr, 10);
            metadata.set(!key.empty() && key[0] >= '0' && key[0] <= '9' && column < header().size()
                             ? header()[column]
                             : key,
                         value);
        }
        attached = platform::Dictionary(std::move(metadata));
    }

    const auto log = std::make_shared<LastLine>();
    platform::setLogSink(log, platform::LogLevel::Debug);
    fuzz::installOneStream()->onStart = [&](const WLRylFrameHandler& handler) {
        handler(test::bufferWith(attached), time);
        fuzz::runQueued();
    };
    const auto experiment = std::make_shared<ZRVantorFaultExperiment>();
    platform::ErrorRef error;
    const auto result = experiment->run(&error);
    fuzz::takeDelays();
    const std::string problem = problemOf(attached);
    expect((result == nullptr) == !problem.empty(), "a result");
    expect(problem.empty() ||
               std::to_string(error->code()) + " " + error->localizedDescription() == problem,
           "the documented error");
    if (problem.find("illuminated") != std::string::npos) {
        expect(log->csv.starts_with(ZRVantorFrameDescription::csvRepresentationHeader()),
               "a logged header");
        expectColumns(log->csv.substr(log->csv.find('\n') + 2), *attached.dictionary(), time);
    }
    if (attached.dictionary() != nullptr) {
        const auto description = ZRVantorFrameDescription::descriptionWithMonotonicCount(
            1, time, *attached.dictionary());
        expect((description != nullptr) == isWhole(*attached.dictionary()), "a description");
        if (description != nullptr) {
            expectColumns(description->csvRepresentation(), *attached.dictionary(), time);
            expect(description->hardwareEvents().kind() ==
                       attached["HardwareEvents"].asNumber().kind(),
                   "the kind");
        }
    }
    return 0;
}
