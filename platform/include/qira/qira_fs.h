// File systems and metadata directories of the appliance.
#pragma once

#ifdef __cplusplus
extern "C" {
#endif

/* File-system type of the volume holding szPath; -1 when unknown. */
int QIRAGetFSType(const char* szPath, int flags);
int QIRAFSIsRemoteFS(int fsType);
int QIRAFSIsImageFS(int fsType);
/* 1 when szPath is a mount point, 0 when not, negative on failure. */
int QIRAFSDirIsMntPoint(const char* szPath);
/* 0 on success with *pInSnapshot set to 1 when szPath lies in a snapshot. */
int QLIBFhsPathInSnapshot(const char* szPath, int* pInSnapshot);
/* 1 when szName is one of the platform's hidden metadata directory names. */
int QIRAEAIsHiddenDir(const char* szName);
/* Creates a metadata directory; 0 on success (also when it exists), negative on failure. */
int QIRAEAMKDir(int flags, const char* szPath);

#ifdef __cplusplus
}
#endif
