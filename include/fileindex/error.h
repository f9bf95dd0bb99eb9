// Error codes of libfileindex and the switch for its debug log lines.
//
// A failing operation returns false (or 0, or -1) and stores the reason in the process-wide last
// error. The library never clears it: the code describes the most recent failure anywhere in the
// process, also after later calls succeeded. Store FILEIDX_ERR_NONE with SetError before a call for
// a clean reading. The value is shared by all threads without synchronisation.
//
// Log lines go to syslog at LOG_ERR as "<source file>:<line> <message>"; the host program's openlog
// settings apply.
#ifndef FILEINDEX_ERROR_H
#define FILEINDEX_ERROR_H

#include <cstdint>

#include "fileindex/export.h"

namespace VEXO {
namespace FILEINDEX {

enum _tag_fileindex_err_ : int32_t {
    FILEIDX_ERR_NONE = 0,               // nothing has failed since the library was loaded
    FILEIDX_ERR_BAD_PARAM = 1,          // malformed request, unknown key, negative pause length
    FILEIDX_ERR_PATH = 2,               // a path or share cannot be resolved
    FILEIDX_ERR_NO_SUCH_FOLDER = 4,     // a folder setting asked for by path is not in the list
    FILEIDX_ERR_EXCEED_MAX_FOLDER = 5,  // the folder list would hold more than 1000 settings
    FILEIDX_ERR_LOAD_CONFIG = 6,        // a configuration file exists but cannot be read or parsed
    FILEIDX_ERR_SAVE_CONFIG = 7,        // a configuration file cannot be written
    FILEIDX_ERR_MALFORMED_CONFIG = 8,   // the folder list parsed but is not a JSON object
    FILEIDX_ERR_LOCK = 9,               // a configuration lock could not be taken
};

class FILEINDEX_EXPORT ErrorHandler {
public:
    // The last error; 0 until the first failure.
    static _tag_fileindex_err_ GetError();
    static void SetError(_tag_fileindex_err_ code);

    static _tag_fileindex_err_ g_error_code;
};

// syslog level of the library's log lines: error lines are always written; the debug lines of the
// event queue writer only when this is exactly 7 (LOG_DEBUG). Initially 3 (LOG_ERR). The library
// never assigns it.
FILEINDEX_EXPORT extern int LOG_LEVEL;

}  // namespace FILEINDEX
}  // namespace VEXO

#endif
