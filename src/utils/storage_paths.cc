// Per-share index database directory and event queue path, in the share's "@eaDir".
#include <cerrno>
#include <cstdio>
#include <memory>

#include "ea_dir.h"
#include "fileindex/fileidx.h"
#include "fileindex/utils.h"
#include "log.h"
#include "qira/qira_fs.h"
#include "qira/qira_share.h"
#include "qira/qlib_core.h"
#include "share_record.h"

namespace QIRA {
namespace FILEINDEX {
namespace {

const char kEaDir[] = "@eaDir";
const char kDbLeaf[] = "QIRA@.fileindexdb";
const char kQueueLeaf[] = "QIRA@file_index_queue";

bool ArgumentsValid(const char* szName, const char* szOut, const char* outCheck, int cbOutLen) {
    if (szName == nullptr) {
        FILEIDX_LOG("Invaild Argument (%s)=[%d]\n", "__null != szName", 0);
    } else if (szOut == nullptr) {
        FILEIDX_LOG("Invaild Argument (%s)=[%d]\n", outCheck, 0);
    } else if (cbOutLen <= 0) {
        FILEIDX_LOG("Invaild Argument (%s)=[%d]\n", "cbOutLen > 0", cbOutLen);
    } else {
        return true;
    }
    QLIBCErrSetEx(QLIBC_ERR_INVALID_ARG, detail::SourceName(__FILE__), __LINE__);
    return false;
}

// Writes <share>/@eaDir/<leaf> into the caller's buffer, creating "@eaDir" (and the database
// directory when `makeLeafDir`).
int StoragePathGet(const char* szName, char* szOut, int cbOutLen, const char* outCheck, const char* leaf,
                   bool makeLeafDir) {
    if (!ArgumentsValid(szName, szOut, outCheck, cbOutLen)) return -1;
    const detail::ShareRecord share = detail::GetShareRecord(szName);
    if (!share) {
        FILEIDX_LOG("QIRAShareGet failed, name=%s, code=%d", szName, QLIBCErrGet());
        return -1;
    }
    const std::string eaDir = std::string(share->szPath) + "/" + kEaDir;
    if (QIRAEAMKDir(0, eaDir.c_str()) < 0) FILEIDX_LOG("QIRAEAMKDir failed, path=%s, code=%d", eaDir.c_str(), QLIBCErrGet());
    const int length = snprintf(szOut, static_cast<size_t>(cbOutLen), "%s/%s/%s", share->szPath, kEaDir, leaf);
    const bool truncated = length >= cbOutLen;
    if (makeLeafDir && !truncated && detail::MkdirNoFollow(szOut, 0777) != 0 && errno != EEXIST) {
        FILEIDX_LOG("mkdir failed, path=%s, reason=%m", szOut);
    }
    return truncated ? cbOutLen - 1 : length;
}

}  // namespace
}  // namespace FILEINDEX
}  // namespace QIRA

extern "C" int FILEIDXDBPathGet(const char* szName, char* szOutDBPath, int cbOutLen) {
    using namespace QIRA::FILEINDEX;
    return StoragePathGet(szName, szOutDBPath, cbOutLen, "__null != szOutDBPath", kDbLeaf, true);
}

extern "C" int FILEIDXQueuePathGet(const char* szName, char* szOutQueuePath, int cbOutLen) {
    using namespace QIRA::FILEINDEX;
    return StoragePathGet(szName, szOutQueuePath, cbOutLen, "__null != szOutQueuePath", kQueueLeaf, false);
}
