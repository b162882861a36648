// Stub platform libraries for the appliance-mode build check: every operation the library calls,
// answering failure. They only prove that the appliance build compiles and links.
#include "qira/qira_fs.h"
#include "qira/qira_quota.h"
#include "qira/qira_share.h"
#include "qira/qlib_core.h"
#include "qira/qlib_service.h"
#include "qiranotifyd/monitor_queue.h"

extern "C" {
int QIRAGetFSType(const char*, int) { return -1; }
int QIRAFSIsRemoteFS(int) { return 0; }
int QIRAFSIsImageFS(int) { return 0; }
int QIRAFSDirIsMntPoint(const char*) { return 0; }
int QLIBFhsPathInSnapshot(const char*, int*) { return -1; }
int QIRAEAIsHiddenDir(const char*) { return 0; }
int QIRAEAMKDir(int, const char*) { return -1; }
int QIRAQuotaIsEnough(int, const char*, unsigned long long) { return 0; }
int QIRAShareGet(const char*, QIRASHARE**) { return -1; }
void QIRAShareFree(QIRASHARE*) {}
int QIRAShareNamePathGet(const char*, char*, int, char*, int) { return -1; }
int QIRAShareIsShareRecycle(const char*) { return 0; }
int QLIBShareIsEncryptedGet(const QIRASHARE*, int*) { return -1; }
int QLIBShareIsEncryptionGet(const QIRASHARE*, int*) { return -1; }
int QLIBShareIsReadOnlyGet(const QIRASHARE*, int*) { return -1; }
int QLIBCErrGet(void) { return 0; }
void QLIBCErrSetEx(int, const char*, int) {}
const char* QLIBCErrorGetFile(void) { return ""; }
int QLIBCErrorGetLine(void) { return 0; }
int QLIBCExec(const char*, const char*, const char*, const char*, const char*) { return -1; }
int QLIBCExecv(const char*, char* const[], int) { return -1; }
int QLIBCUnicodeUTF8StrCaseCmp(const char*, const char*) { return 0; }
int QLIBServiceStart(const char*, int) { return -1; }
int QLIBServiceStop(const char*, int) { return -1; }
int QLIBServiceRestart(const char*) { return -1; }
int QIRASMBIsEnableSpotlight(void) { return 0; }
int QIRASMBSetSpotlight(int) { return -1; }
}

namespace QIRA {
namespace QIRANOTIFYD {
MonitorQueue::MonitorQueue(const Json::Value& jsQueue) : description_(jsQueue) {}
bool MonitorQueue::Upsert(const MonitorQueue&, const std::string&, _tag_monitor_queue_type_) { return false; }
bool MonitorQueue::Delete(const std::string&, const std::string&, _tag_monitor_queue_type_) { return false; }
}  // namespace QIRANOTIFYD
}  // namespace QIRA
