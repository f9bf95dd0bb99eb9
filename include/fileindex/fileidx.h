/* Flat entry points of libfileindex, callable from C. */
#ifndef FILEINDEX_FILEIDX_H
#define FILEINDEX_FILEIDX_H

#include "fileindex/export.h"

#ifdef __cplusplus
extern "C" {
#endif

/* 1 when the share-relative path is an indexed folder or lies below one, 0 otherwise, also when
 * the folder list cannot be read or the argument is null. Never negative. */
FILEINDEX_EXPORT int FILEIDXIsPathIndexed(const char *szPath);
/* As FILEIDXIsPathIndexed, for a full path. */
FILEINDEX_EXPORT int FILEIDXIsFullPathIndexed(const char *szFullPath);
/* 1 when some indexed folder lies in the share, 0 otherwise (as above, also for a null argument). */
FILEINDEX_EXPORT int FILEIDXIsShareIndexed(const char *szShareName);

/* Location of a share's event queue file, S/@eaDir/VEXO@file_index_queue (S the share's path),
 * written NUL-terminated into the buffer, truncated to cbOutLen. Makes S/@eaDir (a failure there is
 * only logged); the queue file itself is created by its first writer. Returns the length written,
 * or -1: on a null argument or cbOutLen <= 0 (logs "Invaild Argument (<check>)=[0]" and records
 * platform error 0x0D00), or for an unknown share (logs "VEXOShareGet failed, name=..., code=...").
 * Never touches the library's own error code. */
FILEINDEX_EXPORT int FILEIDXQueuePathGet(const char *szName, char *szOutQueuePath, int cbOutLen);
/* As FILEIDXQueuePathGet for the index database directory S/@eaDir/VEXO@.fileindexdb, which it
 * also makes in full whatever the buffer holds (mode 0777 before the umask; an existing one is
 * fine; a failure, a symbolic link at S/@eaDir or at the directory included, logs
 * "mkdir failed, path=<path>, reason=<errno text>" and the path is still returned). */
FILEINDEX_EXPORT int FILEIDXDBPathGet(const char *szName, char *szOutDBPath, int cbOutLen);

#ifdef __cplusplus
}
#endif

#endif
