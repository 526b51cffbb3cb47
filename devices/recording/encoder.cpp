#include <algorithm>
#include <cstdint>
#include <iterator>

#include "devices/recording/coding.h"
#include "devices/recording/number_form.h"
#include "devices/recording/value_form.h"

namespace recording {

namespace {

using platform::Value;

int depthOf(const Value& value) {
    int inner = 0;
    if (const auto* list = value.list()) {
        for (const Value& entry : *list) {
            inner = std::max(inner, depthOf(entry));
        }
    } else if (const auto* dictionary = value.dictionary()) {
        for (const auto& [key, entry] : *dictionary) {
            inner = std::max(inner, depthOf(entry));
        }
    } else {
        return 0;
    }
    return inner + 1;
}

// Two levels are not the value's own: the list that is the entry, and the one that a text or a number may be.
bool isTooDeep(const Value& value) {
    return depthOf(value) > kDeepest - 2;
}

bool isTooDeep(const Content& content) {
    if (const auto* call = std::get_if<Call>(&content)) {
        return isTooDeep(call->arguments) || isTooDeep(call->result);
    }
    const auto* frame = std::get_if<Frame>(&content);
    return frame != nullptr && isTooDeep(frame->metadata);
}

template <class Table>
void forgetFrom(Table& table, std::size_t size) {
    std::erase_if(table, [size](const auto& entry) { return entry.second >= size; });
}

template <class... Fields>
void append(Json& list, Fields&&... fields) {
    (list.push_back(Json(std::forward<Fields>(fields))), ...);
}

void appendPhase(Json& list, const Phase& phase) {
    append(list, phase.start, phase.stopped);
}

void appendTime(Json& list, const platform::MediaTime& time) {
    append(list, time.value, time.timescale, time.flags, time.epoch);
}

}  // namespace

// Appends the fields of each kind of entry. What enters a table is appended in a statement of its own: the order
// decides.
struct ContentWriter {
    Encoder& encoder;
    Json& list;

    void operator()(const Session& session) const {
        append(list, session.device, session.summary, Json::array());
        for (const auto& [name, text] : session.facts) {
            list.back().push_back(Json::array({name, text}));
        }
        append(list, session.services, session.parameters, session.program, session.started);
    }
    void operator()(const Run& run) const { append(list, run.name, run.number); }
    void operator()(const Call& call) const {
        append(list, static_cast<int>(call.operation), call.object);
        append(list, encoder._value(call.arguments));
        append(list, encoder._value(call.result));
        append(list, encoder._error(call.error));
    }
    void operator()(const Frame& frame) const {
        append(list, frame.stream);
        appendPhase(list, frame.phase);
        appendTime(list, frame.time);
        append(list, frame.hasBuffer, encoder._value(frame.metadata));
    }
    void operator()(const Event& event) const {
        append(list, event.stream);
        appendPhase(list, event.phase);
        appendTime(list, event.time);
        append(list, event.code, event.info);
    }
    void operator()(const Report& report) const {
        append(list, report.sensor, report.schedule, report.reportID, report.data,
               encoder._error(report.error));
    }
    void operator()(const Vanished& vanished) const {
        append(list, vanished.sensor, vanished.schedule);
    }
    void operator()(const Hole& hole) const { append(list, hole.deliveries, hole.calls); }
    void operator()(const End& /*end*/) const {}
};

std::string Encoder::encode(const Entry& entry) {
    if (isTooDeep(entry.content)) {
        return "";
    }
    const std::size_t texts = _texts.size();
    const std::size_t shapes = _shapes.size();
    Json list = Json::array({entry.content.index(), entry.at.count()});
    std::visit(ContentWriter{*this, list}, entry.content);
    std::string bytes(kLengthSize, '\0');
    Json::to_msgpack(list, bytes);
    const std::size_t length = bytes.size() - kLengthSize;
    if (length > kLongestEntry) {
        forgetFrom(_texts, texts);
        forgetFrom(_shapes, shapes);
        return "";
    }
    for (std::size_t at = 0; at < kLengthSize; ++at) {
        bytes[at] = static_cast<char>(length >> (8 * at));
    }
    return bytes;
}

Json Encoder::_text(std::string_view text) {
    if (text.size() > kLongestKept) {
        return text;
    }
    const auto known = _texts.find(text);
    if (known != _texts.end()) {
        return Json::array({static_cast<int>(ValueForm::Text), known->second});
    }
    _texts.emplace(text, _texts.size());
    return text;
}

Json Encoder::_value(const Value& value) {
    if (!value.isPresent()) {
        return nullptr;
    }
    if (const auto* number = value.number()) {
        using Kind = platform::Number::Kind;
        const Json payload = payloadOf(*number);
        return number->kind() == Kind::Boolean || number->kind() == Kind::Double
                   ? payload
                   : Json::array({static_cast<int>(ValueForm::Number),
                                  static_cast<int>(number->kind()), payload});
    }
    if (const auto* text = value.string()) {
        return _text(*text);
    }
    if (const auto* list = value.list()) {
        Json entries = Json::array({static_cast<int>(ValueForm::List)});
        for (const Value& entry : *list) {
            entries.push_back(_value(entry));
        }
        return entries;
    }
    if (const auto* dictionary = value.dictionary()) {
        return _dictionary(*dictionary);
    }
    return Json::array({static_cast<int>(ValueForm::Object)});
}

Json Encoder::_dictionary(const platform::Dictionary& dictionary) {
    Shape shape;
    shape.reserve(dictionary.size());
    for (const auto& [key, entry] : dictionary) {
        shape.emplace_back(key, entry.asNumber().kind());
    }
    const auto [known, isNew] = _shapes.try_emplace(std::move(shape), _shapes.size());
    Json entries = Json::array({static_cast<int>(ValueForm::Dictionary), known->second});
    if (isNew) {
        entries.back() = Json::array();
        for (const auto& [key, kind] : known->first) {
            entries.back().push_back(key);
            entries.back().push_back(static_cast<int>(kind));
        }
    }
    for (const auto& [key, entry] : dictionary) {
        const auto* number = entry.number();
        entries.push_back(number != nullptr ? payloadOf(*number) : _value(entry));
    }
    return entries;
}

// The error, then those behind it; in one list, however many there are.
Json Encoder::_error(const platform::ErrorRef& error) {
    Json list;
    for (const auto* one = error.get(); one != nullptr; one = one->underlyingError().get()) {
        list.push_back(_text(one->domain()));
        list.push_back(one->code());
        list.push_back(_text(one->localizedDescription()));
    }
    return list;
}

}  // namespace recording
