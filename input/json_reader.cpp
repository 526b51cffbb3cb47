#include "input/json_reader.h"

#include <algorithm>
#include <set>
#include <utility>

#include "input/nearest.h"
#include "platform/number.h"

namespace input {

namespace {

constexpr std::size_t kDeepest = 64;

std::string escaped(std::string_view key) {
    std::string token;
    for (const char character : key) {
        token += character == '~' ? "~0" : character == '/' ? "~1" : std::string(1, character);
    }
    return token;
}

// Watches the parser: objects lose a key that comes twice and nesting has no bound, unless somebody
// looks while they are read.
class ParserWatch {
  public:
    bool operator()(Json::parse_event_t event, const Json& parsed) {
        switch (event) {
            case Json::parse_event_t::object_start:
            case Json::parse_event_t::array_start:
                _beginValue();
                _levels.push_back({event == Json::parse_event_t::array_start, 0, {}, {}});
                if (_levels.size() > kDeepest) {
                    throw DocumentProblem(_pointer() + ": nested more than " +
                                          std::to_string(kDeepest) + " deep");
                }
                break;
            case Json::parse_event_t::key: {
                Level& object = _levels.back();
                object.key = parsed.get<std::string>();
                if (!object.keys.insert(object.key).second) {
                    throw DocumentProblem(_pointer() + ": the key comes twice");
                }
                break;
            }
            case Json::parse_event_t::value:
                _beginValue();
                break;
            case Json::parse_event_t::object_end:
            case Json::parse_event_t::array_end:
                _levels.pop_back();
                break;
        }
        return true;
    }

    // Of the value that the parser gave up at.
    std::string nextPointer() {
        _beginValue();
        return _pointer();
    }

  private:
    struct Level {
        bool isArray;
        std::size_t count;  // of the entries of an array that have begun
        std::string key;    // the last one of an object
        std::set<std::string> keys;
    };

    void _beginValue() {
        if (!_levels.empty() && _levels.back().isArray) {
            ++_levels.back().count;
        }
    }

    std::string _pointer() const {
        std::string pointer;
        for (const Level& level : _levels) {
            if (level.isArray && level.count > 0) {
                pointer += "/" + std::to_string(level.count - 1);
            } else if (!level.key.empty() || !level.keys.empty()) {
                pointer += "/" + escaped(level.key);
            }
        }
        return pointer;
    }

    std::vector<Level> _levels;
};

// The parser's message, "[json.exception.parse_error.101] parse error at line 2, column 3: ...",
// without its own names.
std::string parserReason(std::string_view what) {
    for (const std::string_view end : {"] ", "parse error at "}) {
        const std::size_t found = what.find(end);
        what.remove_prefix(found == std::string_view::npos ? 0 : found + end.size());
    }
    return std::string(what);
}

}  // namespace

Json parseJson(const std::string& text) {
    ParserWatch watch;
    try {
        return Json::parse(text, [&watch](int /*depth*/, Json::parse_event_t event, Json& parsed) {
            return watch(event, parsed);
        });
    } catch (const Json::out_of_range& exception) {
        // "...number overflow parsing '1e400'": the parser says this of no other value.
        std::string_view number = exception.what();
        number.remove_prefix(std::min(number.find('\'') + 1, number.size()));
        const std::string reason =
            std::string(number.substr(0, number.find('\''))) + " is too large for a number";
        const std::string pointer = watch.nextPointer();
        throw DocumentProblem(pointer.empty() ? reason : pointer + ": " + reason);
    } catch (const Json::exception& exception) {
        throw DocumentProblem(parserReason(exception.what()));
    }
}

void JsonNode::fail(const std::string& reason) const {
    throw DocumentProblem(_pointer.empty() ? reason : _pointer + ": " + reason);
}

JsonNode JsonNode::operator[](const std::string& key) const {
    return {_json->at(key), *_problems, _pointer + "/" + escaped(key)};
}

JsonNode JsonNode::operator[](std::size_t index) const {
    return {_json->at(index), *_problems, _pointer + "/" + std::to_string(index)};
}

void JsonNode::requireKeys(std::initializer_list<std::string_view> keys,
                           const std::string& reason) const {
    _require(isObject(), "not an object");
    for (const std::string_view key : keys) {
        if (!_json->contains(key)) {
            fail(reason);
        }
    }
}

bool JsonNode::asBool() const {
    _require(_json->is_boolean(), "neither true nor false");
    return _json->get<bool>();
}

std::string JsonNode::asText() const {
    _require(_json->is_string(), "not a string");
    return _json->get<std::string>();
}

double JsonNode::asDouble(double least, double most) const {
    _require(_json->is_number(), "not a number");
    const auto value = _json->get<double>();
    if (value < least || value > most) {
        fail("not from " + platform::Number(least).text() + " to " + platform::Number(most).text());
    }
    return value;
}

void JsonNode::_require(bool condition, const char* reason) const {
    if (!condition) {
        fail(reason);
    }
}

void failUnknownKey(const JsonNode& value,
                    std::string_view key,
                    const std::vector<std::string>& known) {
    value.fail("unknown key" + didYouMean(key, known));
}

void failUnknownName(const JsonNode& value,
                     std::string_view name,
                     const std::vector<std::string>& known,
                     const std::string& kind,
                     const std::string& howNew) {
    const std::string meant = didYouMean(name, known);
    value.fail("unknown " + kind + (meant.empty() ? " (" + howNew + ")" : meant));
}

}  // namespace input
