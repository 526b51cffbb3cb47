#include <cstdint>
#include <limits>
#include <utility>

#include "devices/recording/coding.h"
#include "devices/recording/number_form.h"
#include "devices/recording/tree.h"
#include "devices/recording/value_form.h"

namespace recording {

namespace {

using platform::Number;
using platform::Value;

template <class T>
T integer(const Json& json) {
    return numberOf(Number::kindOf<T>(), json).template as<T>();
}

Number::Kind kindOf(const Json& json) {
    const auto kind = integer<std::uint8_t>(json);
    if (kind > static_cast<std::uint8_t>(Number::Kind::Double)) {
        throw Damage("an unknown kind of number");
    }
    return static_cast<Number::Kind>(kind);
}

const Json& listOf(const Json& json) {
    if (!json.is_array()) {
        throw Damage("not a list");
    }
    return json;
}

const std::string& stringOf(const Json& json) {
    if (!json.is_string()) {
        throw Damage("not a text");
    }
    return json.get_ref<const std::string&>();
}

}  // namespace

// Reads the fields of an entry, one after the other.
class ContentReader {
  public:
    ContentReader(Decoder& decoder, const Json& list) : _decoder(decoder), _list(listOf(list)) {}

    Entry read() {
        const auto index = _integer<std::size_t>();
        Entry entry{.at = Microseconds(_integer<std::int64_t>()), .content = {}};
        if (index >= std::variant_size_v<Content>) {
            throw Damage("an unknown kind of entry");
        }
        _readAny(index, entry.content, std::make_index_sequence<std::variant_size_v<Content>>());
        if (_at != _list.size()) {
            throw Damage("an entry with too many fields");
        }
        return entry;
    }

  private:
    template <std::size_t... indices>
    void _readAny(std::size_t index, Content& content, std::index_sequence<indices...> /*all*/) {
        static_cast<void>(((indices == index && (_read(content.emplace<indices>()), true)) || ...));
    }

    const Json& _next() {
        if (_at == _list.size()) {
            throw Damage("an entry with too few fields");
        }
        return _list[_at++];
    }
    template <class T>
    T _integer() {
        return recording::integer<T>(_next());
    }
    bool _flag() { return numberOf(Number::Kind::Boolean, _next()).isTrue(); }
    const std::string& _string() { return stringOf(_next()); }
    std::vector<std::string> _strings() {
        std::vector<std::string> strings;
        for (const Json& entry : listOf(_next())) {
            strings.push_back(stringOf(entry));
        }
        return strings;
    }

    void _read(Session& session) {
        session.device = _string();
        session.summary = _string();
        for (const Json& fact : listOf(_next())) {
            if (listOf(fact).size() != 2) {
                throw Damage("a fact is not a pair");
            }
            session.facts.emplace_back(stringOf(fact[0]), stringOf(fact[1]));
        }
        session.services = _strings();
        session.parameters = _strings();
        session.program = _string();
        session.started = _string();
    }
    void _read(Run& run) {
        run.name = _string();
        run.number = _integer<std::uint64_t>();
    }
    void _read(Call& call) {
        const auto operation = _integer<std::uint8_t>();
        if (operation >= kOperations) {
            throw Damage("an unknown operation");
        }
        call.operation = static_cast<Operation>(operation);
        call.object = _integer<ObjectId>();
        call.arguments = _decoder._value(_next());
        call.result = _decoder._value(_next());
        call.error = _decoder._error(_next());
    }
    void _read(Phase& phase) {
        phase.start = _integer<std::uint32_t>();
        phase.stopped = _flag();
    }
    void _read(platform::MediaTime& time) {
        time.value = _integer<std::int64_t>();
        time.timescale = _integer<std::int32_t>();
        time.flags = _integer<std::uint32_t>();
        time.epoch = _integer<std::int64_t>();
    }
    void _read(Frame& frame) {
        frame.stream = _integer<ObjectId>();
        _read(frame.phase);
        _read(frame.time);
        frame.hasBuffer = _flag();
        frame.metadata = _decoder._value(_next());
    }
    void _read(Event& event) {
        event.stream = _integer<ObjectId>();
        _read(event.phase);
        _read(event.time);
        event.code = _integer<std::int32_t>();
        event.info = _integer<std::int64_t>();
    }
    void _read(Report& report) {
        report.sensor = _integer<ObjectId>();
        report.schedule = _integer<std::uint32_t>();
        report.reportID = _integer<std::int64_t>();
        report.data = _string();
        report.error = _decoder._error(_next());
    }
    void _read(Vanished& vanished) {
        vanished.sensor = _integer<ObjectId>();
        vanished.schedule = _integer<std::uint32_t>();
    }
    void _read(Hole& hole) {
        hole.deliveries = _integer<std::uint64_t>();
        hole.calls = _integer<std::uint64_t>();
    }
    void _read(End& /*end*/) {}

