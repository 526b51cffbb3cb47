#include "devices/recording/tree.h"

#include <cstddef>
#include <cstdint>
#include <string>
#include <utility>
#include <vector>

#include "devices/recording/coding.h"

namespace recording {

namespace {

// Takes the parser's events. An operation that returns false ends the parsing: the parser calls itself for each
// list in a list, so its depth must have a bound.
class TreeBuilder final : public nlohmann::json_sax<Json> {
  public:
    // The tree is stored in `root`, which outlives the builder; `open` holds the lists that have not ended, each in
    // the one before.
    TreeBuilder(Json& root, std::vector<Json>& open) : _root(root), _open(open) {}

    bool null() override { return _add(nullptr); }
    bool boolean(bool value) override { return _add(value); }
    bool number_integer(number_integer_t value) override { return _add(value); }
    bool number_unsigned(number_unsigned_t value) override { return _add(value); }
    bool number_float(number_float_t value, const string_t& /*text*/) override {
        return _add(value);
    }
    bool string(string_t& value) override { return _add(std::move(value)); }
    bool binary(binary_t& /*value*/) override { return false; }
    bool start_object(std::size_t /*size*/) override { return false; }
    bool key(string_t& /*name*/) override { return false; }
    bool end_object() override { return false; }
    bool start_array(std::size_t /*size*/) override {
        _open.push_back(Json::array());
        return _open.size() <= static_cast<std::size_t>(kDeepest);
    }
    bool end_array() override {
        Json done = std::move(_open.back());
        _open.pop_back();
        return _add(std::move(done));
    }
    bool parse_error(std::size_t /*position*/,
                     const std::string& /*token*/,
                     const nlohmann::detail::exception& /*problem*/) override {
        return false;
    }

  private:
    bool _add(Json value) {
        if (_open.empty()) {
            _root = std::move(value);
        } else {
            _open.back().push_back(std::move(value));
        }
        return true;
    }

    Json& _root;
    std::vector<Json>& _open;
};

}  // namespace

Json treeOf(std::string_view bytes) {
    Json root;
    std::vector<Json> open;
    TreeBuilder builder(root, open);
    if (!Json::sax_parse(bytes.begin(), bytes.end(), &builder, Json::input_format_t::msgpack)) {
        throw Damage("not an entry");
    }
    return root;
}

}  // namespace recording
