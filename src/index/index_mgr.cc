// Index queries: folder lists and the membership questions, also as plain functions.
#include "fileindex/index_mgr.h"

#include "fileindex/fileidx.h"
#include "fileindex/folders.h"
#include "fileindex/utils.h"
#include "index_support.h"
#include "path_rules.h"

namespace QIRA {
namespace FILEINDEX {

bool IndexMgr::List(std::vector<Folder>& out) {
    Folders folders;
    return folders.Load() && folders.List(out);
}

bool IndexMgr::List(Json::Value& out, unsigned long offset, unsigned long limit, const std::string& sort_by,
                    const std::string& sort_direction, const Json::Value& additional) {
    Folders folders;
    return folders.Load() && folders.List(out, offset, limit, sort_by, sort_direction, additional);
}

bool IndexMgr::Get(Json::Value& out, const std::string& path) {
    if (!detail::NulFree(path)) return false;
    Folders folders;
    detail::UnlockOnExit unlock(folders);
    return folders.Lock(true) && folders.Load() && folders.Get(out, path);
}

bool IndexMgr::IsShareIndexed(const std::string& share) {
    Folders folders;
    return detail::NulFree(share) && folders.Load() && detail::HoldsShare(folders, share);
}

bool detail::HoldsShare(Folders& folders, const std::string& share) {
    std::vector<Folder> list;
    folders.List(list);
    for (const auto& folder : list) {
        std::string name;
        if (!GetShareNameByPath(name, folder.path)) {
            FILEIDX_LOG("Failed to get share name from path: %s", folder.path.c_str());
            continue;
        }
        if (name == share) return true;
    }
    return false;
}

bool IndexMgr::IsPathIndexed(const std::string& path) {
    std::vector<Folder> list;
    return detail::NulFree(path) && List(list) && IsPathIndexed(path, list);
}

bool IndexMgr::IsPathContainIndexed(const std::string& path) {
    std::vector<Folder> list;
    return detail::NulFree(path) && List(list) && IsPathContainIndexed(path, list);
}

bool IndexMgr::IsFullPathIndexed(const std::string& full_path) {
    std::vector<Folder> list;
    return detail::NulFree(full_path) && List(list) && IsFullPathIndexed(full_path, list);
}

bool IndexMgr::IsPathIndexed(const std::string& path, const std::vector<Folder>& list) {
    for (const auto& folder : list) {
        if (detail::IsWithin(path, folder.path)) return true;
    }
    return false;
}

bool IndexMgr::IsPathContainIndexed(const std::string& path, const std::vector<Folder>& list) {
    for (const auto& folder : list) {
        if (detail::IsWithin(folder.path, path)) return true;
    }
    return false;
}

bool IndexMgr::IsFullPathIndexed(const std::string& full_path, const std::vector<Folder>& list) {
    for (const auto& folder : list) {
        if (detail::IsWithin(full_path, folder.GetFullPath())) return true;
    }
    return false;
}

}  // namespace FILEINDEX
}  // namespace QIRA

// A null argument answers 0: nothing may unwind through C linkage.
extern "C" int FILEIDXIsShareIndexed(const char* share) {
    return share != nullptr && QIRA::FILEINDEX::IndexMgr::IsShareIndexed(share) ? 1 : 0;
}

extern "C" int FILEIDXIsPathIndexed(const char* path) {
    return path != nullptr && QIRA::FILEINDEX::IndexMgr::IsPathIndexed(path) ? 1 : 0;
}

extern "C" int FILEIDXIsFullPathIndexed(const char* full_path) {
    return full_path != nullptr && QIRA::FILEINDEX::IndexMgr::IsFullPathIndexed(full_path) ? 1 : 0;
}
