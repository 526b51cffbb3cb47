#include "devices/simulator/profile/profile_faults.h"

#include <utility>

#include "devices/simulator/profile/parts.h"
#include "input/json_reader.h"

namespace simulator {

namespace {

using input::Json;
using input::JsonNode;

// A fault for each place of a profile that its path matches; * is any name, and names the subject.
struct Rule {
    std::string_view group;
    std::string_view kind;
    std::string_view service;
    std::string_view path;
    std::string_view value;         // JSON, in place of what is there
    std::string_view subject = {};  // of a path without a *
    // Of a frame's metadata: the frames that it is wrong in; the path is then that of the metadata that every
    // frame has.
    std::string_view frames = {};
};

constexpr std::string_view kMetadata = "capture/streams/front-infrared/metadata/*";
constexpr std::string_view kBit13 = "capture/streams/front-infrared/metadata/HardwareEvents";
constexpr std::string_view kErrorCounters = "capture/streams/front-infrared/errorCounters/*";
constexpr std::string_view kOverrides = "capture/streams/front-infrared/overrides";
constexpr std::string_view kLightSources = "capture/streams/front-infrared/lightSources";
constexpr std::string_view kChannel = "counters/channels/*";
constexpr std::string_view kSensor = "hid/devices/Kirra";
constexpr std::string_view kReports = "hid/devices/Kirra/overrides";

constexpr std::string_view kAll = "1-";
constexpr std::string_view kOne = "10";

constexpr Rule kRules[] = {
    {"streams", "absent", "capture", "capture/plugIn", "false", "capture plug-in"},
    {"streams", "absent", "capture", "capture/streams/*", "null"},
    {"streams", "another port type", "capture", "capture/streams/*/portType",
     R"("ryl.port.other")"},

    {"error counters", "at 1", "capture", kErrorCounters, "1"},
    {"error counters", "missing", "capture", kErrorCounters, "null"},
    {"error counters", "a text in place of a number", "capture", kErrorCounters, R"("none")"},

    {"frame metadata", "missing in every frame", "capture", kMetadata, "null", "", kAll},
    {"frame metadata", "missing in one frame", "capture", kMetadata, "null", "", kOne},
    {"frame metadata", "a text in every frame", "capture", kMetadata, R"("?")", "", kAll},
    {"frame metadata", "a text in one frame", "capture", kMetadata, R"("?")", "", kOne},
    {"frame metadata", "0 in every frame", "capture", kMetadata, "0", "", kAll},
    {"frame metadata", "0 in one frame", "capture", kMetadata, "0", "", kOne},
    {"frame metadata", "-1 in every frame", "capture", kMetadata, "-1", "", kAll},
    {"frame metadata", "-1 in one frame", "capture", kMetadata, "-1", "", kOne},
    {"frame metadata", "10^9 in every frame", "capture", kMetadata, "1000000000", "", kAll},
    {"frame metadata", "10^9 in one frame", "capture", kMetadata, "1000000000", "", kOne},
    {"frame metadata", "bit 13 set in one frame", "capture", kBit13, "8192", "HardwareEvents",
     kOne},
    // Exponentially, with a time constant of a minute.
    {"frame metadata", "rises by 50 degrees in the first second", "capture",
     "capture/streams/front-infrared/warming/*", "3025"},
    {"frame metadata", "no metadata in every frame", "capture", kOverrides,
     R"([{"frames": "1-", "metadata": "missing"}])", "all keys"},
    {"frame metadata", "no metadata in one frame", "capture", kOverrides,
     R"([{"frames": "10", "metadata": "missing"}])", "all keys"},
    {"frame metadata", "a text in place of metadata in one frame", "capture", kOverrides,
     R"([{"frames": "10", "metadata": "corrupt"}])", "all keys"},
    {"frame metadata", "one light source only", "capture", kLightSources, "[1]", "light source 1"},
    {"frame metadata", "one light source only", "capture", kLightSources, "[2]", "light source 2"},
    {"frame metadata", "out of turn", "capture", kLightSources, "[1, 1, 2]", "light sources"},
    {"frame metadata", "unknown in turn", "capture", kLightSources, "[1, 2, 3]", "light sources"},

    {"frame delivery", "lost", "capture", kOverrides, R"([{"frames": "10", "dropped": true}])",
     "one frame"},
    {"frame delivery", "lost", "capture", kOverrides, R"([{"frames": "10-12", "dropped": true}])",
     "three frames in a row"},
    {"frame delivery", "stall", "capture", "capture/streams/front-infrared/stallAfterFrame", "0",
     "from the first frame on"},
    {"frame delivery", "stall", "capture", "capture/streams/front-infrared/stallAfterFrame", "10",
     "after ten frames"},
    {"frame delivery", "late by up to 30 ms", "capture",
     "capture/streams/front-infrared/jitterMicroseconds", "30000", "every frame"},
    {"frame delivery", "after the stop", "capture",
     "capture/streams/front-infrared/framesAfterStop", "3", "three frames"},
    {"frame delivery", "an event of the stream", "capture", "capture/streams/front-infrared/events",
     R"([{"frame": 10, "code": 7, "info": 1}])", "code 7"},

    {"event counters", "missing", "meterix", kChannel, "null"},
    {"event counters", "without a count", "meterix", kChannel, R"({"count": null})"},
    {"event counters", "in another group", "meterix", kChannel, R"({"group": "Other"})"},
    {"event counters", "in another subgroup", "meterix", kChannel, R"({"subgroup": "Other"})"},
    {"event counters", "one more from the start", "meterix", kChannel, R"({"count": 1})"},
    {"event counters", "one more while streaming", "meterix", kChannel,
     R"({"riseAtFrame": 5, "riseBy": 1})"},
    {"event counters", "ten more per second of streaming", "meterix", kChannel,
     R"({"risePerSecond": 10})"},

    {"sensor", "absent", "hid", "hid/manager", "false", "HID manager"},
    {"sensor", "absent", "hid", kSensor, "null", "Kirra"},
    {"sensor", "another usage page", "hid", "hid/devices/Kirra/usagePage", "1", "Kirra"},
    {"sensor", "another usage", "hid", "hid/devices/Kirra/usage", "1", "Kirra"},
    {"sensor", "there twice", "hid", "hid/devices",
     R"({"Kirra 2": {"usagePage": 65280, "usage": 36}})", "Kirra"},
    {"sensor", "gone at a report", "hid", "hid/devices/Kirra/unplugAtReport", "1", "the first"},
    {"sensor", "gone at a report", "hid", "hid/devices/Kirra/unplugAtReport", "3", "the third"},

    {"sensor reports", "none", "hid", "hid/devices/Kirra/reportsPerSecond", "0", "reports"},
    {"sensor reports", "no more", "hid", "hid/devices/Kirra/maxReports", "3",
     "after three reports"},
    {"sensor reports", "a second apart", "hid", "hid/devices/Kirra/reportsPerSecond", "1",
     "reports"},
    {"sensor reports", "empty", "hid", kReports, R"([{"reports": "2", "length": 0}])",
     "one report"},
    {"sensor reports", "one byte short", "hid", kReports, R"([{"reports": "2", "length": 791}])",
     "one report"},
    {"sensor reports", "one byte short", "hid", kReports, R"([{"reports": "1-", "length": 791}])",
     "every report"},
    {"sensor reports", "one byte long", "hid", kReports, R"([{"reports": "2", "length": 793}])",
     "one report"},
    {"sensor reports", "of another ID", "hid", kReports, R"([{"reports": "2", "reportID": 119}])",
     "one report"},
    {"sensor reports", "of another ID", "hid", kReports, R"([{"reports": "1-", "reportID": 119}])",
     "every report"},
    {"sensor reports", "lost", "hid", kReports, R"([{"reports": "2", "dropped": true}])",
     "one report"},
    {"sensor reports", "an error in its place", "hid", "hid/devices/Kirra/errorAtReport",
     R"({"report": 3, "error": {"domain": "Bus", "code": 5, "message": "Lost."}})", "one report"},

    {"sensor images", "the count of images restarts", "hid", "hid/devices/Kirra/firstFrameId",
     "4294967294", "frameID"},
    {"sensor images", "the clock restarts", "hid", "hid/devices/Kirra/firstTimestamp", "4294967246",
     "timestampInMilliseconds"},
    {"sensor images", "90 degrees from the start", "hid", "hid/devices/Kirra/startTemperature",
     "90", "tmonDataInC"},
    {"sensor images", "rises by 10 degrees per image", "hid",
     "hid/devices/Kirra/temperaturePerReport", "10", "tmonDataInC"},
    {"sensor images", "no echo", "hid", "hid/devices/Kirra/scan/amplitude", "0", "samples"},
    {"sensor images", "an echo outside the samples", "hid", "hid/devices/Kirra/scan/center", "-100",
     "samples"},
    {"sensor images", "an echo without width", "hid", "hid/devices/Kirra/scan/width", "0.001",
     "samples"},
    {"sensor images", "noise as high as the echo", "hid", "hid/devices/Kirra/scan/noise", "24000",
     "samples"},

    {"display", "absent", "display", "display/mainDisplayStatus", "-1", "main display"},
    {"display", "absent", "registry", "display/registryService", "false", "registry object"},
    {"display", "absent", "registry", "display/property", "false", "debug property"},
    {"display", "absent", "registry", "display/powerInfo", "false", "power info"},
    {"display", "absent", "registry", "display/powerPanel", "false", "panel's power info"},
    {"display", "off", "registry", "display/powered", "false", "power state"},
    {"display", "missing", "registry", "display/powered", "null", "power state"},
    {"display", "a text in place of a number", "registry", "display/powered", R"("on")",
     "power state"},
};

// Takes the first name off a path.
std::string_view takeName(std::string_view& path) {
    const std::size_t end = path.find('/');
    const std::string_view name = path.substr(0, end);
    path = end == std::string_view::npos ? "" : path.substr(end + 1);
    return name;
}

// The object that has `value` at the end of the path.
Json nested(std::string_view path, Json value) {
    if (path.empty()) {
        return value;
    }
    const std::string name(takeName(path));
    Json object = Json::object();
    object[name] = nested(path, std::move(value));
    return object;
}

// The change of a profile that makes a fault of a rule, or null when it changes nothing.
Json changeOf(const Rule& rule, const std::string& path, const std::string& name, const Json& is) {
    Json value = Json::parse(rule.value);
    Json changed = is;
    if (is.is_object() && value.is_object()) {
        changed.update(value);
    } else {
        changed = value;
    }
    if (changed == is) {
        return nullptr;
    }
    return rule.frames.empty()
               ? nested(path, std::move(value))
               : nested(kOverrides, Json::array({{{"frames", std::string(rule.frames)},
                                                  {"metadata", {{name, std::move(value)}}}}}));
}

// Adds the faults of the rule at the places of `profile` that the rest of its path matches.
void addFaults(const Rule& rule,
               const Json& profile,
               std::string_view rest,
               const std::string& path,
               const std::string& name,
               const std::string& subject,
               std::vector<ProfileFault>& faults) {
    if (rest.empty()) {
        if (const Json change = changeOf(rule, path, name, profile); !change.is_null()) {
            faults.push_back({rule.group, rule.kind,
                              subject.empty() ? std::string(rule.subject) : subject, rule.service,
                              change.dump()});
        }
        return;
    }
    const std::string_view wanted = takeName(rest);
    if (!profile.is_object()) {
        return;
    }
    for (const auto& [key, value] : profile.items()) {
        if (wanted == "*" || wanted == key) {
            std::string place = path;
            if (!place.empty()) {
                place += '/';
            }
            place += key;
            addFaults(rule, value, rest, place, key, wanted == "*" ? key : subject, faults);
        }
    }
}

}  // namespace

std::vector<ProfileFault> profileFaults(const DeviceProfile& device) {
    const Json profile = writeProfile(device);
    std::vector<ProfileFault> faults;
    for (const Rule& rule : kRules) {
        addFaults(rule, profile, rule.path, "", "", "", faults);
    }
    return faults;
}

DeviceProfile withFault(DeviceProfile device, const ProfileFault& fault) {
    const Json change = input::parseJson(fault.change);
    std::vector<std::string> problems;
    readProfile(JsonNode(change, problems), device);
    if (!problems.empty()) {
        throw input::DocumentProblem(problems.front());
    }
    return device;
}

}  // namespace simulator
