// Quota service of the appliance.
#pragma once

#ifdef __cplusplus
extern "C" {
#endif

/* Nonzero when cbSize bytes fit under szPath; 0 otherwise, with the reason in QLIBCErrGet()
 * (0x2900 no space, 0x2400 quota exceeded). */
int QIRAQuotaIsEnough(int flags, const char* szPath, unsigned long long cbSize);

#ifdef __cplusplus
}
#endif
