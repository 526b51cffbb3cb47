// The versions of a store's schema.
#ifndef ZR_HOST_STORE_MIGRATIONS_H
#define ZR_HOST_STORE_MIGRATIONS_H

#include <span>
#include <string_view>

#include "host/store/database.h"

namespace host {

// The texts that make version 1 of the schema from nothing, version 2 from that, and so on. A text that was
// released never changes.
std::span<const std::string_view> migrations();

// Brings the schema of the connected database to the version of the last of `texts`; does nothing when it has
// it. A step is taken as a whole or not at all, by one process. Throws a StoreProblem: Newer when the schema
// is of a version behind the last.
void migrate(Database& database, std::span<const std::string_view> texts = migrations());

}  // namespace host

#endif
