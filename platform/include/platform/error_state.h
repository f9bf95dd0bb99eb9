// The platform's last error: a code and the source file and line that raised it, per thread.
#ifndef PLATFORM_ERROR_STATE_H
#define PLATFORM_ERROR_STATE_H

#ifdef __cplusplus
extern "C" {
#endif

int VLIBCErrGet(void);
const char *VLIBCErrorGetFile(void);
int VLIBCErrorGetLine(void);
// Records an error code with the source file and line of the caller.
void VLIBCErrSetEx(int code, const char *szFile, int line);

#ifdef __cplusplus
}
#endif

#endif
