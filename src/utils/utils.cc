// Path and share resolution and small helpers.
#include "fileindex/utils.h"

#include <sys/stat.h>

#include <vector>

#include "fileindex/error.h"
#include "log.h"
#include "path_rules.h"
#include "share_record.h"
#include "qira/qira_share.h"

namespace QIRA {
namespace FILEINDEX {

bool GetShareNameByPath(std::string& shareName, const std::string& path) {
    if (path.empty()) return false;
    const size_t end = path.find('/', 1);  // the first character is dropped, whatever it is
    shareName.assign(path, 1, end == std::string::npos ? std::string::npos : end - 1);
    return true;
}

namespace detail {

bool ShareFullPath(const std::string& shareName, const std::string& path, std::string& fullPath) {
    const ShareRecord share = GetShareRecord(shareName);
    if (!share) return false;
    const std::string sharePath = share->szPath;
    const size_t lastSlash = sharePath.rfind('/');
    fullPath = (lastSlash == std::string::npos ? std::string() : sharePath.substr(0, lastSlash)) + path;
    return true;
}

}  // namespace detail

bool GetFullPath(std::string& fullPath, const std::string& path) {
    if (!detail::NulFree(path)) return false;
    std::string shareName;
    if (!GetShareNameByPath(shareName, path)) {
        FILEIDX_LOG("GetShareNameByPath failed, path=%s", path.c_str());
        return false;
    }
    if (!detail::ShareFullPath(shareName, path, fullPath)) {
        ErrorHandler::SetError(FILEINDEX_ERR_PATH);
        return false;
    }
    return true;
}

bool GetShareNamePathByFullPath(std::string& shareName, std::string& sharePath, const std::string& fullPath) {
    if (!detail::NulFree(fullPath)) return false;
    std::vector<char> name(QIRA_SHARE_NAME_LEN, '\0');
    std::vector<char> inside(QIRA_SHARE_PATH_LEN, '\0');
    if (QIRAShareNamePathGet(fullPath.c_str(), name.data(), static_cast<int>(name.size()), inside.data(),
                             static_cast<int>(inside.size())) < 0) {
        FILEIDX_LOG("QIRAShareNamePathGet failed, path=%s", fullPath.c_str());
        ErrorHandler::SetError(FILEINDEX_ERR_PATH);
        return false;
    }
    name.back() = '\0';
    inside.back() = '\0';
    shareName = name.data();
    sharePath = inside.data();
    return true;
}

std::string ReplaceShareName(const std::string& path, const std::string& newShareName) {
    if (path.empty()) return "";
    const size_t slash = path.find('/', 1);
    if (slash == std::string::npos) return "/" + newShareName;
    return "/" + newShareName + path.substr(slash);
}

bool StringStartWith(const std::string& str, const std::string& prefix) {
    return str.size() >= prefix.size() && str.compare(0, prefix.size(), prefix) == 0;
}

bool IsFileExist(const std::string& path) {
    struct stat st;
    return lstat(path.c_str(), &st) == 0 && S_ISREG(st.st_mode);
}

bool IsDirExist(const std::string& path) {
    struct stat st;
    return lstat(path.c_str(), &st) == 0 && S_ISDIR(st.st_mode);
}

bool RetrieveBoolFromJsonObj(bool& value, const std::string& key, const Json::Value& obj) {
    if (!obj.isObject()) return false;
    const Json::Value* member = obj.find(key.data(), key.data() + key.size());
    if (member == nullptr || !member->isBool()) return false;
    value = member->asBool();
    return true;
}

bool RetrieveStringFromJsonObj(std::string& value, const std::string& key, const Json::Value& obj) {
    if (!obj.isObject()) return false;
    const Json::Value* member = obj.find(key.data(), key.data() + key.size());
    if (member == nullptr || !member->isString()) return false;
    value = member->asString();
    return true;
}

}  // namespace FILEINDEX
}  // namespace QIRA
