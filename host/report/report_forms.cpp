#include "host/report/report_forms.h"

#include <algorithm>
#include <cctype>
#include <filesystem>

#include "host/report/html/page.h"
#include "host/report/json_report.h"
#include "host/report/jsonl_report.h"
#include "host/report/junit_report.h"
#include "host/report/text_report.h"

namespace host {

namespace {

template <class Matches>
const ReportForm* findForm(Matches matches) {
    const std::span<const ReportForm> forms = reportForms();
    const auto found = std::find_if(forms.begin(), forms.end(), matches);
    return found != forms.end() ? &*found : nullptr;
}

}  // namespace

std::span<const ReportForm> reportForms() {
    // name, file ending, streams, shows frames
    static constexpr ReportForm kForms[] = {
        {"text", ".txt", true, false, openTextReport},
        {"json", ".json", false, true, openJsonReport},
        {"jsonl", ".jsonl", true, true, openJsonlReport},
        {"junit", ".xml", false, false, openJunitReport},
        {"html", ".html", false, true, openHtmlReport},
    };
    return kForms;
}

const ReportForm* reportFormNamed(std::string_view name) {
    return findForm([name](const ReportForm& form) { return form.name == name; });
}

std::string endingOf(const std::string& file) {
    std::string ending = std::filesystem::path(file).extension().string();
    std::transform(ending.begin(), ending.end(), ending.begin(),
                   [](unsigned char c) { return static_cast<char>(std::tolower(c)); });
    return ending;
}

const ReportForm* reportFormOf(const std::string& file) {
    const std::string ending = endingOf(file);
    return findForm([&ending](const ReportForm& form) { return form.ending == ending; });
}

std::vector<std::string> reportFormNames() {
    std::vector<std::string> names;
    for (const ReportForm& form : reportForms()) {
        names.emplace_back(form.name);
    }
    return names;
}

std::vector<std::string> reportEndings() {
    std::vector<std::string> endings;
    for (const ReportForm& form : reportForms()) {
        endings.emplace_back(form.ending);
    }
    std::sort(endings.begin(), endings.end());
    return endings;
}

}  // namespace host
