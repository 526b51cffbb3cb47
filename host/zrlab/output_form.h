// The form of what a command writes, by --format and --output.
#ifndef ZR_HOST_ZRLAB_OUTPUT_FORM_H
#define ZR_HOST_ZRLAB_OUTPUT_FORM_H

#include <functional>
#include <string>

namespace host {

// Whether there is an output, and it is not "-", which is standard output.
bool goesToFile(const std::string& output);

// The form's name: as given, else by the file's ending, else text. `meantBy` is the form for a file's name, empty
// when its ending says nothing. Throws a Problem (kExitUsage) when the two ask for different ones.
std::string formOfOutput(const std::string& command,
                         const std::string& format,
                         const std::string& output,
                         const std::function<std::string(const std::string& file)>& meantBy);

}  // namespace host

#endif
