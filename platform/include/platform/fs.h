// File-system and storage queries of the appliance.
#ifndef PLATFORM_FS_H
#define PLATFORM_FS_H

#ifdef __cplusplus
extern "C" {
#endif

// File-system type code of the path; -1 when it cannot be determined.
int VEXOGetFSType(const char *szPath, int flags);
// Non-zero when the type code names a remote (network) file system.
int VEXOFSIsRemoteFS(int fsType);
// Non-zero when the type code names a file system mounted from an image.
int VEXOFSIsImageFS(int fsType);
// 1 when the directory is a mount point, 0 when not, negative on failure.
int VEXOFSDirIsMntPoint(const char *szPath);
// 0 on success with *pInSnapshot 1 when the path lies inside a snapshot; negative on failure.
int VLIBFhsPathInSnapshot(const char *szPath, int *pInSnapshot);

// Creates a hidden metadata directory (such as S/@eaDir) as the platform wants it; an existing
// directory is success. Negative on failure, with the reason in VLIBCErrGet.
int VEXOEAMKDir(int flags, const char *szPath);
// 1 when the name is one of the platform's hidden metadata directory names.
int VEXOEAIsHiddenDir(const char *szName);

// Non-zero when at least cbSize bytes can still be written at the path; 0 otherwise, with the reason
// in VLIBCErrGet (0x2900 or 0x2400 when space or quota is short).
int VEXOQuotaIsEnough(int flags, const char *szPath, unsigned long long cbSize);

#ifdef __cplusplus
}
#endif

#endif
