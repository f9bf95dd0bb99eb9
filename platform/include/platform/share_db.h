// The appliance's share database, as the library uses it.
#ifndef PLATFORM_SHARE_DB_H
#define PLATFORM_SHARE_DB_H

#ifdef __cplusplus
extern "C" {
#endif

// One shared folder. Records come from VEXOShareGet and go back through VEXOShareFree; the platform
// may keep more fields after these two.
typedef struct _tag_VEXOSHARE {
    char *szName;  // the share's name as the database stores it
    char *szPath;  // full path of the share's top directory, such as /volume1/photo
} VEXOSHARE, *PVEXOSHARE;

// Looks a share up by name. 0 and a record in *ppShare on success; negative when the share is
// unknown or the database fails, with the reason in VLIBCErrGet.
int VEXOShareGet(const char *szName, PVEXOSHARE *ppShare);
void VEXOShareFree(PVEXOSHARE pShare);

// Finds the share that holds a full path. Fills the share's name and its top directory, both
// NUL-terminated and truncated to the buffer sizes; negative when no share holds the path.
int VEXOShareNamePathGet(const char *szFullPath, char *szName, int cbName, char *szSharePath, int cbSharePath);

// Non-zero when the path lies in a share's recycle bin.
int VEXOShareIsShareRecycle(const char *szPath);

// Per-share flags: 0 on success with the flag in *pFlag, negative on failure.
int VLIBShareIsEncryptedGet(const VEXOSHARE *pShare, int *pIsEncrypted);   // share is in the encrypted state
int VLIBShareIsEncryptionGet(const VEXOSHARE *pShare, int *pUsesEncryption); // share uses encryption
int VLIBShareIsReadOnlyGet(const VEXOSHARE *pShare, int *pIsReadOnly);

#ifdef __cplusplus
}
#endif

#endif
