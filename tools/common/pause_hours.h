// How long indexing may be paused. The library stores and sends a timed pause's end as now + hours
// * 3600 formed in 32-bit signed arithmetic (a form the daemon and status.conf share), so an end
// after 2038-01-19 03:14:07 UTC wraps to a time before 1970. Callers refuse such a pause first.
#ifndef FILEINDEX_TOOL_PAUSE_HOURS_H
#define FILEINDEX_TOOL_PAUSE_HOURS_H

#include <ctime>
#include <string>

#include "failure.h"

namespace fileindex_tool {

// The most hours a timed pause started at now may last; 0 when none fits any more.
long long LargestPauseHours(time_t now);

// hours is 0 (until resumed) or a timed pause whose end fits. Refused (kInvalid): a negative number,
// and one whose end does not fit, naming the largest that does.
bool CheckPauseHours(const std::string &what, long long hours, Failure &failure);

}  // namespace fileindex_tool

#endif
