// Captures the library's log lines: the test executable defines syslog itself, so every line the
// library writes lands here, formatted, instead of in the system log.
#ifndef FILEINDEX_TESTS_LOG_CAPTURE_H
#define FILEINDEX_TESTS_LOG_CAPTURE_H

#include <string>
#include <vector>

namespace fileindex_test {

struct LogLine {
    int priority;
    std::string text;  // formatted, "%m" expanded
};

class LogCapture {
public:
    static void Clear();
    static std::vector<LogLine> Lines();
    // The formatted texts with the leading "<file>:<line> " removed, for comparing messages.
    static std::vector<std::string> Messages();
};

}  // namespace fileindex_test

#endif
