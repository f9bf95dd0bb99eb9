// The library's log lines: syslog at LOG_ERR, "<unit>:<line> <message>".
//
// The unit is the system's module name with its source extension ("utils.cpp", "index_mgr.cpp",
// ...), not the name of the file that holds the code: several files of different rooms log as one
// unit, and a function keeps its unit when it moves to another file. Each source file that logs
// declares its unit once, after its includes:
//
//     FILEIDX_LOG_UNIT("utils.cpp");
//
// Each format passed here begins with "%s:%d "; the macros supply the unit and the line for those
// two placeholders.
#ifndef FILEINDEX_CONFIG_LOG_H
#define FILEINDEX_CONFIG_LOG_H

#include <syslog.h>

#include "fileindex/error.h"
#include "platform/error_state.h"

#define FILEIDX_LOG_UNIT(name) static constexpr char kLogUnit[] = name

#define FILEIDX_LOG(format, ...) ::syslog(LOG_ERR, format, ::kLogUnit, __LINE__, ##__VA_ARGS__)

// A platform call failed: format ends in "err=[0x%04X %s:%d]", which takes the platform's last
// error code and the source file and line the platform reports for it.
#define FILEIDX_LOG_PLATFORM_ERROR(format) \
    FILEIDX_LOG(format, static_cast<unsigned>(VLIBCErrGet()), VLIBCErrorGetFile(), VLIBCErrorGetLine())

// Debug lines are still written at LOG_ERR, and only while LOG_LEVEL is exactly LOG_DEBUG.
#define FILEIDX_DEBUG(format, ...)                                 \
    do {                                                           \
        if (::VEXO::FILEINDEX::LOG_LEVEL == LOG_DEBUG) {           \
            FILEIDX_LOG(format, ##__VA_ARGS__);                    \
        }                                                          \
    } while (0)

#endif
