// The library's log lines: syslog at LOG_ERR, "<source file>:<line> <message>".
//
// Each format passed here begins with "%s:%d "; the macros supply the emitting file's base name and
// line for those two placeholders.
#ifndef FILEINDEX_CONFIG_LOG_H
#define FILEINDEX_CONFIG_LOG_H

#include <syslog.h>

#include "fileindex/error.h"

#define FILEIDX_LOG(format, ...) ::syslog(LOG_ERR, format, __FILE_NAME__, __LINE__, ##__VA_ARGS__)

// Debug lines are still written at LOG_ERR, and only while LOG_LEVEL is exactly LOG_DEBUG.
#define FILEIDX_DEBUG(format, ...)                                 \
    do {                                                           \
        if (::VEXO::FILEINDEX::LOG_LEVEL == LOG_DEBUG) {           \
            FILEIDX_LOG(format, ##__VA_ARGS__);                    \
        }                                                          \
    } while (0)

#endif
