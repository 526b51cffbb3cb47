// Cells as the server reads and writes them.
#ifndef ZR_HOST_STORE_POSTGRES_VALUES_H
#define ZR_HOST_STORE_POSTGRES_VALUES_H

#include <cstddef>
#include <libpq-fe.h>

#include "host/store/database.h"

namespace host {

// A parameter of a statement, as text or, of bytes, as they are. Refers to the cell, which outlives it.
class ParameterText {
  public:
    explicit ParameterText(const Cell& cell);

    // Null for NULL. Text ends with a zero character.
    const char* data() const { return _isOwn ? _own : _data; }
    std::size_t size() const { return _size; }  // of text and bytes
    bool isBinary() const { return _isBinary; }

  private:
    template <class Number>
    void _put(Number number);

    char _own[32];  // the shortest text of a number that reads back to the same
    bool _isOwn = false;
    bool _isBinary = false;
    std::size_t _size = 0;
    const char* _data = nullptr;
};

// The rows of a result in text form; see Store::query for the types.
Rows rowsOf(const PGresult* result);

}  // namespace host

#endif
