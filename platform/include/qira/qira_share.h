// Share service of the appliance.
#pragma once

#ifdef __cplusplus
extern "C" {
#endif

#define QIRA_SHARE_NAME_LEN 492
#define QIRA_SHARE_PATH_LEN 4096

typedef struct _tag_QIRASHARE {
    char szName[QIRA_SHARE_NAME_LEN];
    char szPath[QIRA_SHARE_PATH_LEN]; /* the share's own full path, e.g. /volume1/music */
    int encrypted;                    /* the share's volume is locked (encrypted and not mounted) */
    int encryption;                   /* the share uses encryption; its directory is a mount */
    int readOnly;
} QIRASHARE;

/* Looks a share up by name; allocates *ppShare. 0 on success, negative on failure. */
int QIRAShareGet(const char* szName, QIRASHARE** ppShare);
void QIRAShareFree(QIRASHARE* pShare);
/* Splits a full path into share name and path inside the share. Negative on failure. */
int QIRAShareNamePathGet(const char* szFullPath, char* szName, int cbName, char* szPath, int cbPath);
/* Nonzero when the full path lies in a share's recycle bin. */
int QIRAShareIsShareRecycle(const char* szFullPath);
int QLIBShareIsEncryptedGet(const QIRASHARE* pShare, int* pIsEncrypted);
int QLIBShareIsEncryptionGet(const QIRASHARE* pShare, int* pIsEncryption);
int QLIBShareIsReadOnlyGet(const QIRASHARE* pShare, int* pIsReadOnly);

#ifdef __cplusplus
}
#endif
