// How long a timed pause may last, and the refusal of one whose end the status file cannot hold.
#include "pause_hours.h"

#include <cstdint>
#include <limits>

namespace fileindex_tool {

namespace {

constexpr long long kSecondsPerHour = 3600;
constexpr long long kLastTime = std::numeric_limits<int32_t>::max();

std::string UtcText(long long when)
{
    const time_t time = static_cast<time_t>(when);
    struct tm utc;
    char text[64];
    strftime(text, sizeof(text), "%Y-%m-%d %H:%M:%S UTC", gmtime_r(&time, &utc));
    return text;
}

}  // namespace

long long LargestPauseHours(time_t now)
{
    return now >= kLastTime ? 0 : (kLastTime - now) / kSecondsPerHour;
}

bool CheckPauseHours(const std::string &what, long long hours, Failure &failure)
{
    if (hours < 0) {
        failure = ToolFailure(FailureKind::kInvalid, Failure::kNoCode,
                              what + ": " + std::to_string(hours) + " hours is negative; give a number of hours, "
                              "or 0 to pause until resumed");
        return false;
    }
    const time_t now = time(nullptr);
    const long long largest = LargestPauseHours(now);
    if (hours <= largest) {
        return true;
    }
    std::string message = what + ": a pause of " + std::to_string(hours) + " hours would end after " +
                          UtcText(kLastTime) + ", the last time status.conf can hold; ";
    message += largest == 0 ? "no timed pause fits any more, pause until resumed (0 hours)"
                            : "the largest is " + std::to_string(largest) + " hours (until " +
                                  UtcText(now + largest * kSecondsPerHour) + "), or 0 to pause until resumed";
    failure = ToolFailure(FailureKind::kInvalid, Failure::kNoCode, message);
    return false;
}

}  // namespace fileindex_tool
