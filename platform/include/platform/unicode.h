// Text comparison of the appliance.
#ifndef PLATFORM_UNICODE_H
#define PLATFORM_UNICODE_H

#ifdef __cplusplus
extern "C" {
#endif

// Compares two NUL-terminated UTF-8 texts ignoring letter case: negative, zero or positive as the
// first sorts before, equal to or after the second.
int VLIBCUnicodeUTF8StrCaseCmp(const char *szA, const char *szB);

#ifdef __cplusplus
}
#endif

#endif
