#include "saved_files.h"

#include <sys/stat.h>

#include "fileindex/fileindex.h"

namespace tools {

std::string SavedFiles::StampOf(const std::string& path) {
    struct stat st;
    if (stat(path.c_str(), &st) != 0) return "-";
    return std::to_string(st.st_ino) + ":" + std::to_string(st.st_size) + ":" + std::to_string(st.st_mtim.tv_sec) +
           "." + std::to_string(st.st_mtim.tv_nsec);
}

SavedFiles::SavedFiles() {
    for (const std::string& path : {QIRA::FILEINDEX::Folders().GetPath(), QIRA::FILEINDEX::Status().GetPath()}) {
        files_.push_back({path, StampOf(path)});
    }
}

std::vector<std::string> SavedFiles::Changed() const {
    std::vector<std::string> changed;
    for (const auto& file : files_) {
        if (StampOf(file.path) != file.stamp) changed.push_back(file.path);
    }
    return changed;
}

}  // namespace tools
