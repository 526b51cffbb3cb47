// What answers each question; see the table in questions.cpp.
#ifndef ZR_HOST_RESULTS_QUESTION_ANSWERS_H
#define ZR_HOST_RESULTS_QUESTION_ANSWERS_H

#include "host/results/questions.h"

namespace host {

void answerList(Store& store, const Asked& asked, Answer& answer);
void answerUnit(Store& store, const Asked& asked, Answer& answer);
void answerYield(Store& store, const Asked& asked, Answer& answer);
void answerPareto(Store& store, const Asked& asked, Answer& answer);
void answerSpread(Store& store, const Asked& asked, Answer& answer);
void answerTrend(Store& store, const Asked& asked, Answer& answer);
void answerStations(Store& store, const Asked& asked, Answer& answer);

// A cell of what may be undefined.
template <class T>
Datum datumOf(const std::optional<T>& value) {
    return value.has_value() ? Datum(*value) : Datum();
}
// Nothing of a NaN.
inline Datum datumOf(double value) {
    return value == value ? Datum(value) : Datum();
}

inline constexpr Verdict kVerdicts[] = {Verdict::Passed, Verdict::Failed, Verdict::Error,
                                        Verdict::Interrupted};

// Names for the rows of a drawing, which has little space: of each row's parts the first, and of the others, in
// their order, those that tell it from rows of the same name.
std::vector<std::string> rowLabels(const std::vector<std::vector<std::string>>& rows);

// How many drawings and bars a page has at most.
inline constexpr std::size_t kMostDrawings = 12;
inline constexpr std::size_t kMostBars = 30;

}  // namespace host

#endif
