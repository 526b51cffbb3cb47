// Loading of the engine that an address asks for.
#ifndef ZR_HOST_STORE_ENGINE_H
#define ZR_HOST_STORE_ENGINE_H

#include <memory>
#include <string>

#include "host/store/database.h"

namespace host {

// The database at the address, by the module zr_store_sqlite.so, for an address of a server by
// zr_store_postgres.so: beside the program, as a build leaves it, or where an installation has it. Does not
// connect. Throws a Problem as Store does.
// May be called on any thread, by one at a time.
std::unique_ptr<Database> openDatabase(const std::string& address, Access access);

}  // namespace host

#endif
