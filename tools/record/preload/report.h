// The report of a run.
#ifndef ZANBASE_RECORD_REPORT_H
#define ZANBASE_RECORD_REPORT_H

#include <string>

#include "common/settings.h"

namespace recorder {

// Both accounts as text in the format of `settings`, and, if `broken` is not null, what broke of its budgets,
// a line for each. Requires: the thread is inside the recorder. Other threads may go on recording.
std::string ReportText(const Settings& settings, std::string* broken);

}  // namespace recorder

#endif
