#include "host/zrlab/output_form.h"

#include <fmt/format.h>

#include "host/record/clean_text.h"
#include "host/record/problem.h"

namespace host {

bool goesToFile(const std::string& output) {
    return !output.empty() && output != "-";
}

std::string formOfOutput(const std::string& command,
                         const std::string& format,
                         const std::string& output,
                         const std::function<std::string(const std::string& file)>& meantBy) {
    const std::string meant = goesToFile(output) ? meantBy(output) : "";
    if (!format.empty() && !meant.empty() && meant != format) {
        throw Problem(kExitUsage,
                      fmt::format("{}: --output {}: its ending asks for {}, --format for {}",
                                  command, plainLine(output), meant, format));
    }
    return !format.empty() ? format : !meant.empty() ? meant : "text";
}

}  // namespace host
