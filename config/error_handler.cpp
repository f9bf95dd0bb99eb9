// The process-wide last error code and the LOG_LEVEL switch.
#include <syslog.h>

#include "fileindex/error.h"

namespace VEXO {
namespace FILEINDEX {

_tag_fileindex_err_ ErrorHandler::g_error_code = FILEIDX_ERR_NONE;

int LOG_LEVEL = LOG_ERR;

_tag_fileindex_err_ ErrorHandler::GetError()
{
    return g_error_code;
}

void ErrorHandler::SetError(_tag_fileindex_err_ code)
{
    g_error_code = code;
}

}  // namespace FILEINDEX
}  // namespace VEXO
