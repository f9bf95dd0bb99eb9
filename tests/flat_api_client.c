/* A C client of the flat entry points: proves that their header compiles as C and links. */
#include "fileindex/fileidx.h"

int fileidx_c_client_is_path_indexed(const char *path);

int fileidx_c_client_is_path_indexed(const char *path)
{
    return FILEIDXIsPathIndexed(path);
}
