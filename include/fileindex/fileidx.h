/* Plain functions of libfileindex, with C linkage. None takes a lock; each loads what it needs
 * afresh. A failed load of folder.conf answers 0 and leaves its error code (6 or 8). */
#pragma once

#include "fileindex/export.h"

#ifdef __cplusplus
extern "C" {
#endif

/* The three questions answer 0 for a null argument. */
/* 1 when the share holds an indexed folder; 0 when not or on any failure. */
FILEINDEX_EXPORT int FILEIDXIsShareIndexed(const char* share);
/* 1 when the share path lies in an indexed folder; 0 when not or on any failure. */
FILEINDEX_EXPORT int FILEIDXIsPathIndexed(const char* path);
/* 1 when the full path lies in an indexed folder; 0 when not or on any failure. */
FILEINDEX_EXPORT int FILEIDXIsFullPathIndexed(const char* full_path);

/* The share's index database directory (created) and event queue file path, written with
 * snprintf semantics into the buffer. Returns the length written, -1 on a bad argument or an
 * unknown share. */
FILEINDEX_EXPORT int FILEIDXDBPathGet(const char* szName, char* szOutDBPath, int cbOutLen);
FILEINDEX_EXPORT int FILEIDXQueuePathGet(const char* szName, char* szOutQueuePath, int cbOutLen);

#ifdef __cplusplus
}
#endif
