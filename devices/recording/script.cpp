#include "devices/recording/script.h"

#include <algorithm>

#include "platform/log.h"
#include "platform/text_format.h"

namespace recording {

namespace {

constexpr std::size_t kLongestText = 120;

// When calls were made of each object, in the order of their times. A call that was made first may return last.
using CallTimes = std::map<ObjectId, std::vector<Microseconds>>;

CallTimes timesOf(const Recording& recording, std::initializer_list<Operation> operations) {
    CallTimes times;
    for (const Entry& entry : recording.entries) {
        const auto* call = std::get_if<Call>(&entry.content);
        const bool isWanted = call != nullptr && std::find(operations.begin(), operations.end(),
                                                           call->operation) != operations.end();
        // A start that failed does not count.
        if (isWanted && (call->operation != Operation::Start || call->result.asNumber().isTrue())) {
            times[call->object].push_back(entry.at);
        }
    }
    for (auto& [object, of] : times) {
        std::sort(of.begin(), of.end());
    }
    return times;
}

// What a delivery is counted from: whose it is, after which start, and whether stop() had been called.
struct Origin {
    ObjectId object = 0;
    Phase phase;
};

bool isDelivery(const Content& content, Origin& origin) {
    if (const auto* frame = std::get_if<Frame>(&content)) {
        origin = {frame->stream, frame->phase};
    } else if (const auto* event = std::get_if<Event>(&content)) {
        origin = {event->stream, event->phase};
    } else if (const auto* report = std::get_if<Report>(&content)) {
        origin = {report->sensor, {report->schedule, false}};
    } else if (const auto* vanished = std::get_if<Vanished>(&content)) {
        origin = {vanished->sensor, {vanished->schedule, false}};
    } else {
        return false;
    }
    return true;
}

std::string shortened(const std::string& text) {
    return text.size() <= kLongestText ? text : text.substr(0, kLongestText) + "...";
}

}  // namespace

Script::Script(const Recording& recording, double speed) : _speed(speed) {
    const platform::MutexLock lock(_mutex);
    for (const Entry& entry : recording.entries) {
        if (const auto* call = std::get_if<Call>(&entry.content)) {
            _answers[{call->object, callText(call->operation, call->arguments)}].recorded.push_back(
                {call->result, call->error});
        }
    }
    _addDeliveries(recording);
}

void Script::_addDeliveries(const Recording& recording) {
    CallTimes starts = timesOf(recording, {Operation::Start, Operation::Schedule});
    CallTimes stops = timesOf(recording, {Operation::Stop});
    for (const Entry& entry : recording.entries) {
        Origin origin;
        if (!isDelivery(entry.content, origin)) {
            continue;
        }
        const auto& [start, stopped] = origin.phase;
        const auto& started = starts[origin.object];
        // Of a recording that was cut, the call may be missing.
        Microseconds from = start >= 1 && start <= started.size() ? started[start - 1] : entry.at;
        if (stopped) {
            const auto& of = stops[origin.object];
            const auto stop = std::lower_bound(of.begin(), of.end(), from);
            from = stop != of.end() ? *stop : entry.at;
        }
        Deliveries& deliveries = _deliveries[{origin.object, start}];
        // An event handler may be called while stop() begins: what came before it stays before it.
        const bool isBefore = !stopped && deliveries.beforeStop == deliveries.contents.size();
        deliveries.contents.push_back(entry.content);
        deliveries.offsets.push_back(std::max(entry.at - from, Microseconds(0)));
        deliveries.beforeStop += isBefore ? 1 : 0;
    }
}

platform::Value Script::take(Operation operation,
                             ObjectId object,
                             const platform::Value& arguments,
                             platform::ErrorSlot error) {
    std::string text = callText(operation, arguments);
    std::size_t recorded = 0;
    {
        const platform::MutexLock lock(_mutex);
        const auto answers = _answers.find({object, text});
        if (answers != _answers.end()) {
            recorded = answers->second.recorded.size();
            if (answers->second.taken < recorded) {
                const Answer& answer = answers->second.recorded[answers->second.taken++];
                static_cast<void>(platform::failWith(error, answer.error));
                return answer.result;
            }
        }
    }
    ++_unanswered;
    text = shortened(text);
    const std::string what =
        recorded == 0
            ? platform::format("%@ was not recorded", text)
            : platform::format("%@ was not recorded more often than %lu times", text, recorded);
    platform::Log("zrlab", "replay").write(platform::LogLevel::Error, [&] {
        return std::string_view(what);
    });
    static_cast<void>(platform::fail(error, kReplayErrorDomain, 1, nullptr, "%@", what));
    return {};
}

const Deliveries& Script::deliveries(ObjectId object, std::uint32_t start) const {
    static const Deliveries& none = *new Deliveries;
    const auto found = _deliveries.find({object, start});
    return found != _deliveries.end() ? found->second : none;
}

}  // namespace recording
