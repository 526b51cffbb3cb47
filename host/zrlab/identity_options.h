// The options that say which unit is tested, where, and by whom.
#ifndef ZR_HOST_ZRLAB_IDENTITY_OPTIONS_H
#define ZR_HOST_ZRLAB_IDENTITY_OPTIONS_H

#include <string>
#include <vector>

#include <CLI/CLI.hpp>

#include "host/record/identity.h"

namespace host {

// Adds the options to the command. They write to `identity`, --meta to `metadata`; both must outlive it.
void addIdentityOptions(CLI::App& command, Identity& identity, std::vector<std::string>& metadata);

// Once all options have their values: splits `metadata` into names and texts, and names the station after the
// host unless it has a name. Throws a Problem (kExitUsage) about a name that is given twice.
void completeIdentity(Identity& identity, const std::vector<std::string>& metadata);

}  // namespace host

#endif
