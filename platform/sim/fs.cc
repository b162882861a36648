// Simulated file systems: types from the share table, mount points from device numbers,
// metadata directories as real directories.
#include <sys/stat.h>

#include <cerrno>
#include <cstring>
#include <string>

#include "qira/qira_fs.h"
#include "sim_state.h"

namespace {

constexpr int kDefaultFsType = 2;  // ext4
constexpr int kErrMkdir = 0x0A00;

bool InShareDir(const std::string& fullPath, const char* dirName) {
    std::string name;
    Json::Value share;
    if (!qira_sim::detail::FindShareOf(fullPath, name, share)) return false;
    return qira_sim::detail::IsUnder(fullPath, share["path"].asString() + "/" + dirName);
}

bool ListedMountPoint(const std::string& fullPath) {
    std::string name;
    Json::Value share;
    if (!qira_sim::detail::FindShareOf(fullPath, name, share)) return false;
    for (const auto& point : share["mount_points"]) {
        if (point.isString() && point.asString() == fullPath) return true;
    }
    return false;
}

}  // namespace

extern "C" {

int QIRAGetFSType(const char* szPath, int /*flags*/) {
    using namespace qira_sim::detail;
    const std::string path = szPath ? szPath : "";
    if (Faulted("QIRAGetFSType", path)) return -1;
    std::string name;
    Json::Value share;
    if (!FindShareOf(path, name, share)) return -1;
    return share.get("fs_type", kDefaultFsType).isInt() ? share.get("fs_type", kDefaultFsType).asInt() : kDefaultFsType;
}

int QIRAFSIsRemoteFS(int fsType) { return fsType >= 20 && fsType < 30; }

int QIRAFSIsImageFS(int fsType) { return fsType >= 30 && fsType < 40; }

int QIRAFSDirIsMntPoint(const char* szPath) {
    using namespace qira_sim::detail;
    const std::string path = szPath ? szPath : "";
    if (Faulted("QIRAFSDirIsMntPoint", path)) return -1;
    if (ListedMountPoint(path)) return 1;
    struct stat self, parent;
    if (stat(path.c_str(), &self) != 0 || stat((path + "/..").c_str(), &parent) != 0) {
        SetError(0x0E00, __FILE__, __LINE__);
        return -1;
    }
    return (self.st_dev != parent.st_dev || self.st_ino == parent.st_ino) ? 1 : 0;
}

int QLIBFhsPathInSnapshot(const char* szPath, int* pInSnapshot) {
    using namespace qira_sim::detail;
    const std::string path = szPath ? szPath : "";
    if (Faulted("QLIBFhsPathInSnapshot", path)) return -1;
    *pInSnapshot = InShareDir(path, "#snapshot") ? 1 : 0;
    return 0;
}

int QIRAEAIsHiddenDir(const char* szName) {
    static const char* const kHidden[] = {"@eaDir", "@tmp", "@__thumb", "@Recently-Snapshot"};
    for (const char* hidden : kHidden) {
        if (szName && std::strcmp(szName, hidden) == 0) return 1;
    }
    return 0;
}

int QIRAEAMKDir(int /*flags*/, const char* szPath) {
    using namespace qira_sim::detail;
    const std::string path = szPath ? szPath : "";
    if (Faulted("QIRAEAMKDir", path)) return -1;
    if (mkdir(path.c_str(), 0777) == 0) return 0;
    struct stat st;
    if (errno == EEXIST && lstat(path.c_str(), &st) == 0 && S_ISDIR(st.st_mode)) return 0;
    SetError(kErrMkdir, __FILE__, __LINE__);
    return -1;
}
}
