// Which shares, paths and file names may be indexed; room for the index; governing folder.
#include <algorithm>
#include <climits>
#include <cstdlib>
#include <cstring>
#include <memory>

#include "fileindex/utils.h"
#include "log.h"
#include "folder_fields.h"
#include "indexability_rules.h"
#include "path_rules.h"
#include "share_record.h"
#include "qira/qira_fs.h"
#include "qira/qira_quota.h"
#include "qira/qira_share.h"
#include "qira/qlib_core.h"

namespace QIRA {
namespace FILEINDEX {
namespace {

const std::vector<std::string> kSystemPreservedNames = {".TemporaryItems", "QIRA@.fileindexdb",
                                                        "QIRA@file_index_queue", ".QIRAPPSDB", ".DS_Store"};

constexpr unsigned long long kIndexSpaceNeeded = 10485760ULL;

}  // namespace

bool IsSystemPreservedFileName(const std::string& name) {
    return QIRAEAIsHiddenDir(name.c_str()) == 1 ||
           std::find(kSystemPreservedNames.begin(), kSystemPreservedNames.end(), name) != kSystemPreservedNames.end();
}

bool IsSkipIndex(const std::string& fullPath) {
    if (!detail::NulFree(fullPath)) return true;
    const int type = QIRAGetFSType(fullPath.c_str(), 0);
    const size_t slash = fullPath.rfind('/');
    if (slash == std::string::npos) return true;
    if (IsSystemPreservedFileName(fullPath.substr(slash + 1))) return true;
    if (detail::InRecycleBin(fullPath) || detail::InSnapshot(fullPath)) return true;
    if (type == -1) return false;
    return detail::IsUnindexableFsType(type);
}

bool CanShareBeIndexed(_tag_QIRASHARE* share) { return detail::EvaluateShare(share, nullptr); }

bool CanPathBeIndexed(const std::string& path) {
    if (!detail::NulFree(path)) return false;
    std::string fullPath;
    if (!GetFullPath(fullPath, path)) {
        FILEIDX_LOG("GetFullPath failed, path=%s", path.c_str());
        ErrorHandler::SetError(FILEINDEX_ERR_PATH);
        return false;
    }
    return CanFullPathBeIndexed(fullPath);
}

bool CanFullPathBeIndexed(const std::string& fullPath) {
    return detail::NulFree(fullPath) && detail::EvaluateFullPath(fullPath, nullptr);
}

bool IsShareSpaceEnough(const std::string& shareName) {
    if (!detail::NulFree(shareName)) return false;
    const detail::ShareRecord share = detail::GetShareRecord(shareName);
    if (!share) {
        FILEIDX_LOG("QIRAShareGet failed, share=%s", shareName.c_str());
        return false;
    }
    if (QIRAQuotaIsEnough(0, share->szPath, kIndexSpaceNeeded) != 0) return true;
    const int err = QLIBCErrGet();
    return err != QLIBC_ERR_NO_SPACE && err != QLIBC_ERR_QUOTA_EXCEEDED;
}

Json::Value GetMostSuitableCfg(std::vector<Folder> folders, const std::string& fullPath) {
    const Folder* chosen = nullptr;
    for (const auto& folder : folders) {
        if (detail::Governs(folder.GetFullPath(), fullPath)) chosen = &folder;
    }
    return chosen ? chosen->asJson() : Json::Value(Json::objectValue);
}

}  // namespace FILEINDEX
}  // namespace QIRA
