#include "share_path_check.h"

#include "fileindex/utils.h"

namespace tools {
namespace {

bool HasBadComponent(const std::string& path) {
    size_t begin = 1;
    while (true) {
        const size_t end = path.find('/', begin);
        const std::string component = path.substr(begin, end == std::string::npos ? std::string::npos : end - begin);
        if (component.empty() || component == "." || component == "..") return true;
        if (end == std::string::npos) return false;
        begin = end + 1;
    }
}

bool Refuse(Cause& cause, const char* name, const std::string& text, int httpStatus) {
    cause = {name, 0, text, httpStatus};
    return false;
}

}  // namespace

bool CheckSharePath(const std::string& path, Cause& cause) {
    if (path.empty() || path[0] != '/') {
        return Refuse(cause, "BAD_PATH", "\"" + path + "\" is no share path: it begins with \"/\" and a share's name, e.g. /music/live", 400);
    }
    if (path.size() > 1 && path.back() == '/') {
        return Refuse(cause, "BAD_PATH", "drop the trailing \"/\": " + path.substr(0, path.find_last_not_of('/') + 1), 400);
    }
    if (HasBadComponent(path)) {
        return Refuse(cause, "BAD_PATH", "\"" + path + "\" has an empty, \".\" or \"..\" component; give the folder's own path", 400);
    }
    std::string share;
    std::string shareDir;
    QIRA::FILEINDEX::GetShareNameByPath(share, path);
    if (QIRA::FILEINDEX::GetFullPath(shareDir, "/" + share)) return true;
    std::string owner;
    std::string inside;
    if (QIRA::FILEINDEX::GetShareNamePathByFullPath(owner, inside, path)) {
        return Refuse(cause, "BAD_PATH", path + " is a full path on the volume; give the share path /" + owner +
                                             (inside == "/" ? "" : inside), 400);
    }
    return Refuse(cause, "SHARE_UNKNOWN", "no share is named \"" + share + "\"", 404);
}

}  // namespace tools
