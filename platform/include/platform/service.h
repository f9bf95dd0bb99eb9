// Services, the SMB service's Spotlight switch and program execution on the appliance.
#ifndef PLATFORM_SERVICE_H
#define PLATFORM_SERVICE_H

#ifdef __cplusplus
extern "C" {
#endif

// Start, stop or restart a service by name. Negative on failure, with the reason in VLIBCErrGet.
int VLIBServiceStart(const char *szService, int flags);
int VLIBServiceStop(const char *szService, int flags);
int VLIBServiceRestart(const char *szService);

// Non-zero when SMB Spotlight search support is on.
int VEXOSMBIsEnableSpotlight(void);
// Switches SMB Spotlight on (non-zero) or off (0). Negative on failure.
int VEXOSMBSetSpotlight(int enable);

// Runs a program and waits for it. The path is its argv[0]; the arguments that follow, up to a null
// pointer, are argv[1] onwards. 0 when the program ran and exited with status 0.
int VLIBCExec(const char *szPath, ...);
// Runs a program with an argument vector ending in a null entry and waits for it. 0 on success.
int VLIBCExecv(const char *szPath, const char *const argv[], int options);

#ifdef __cplusplus
}
#endif

#endif
