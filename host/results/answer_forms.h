// The forms of an answer.
#ifndef ZR_HOST_RESULTS_ANSWER_FORMS_H
#define ZR_HOST_RESULTS_ANSWER_FORMS_H

#include <span>
#include <string>
#include <string_view>

#include "host/results/answer.h"

namespace host {

struct AnswerForm {
    std::string_view name;
    std::string_view ending;  // of a file in this form, with its dot
    bool isPage;              // only for questions that can be a page
    std::string (*write)(const Answer& answer);
};

std::span<const AnswerForm> answerForms();

// The first form for which `matches` is true, or null.
template <class Matches>
const AnswerForm* findAnswerForm(Matches matches) {
    for (const AnswerForm& form : answerForms()) {
        if (matches(form)) {
            return &form;
        }
    }
    return nullptr;
}

// A table for a terminal, with its notes below. An undefined figure is "–".
std::string textAnswer(const Answer& answer);

// An object: question, title, asked, commandLine, scope, runs, columns, rows (an object each, null for an undefined figure; a share as
// {"count", "of", "share", "low", "high"}), notes.
std::string jsonAnswer(const Answer& answer);

// The rows, by RFC 4180: a head line, lines that end with CR LF, fields in quotes where they need them. An
// undefined figure is an empty field. A share takes five columns: KEY.count, KEY.of, KEY.share, KEY.low, KEY.high.
std::string csvAnswer(const Answer& answer);

// One self-contained page, in the look of the HTML report: drawings, then the table.
std::string htmlAnswer(const Answer& answer);

// A cell as people read it: "14 of 15, 93.3 % (70.2 … 98.8)".
std::string datumText(const Datum& datum, ColumnKind kind);

// Whether a column of that kind lines up at the right, as numbers do.
bool isLinedUpRight(ColumnKind kind);

// A share in per cent, with more digits near 0 and 100: "93.3", "99.987".
std::string percentText(double share);

}  // namespace host

#endif
