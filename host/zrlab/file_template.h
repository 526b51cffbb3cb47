// Names of report files with placeholders: "{unit}-{diagnostic}-{started}.html".
#ifndef ZR_HOST_ZRLAB_FILE_TEMPLATE_H
#define ZR_HOST_ZRLAB_FILE_TEMPLATE_H

#include <string>
#include <string_view>
#include <vector>

#include "host/record/run_record.h"

namespace host {

// The name of a file that `pattern` gives for the session, from its identity, its planned names and its
// start. Several names are joined by "+"; the start is in UTC, "20261125T115329.125Z". "{{" and "}}" stand
// for braces.
//
// A value never leads to another folder and never hides a file: what is not safe in a file's name is written
// as "%" and two hexadecimal digits. Different values give different names.
//
// Throws a Problem (kExitUsage) that begins with `option`: an unknown placeholder, one without a value, a
// brace without its partner.
std::string fileNameOf(std::string_view option,
                       std::string_view pattern,
                       const SessionRecord& session);

// The names that may stand in the braces.
std::vector<std::string> placeholderNames();

}  // namespace host

#endif
