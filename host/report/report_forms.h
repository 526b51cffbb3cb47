// The forms that a report can have. The command line's options, their help, the completions and the
// messages about a wrong form are all made from this table: a new form is a file of its own and a row.
#ifndef ZR_HOST_REPORT_REPORT_FORMS_H
#define ZR_HOST_REPORT_REPORT_FORMS_H

#include <span>
#include <string>
#include <string_view>
#include <vector>

#include "host/report/report_form.h"

namespace host {

std::span<const ReportForm> reportForms();

// The form of that name, or null.
const ReportForm* reportFormNamed(std::string_view name);

// A file's ending with its dot, in lower case.
std::string endingOf(const std::string& file);

// The form that a file's ending asks for, upper case or lower; null when no form has it.
const ReportForm* reportFormOf(const std::string& file);

// The names and the endings of all forms.
std::vector<std::string> reportFormNames();
std::vector<std::string> reportEndings();

}  // namespace host

#endif
