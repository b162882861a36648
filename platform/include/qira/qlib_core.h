// Core library of the appliance: error state, program execution, Unicode.
#pragma once

#ifdef __cplusplus
extern "C" {
#endif

#define QLIBC_ERR_INVALID_ARG 0x0D00
#define QLIBC_ERR_NO_SPACE 0x2900
#define QLIBC_ERR_QUOTA_EXCEEDED 0x2400

int QLIBCErrGet(void);
void QLIBCErrSetEx(int code, const char* szFile, int line);
const char* QLIBCErrorGetFile(void);
int QLIBCErrorGetLine(void);

/* Runs szProgram with up to four arguments (unused ones NULL), without a shell, and waits.
 * Returns the exit status, negative when the program could not be run. */
int QLIBCExec(const char* szProgram, const char* a1, const char* a2, const char* a3, const char* a4);
/* Runs szProgram with the NULL-terminated argv (argv[0] is the program). With wait nonzero
 * returns the exit status; otherwise 0 once started. Negative when it could not be run. */
int QLIBCExecv(const char* szProgram, char* const argv[], int wait);

/* Case-insensitive comparison of two UTF-8 strings, like strcmp. */
int QLIBCUnicodeUTF8StrCaseCmp(const char* s1, const char* s2);

#ifdef __cplusplus
}
#endif
