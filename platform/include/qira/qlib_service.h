// System services and the SMB server of the appliance.
#pragma once

#ifdef __cplusplus
extern "C" {
#endif

/* Each returns negative on failure (reason in QLIBCErrGet()). */
int QLIBServiceStart(const char* szName, int flags);
int QLIBServiceStop(const char* szName, int flags);
int QLIBServiceRestart(const char* szName);

/* Nonzero when the SMB server's Spotlight search support is on. */
int QIRASMBIsEnableSpotlight(void);
int QIRASMBSetSpotlight(int enable);

#ifdef __cplusplus
}
#endif
