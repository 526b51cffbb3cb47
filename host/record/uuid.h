// A new name for a run, unlike any other.
#ifndef ZR_HOST_RECORD_UUID_H
#define ZR_HOST_RECORD_UUID_H

#include <string>
#include <string_view>

namespace host {

// A UUID of version 7 (RFC 9562): milliseconds since 1970, then 74 random bits, in 36 lower-case characters.
// Sorting such texts sorts by time of making. Throws std::system_error when the system has no random bits.
std::string newUuid();

// Whether the text is a UUID of any version, as newUuid() writes one.
bool isUuid(std::string_view text);

}  // namespace host

#endif
