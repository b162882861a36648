// Simulated quota: free space from statvfs, optionally capped by the share's "quota_free".
#include <sys/statvfs.h>

#include <string>

#include "qira/qira_quota.h"
#include "qira/qlib_core.h"
#include "sim_state.h"

extern "C" int QIRAQuotaIsEnough(int /*flags*/, const char* szPath, unsigned long long cbSize) {
    using namespace qira_sim::detail;
    const std::string path = szPath ? szPath : "";
    if (Faulted("QIRAQuotaIsEnough", path)) return 0;
    std::string name;
    Json::Value share;
    if (FindShareOf(path, name, share) && share["quota_free"].isNumeric() &&
        share["quota_free"].asDouble() < static_cast<double>(cbSize)) {
        SetError(QLIBC_ERR_QUOTA_EXCEEDED, __FILE__, __LINE__);
        return 0;
    }
    struct statvfs vfs;
    if (statvfs(path.c_str(), &vfs) != 0) {
        SetError(0x0E00, __FILE__, __LINE__);
        return 0;
    }
    const unsigned long long available = static_cast<unsigned long long>(vfs.f_bavail) * vfs.f_frsize;
    if (available < cbSize) {
        SetError(QLIBC_ERR_NO_SPACE, __FILE__, __LINE__);
        return 0;
    }
    return 1;
}