    Decoder& _decoder;
    const Json& _list;
    std::size_t _at = 0;
};

Entry Decoder::decode(std::string_view bytes) {
    const Json tree = treeOf(bytes);
    return ContentReader(*this, tree).read();
}

std::string Decoder::_text(const Json& json) {
    if (json.is_string()) {
        const auto& text = json.get_ref<const std::string&>();
        if (text.size() <= kLongestKept) {
            _texts.push_back(text);
        }
        return text;
    }
    if (listOf(json).size() != 2 || integer<int>(json[0]) != static_cast<int>(ValueForm::Text)) {
        throw Damage("not a text");
    }
    const auto index = integer<std::size_t>(json[1]);
    if (index >= _texts.size()) {
        throw Damage("a text that did not come before");
    }
    return _texts[index];
}

Value Decoder::_value(const Json& json) {
    if (json.is_null()) {
        return {};
    }
    if (json.is_boolean()) {
        return json.get<bool>();
    }
    if (json.is_number_float()) {
        return json.get<double>();
    }
    if (json.is_string()) {
        return _text(json);
    }
    if (listOf(json).empty()) {
        throw Damage("a value without its form");
    }
    switch (static_cast<ValueForm>(integer<int>(json[0]))) {
        case ValueForm::List: {
            platform::MutableList entries;
            for (std::size_t at = 1; at < json.size(); ++at) {
                entries.push_back(_value(json[at]));
            }
            return platform::List(std::move(entries));
        }
        case ValueForm::Dictionary:
            return _dictionary(json);
        case ValueForm::Text:
            return _text(json);
        case ValueForm::Object:
            if (json.size() == 1) {
                return Value::opaque(ValueForm::Object);
            }
            break;
        case ValueForm::Number:
            if (json.size() == 3) {
                return numberOf(kindOf(json[1]), json[2]);
            }
            break;
    }
    throw Damage("a value of an unknown form");
}

const Shape& Decoder::_shape(const Json& json) {
    if (json.is_array()) {
        Shape shape;
        if (json.size() % 2 != 0) {
            throw Damage("a key without its kind");
        }
        for (std::size_t at = 0; at < json.size(); at += 2) {
            shape.emplace_back(stringOf(json[at]), kindOf(json[at + 1]));
        }
        return _shapes.emplace_back(std::move(shape));
    }
    const auto index = integer<std::size_t>(json);
    if (index >= _shapes.size()) {
        throw Damage("keys that did not come before");
    }
    return _shapes[index];
}

Value Decoder::_dictionary(const Json& json) {
    if (json.size() < 2) {
        throw Damage("a dictionary without its keys");
    }
    const Shape shape = _shape(json[1]);  // a copy: the entries may add further ones
    if (json.size() != shape.size() + 2) {
        throw Damage("not one entry for each key");
    }
    platform::MutableDictionary entries;
    entries.reserve(shape.size());
    for (std::size_t at = 0; at < shape.size(); ++at) {
        const auto& [key, kind] = shape[at];
        const Json& entry = json[at + 2];
        entries.set(key,
                    kind != Number::Kind::Absent ? Value(numberOf(kind, entry)) : _value(entry));
    }
    return platform::Dictionary(std::move(entries));
}

platform::ErrorRef Decoder::_error(const Json& json) {
    if (json.is_null()) {
        return nullptr;
    }
    if (listOf(json).size() % 3 != 0 || json.empty()) {
        throw Damage("not an error");
    }
    struct Fields {
        std::string domain;
        std::int64_t code;
        std::string description;
    };
    std::vector<Fields> errors;  // texts are read in the order in which they were written
    for (std::size_t at = 0; at < json.size(); at += 3) {
        std::string domain = _text(json[at]);
        const auto code = integer<std::int64_t>(json[at + 1]);
        errors.push_back({std::move(domain), code, _text(json[at + 2])});
    }
    platform::ErrorRef error;
    while (!errors.empty()) {
        Fields& last = errors.back();
        error = std::make_shared<const platform::Error>(last.domain, last.code,
                                                        std::move(last.description), error);
        errors.pop_back();
    }
    return error;
}

}  // namespace recording
