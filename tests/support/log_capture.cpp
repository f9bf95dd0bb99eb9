// The test executable's own syslog, which keeps each formatted line for the tests to read.
#include "tests/support/log_capture.h"

#include <stdarg.h>
#include <stdio.h>
#include <syslog.h>

#include <mutex>

namespace fileindex_test {
namespace {

std::mutex g_mutex;
std::vector<LogLine> g_lines;

void Record(int priority, const char *format, va_list args)
{
    char text[8192];
    vsnprintf(text, sizeof(text), format, args);
    std::lock_guard<std::mutex> lock(g_mutex);
    g_lines.push_back({priority, text});
}

}  // namespace

void LogCapture::Clear()
{
    std::lock_guard<std::mutex> lock(g_mutex);
    g_lines.clear();
}

std::vector<LogLine> LogCapture::Lines()
{
    std::lock_guard<std::mutex> lock(g_mutex);
    return g_lines;
}

std::vector<std::string> LogCapture::Messages()
{
    std::vector<std::string> messages;
    for (const LogLine &line : Lines()) {
        const size_t blank = line.text.find(' ');
        messages.push_back(blank == std::string::npos ? line.text : line.text.substr(blank + 1));
    }
    return messages;
}

}  // namespace fileindex_test

// The interposed entry points. glibc's fortified headers may route syslog to __syslog_chk.
extern "C" {

void syslog(int priority, const char *format, ...)
{
    va_list args;
    va_start(args, format);
    fileindex_test::Record(priority, format, args);
    va_end(args);
}

void __syslog_chk(int priority, int, const char *format, ...)
{
    va_list args;
    va_start(args, format);
    fileindex_test::Record(priority, format, args);
    va_end(args);
}

void vsyslog(int priority, const char *format, va_list args)
{
    fileindex_test::Record(priority, format, args);
}

}
