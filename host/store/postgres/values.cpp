#include "host/store/postgres/values.h"

#include <charconv>
#include <cmath>
#include <cstdint>
#include <memory>
#include <string>
#include <string_view>
#include <system_error>
#include <variant>

namespace host {

namespace {

// Numbers of types that every server has, from its catalogue pg_type.
enum TypeId : Oid {
    Boolean = 16,
    ByteArray = 17,
    Int8 = 20,
    Int2 = 21,
    Int4 = 23,
    Float4 = 700,
    Float8 = 701,
    Numeric = 1700,
};

// Infinity and NaN are spelled as the standard library reads them.
double doubleOf(std::string_view text) {
    double value = 0;
    std::from_chars(text.data(), text.data() + text.size(), value);
    return value;
}

// A numeric may have a fraction, or be out of range.
Cell numberOf(std::string_view text) {
    const char* const end = text.data() + text.size();
    std::int64_t integer = 0;
    const auto read = std::from_chars(text.data(), end, integer);
    return read.ec == std::errc() && read.ptr == end ? Cell(integer) : Cell(doubleOf(text));
}

Bytes bytesOf(const char* text) {
    std::size_t size = 0;
    const std::unique_ptr<unsigned char, void (*)(void*)> bytes(
        PQunescapeBytea(reinterpret_cast<const unsigned char*>(text), &size), PQfreemem);
    const auto* begin = reinterpret_cast<const std::byte*>(bytes.get());
    return {begin, begin + size};
}

Cell cellOf(const PGresult* result, int row, int column) {
    if (PQgetisnull(result, row, column) != 0) {
        return {};
    }
    const char* value = PQgetvalue(result, row, column);
    const std::string_view text(value, static_cast<std::size_t>(PQgetlength(result, row, column)));
    switch (PQftype(result, column)) {
        case Boolean:
            return std::int64_t{text == "t"};
        case Float4:
        case Float8:
            return doubleOf(text);
        case Int2:
        case Int4:
        case Int8:
        case Numeric:
            return numberOf(text);
        case ByteArray:
            return bytesOf(value);
        default:
            return std::string(text);
    }
}

}  // namespace

template <class Number>
void ParameterText::_put(Number number) {
    *std::to_chars(_own, _own + sizeof _own - 1, number).ptr = '\0';
    _isOwn = true;
}

ParameterText::ParameterText(const Cell& cell) {
    if (const auto* integer = std::get_if<std::int64_t>(&cell)) {
        _put(*integer);
    } else if (const auto* number = std::get_if<double>(&cell)) {
        if (!std::isnan(*number)) {
            _put(*number);
        }
    } else if (const auto* text = std::get_if<std::string>(&cell)) {
        _data = text->c_str();
        _size = text->size();
    } else if (const auto* bytes = std::get_if<Bytes>(&cell)) {
        _data = bytes->empty() ? "" : reinterpret_cast<const char*>(bytes->data());
        _size = bytes->size();
        _isBinary = true;
    }
}

Rows rowsOf(const PGresult* result) {
    Rows rows(static_cast<std::size_t>(PQntuples(result)));
    const int columns = PQnfields(result);
    for (std::size_t row = 0; row < rows.size(); ++row) {
        rows[row].reserve(static_cast<std::size_t>(columns));
        for (int column = 0; column < columns; ++column) {
            rows[row].push_back(cellOf(result, static_cast<int>(row), column));
        }
    }
    return rows;
}

}  // namespace host
