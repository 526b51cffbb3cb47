// Identity: which unit a session tests, where, and by whom.
#ifndef ZR_HOST_RECORD_IDENTITY_H
#define ZR_HOST_RECORD_IDENTITY_H

#include <string>
#include <utility>
#include <vector>

namespace host {

// As the command line, the environment or a settings file gave it, in UTF-8. An empty text is one that nobody
// gave.
struct Identity {
    std::string unit;  // serial number of the unit under test
    std::string part;  // part number of the unit
    std::string lot;   // of the unit
    // Where it is tested. Never empty in a session's record: the host's name unless another was given.
    std::string station;
    std::string operatorName;
    // Further names and texts, in the order in which they were given; each name once.
    std::vector<std::pair<std::string, std::string>> metadata;
};

// The texts that are not metadata, as reports and stores name them.
struct IdentityEntry {
    const char* name;
    std::string Identity::*text;
};
inline constexpr IdentityEntry kIdentityEntries[] = {{"unit", &Identity::unit},
                                                     {"part", &Identity::part},
                                                     {"lot", &Identity::lot},
                                                     {"station", &Identity::station},
                                                     {"operator", &Identity::operatorName}};

}  // namespace host

#endif
