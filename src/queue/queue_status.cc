#include "queue_status.h"

#include "fileindex/utils.h"
#include "log.h"
#include "queue_readings.h"

namespace QIRA {
namespace FILEINDEX {
namespace detail {

bool IsFolderInQueue(const std::string& folderPath, const std::string& queuePath) {
    if (!IsFileExist(queuePath)) return false;
    std::string fullPath;
    if (!GetFullPath(fullPath, folderPath)) {
        FILEIDX_LOG("Cannot get full path: %s", folderPath.c_str());
        return false;
    }
    const std::string prefix = fullPath + "/";
    QueueAnswer answer;
    if (!ReadQueue(queuePath, {prefix}, answer)) {
        FILEIDX_LOG("Failed to open queue=%s, reason=%m", queuePath.c_str());
        return false;
    }
    return answer.refused || answer.under[0].records > 0;
}

}  // namespace detail
}  // namespace FILEINDEX
}  // namespace QIRA
