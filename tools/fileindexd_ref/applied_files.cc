#include "applied_files.h"

namespace fileindexd_ref {
namespace {

bool Holds(const std::string& folder, const std::string& path) {
    return !folder.empty() && path.compare(0, folder.size(), folder) == 0 &&
           (path.size() == folder.size() || path[folder.size()] == '/');
}

}  // namespace

void AppliedFiles::Count(const Batch& batch, const std::vector<QIRA::FILEINDEX::Folder>& folders, bool restart) {
    if (restart) *this = AppliedFiles();
    for (const auto& record : batch) {
        if (!changes_.IsNewFile(record.path)) continue;
        ++files_;
        for (const auto& folder : folders) {
            if (Holds(folder.full_path, record.path) || Holds(folder.full_path, record.path_old)) ++perFolder_[folder.path];
        }
    }
}

}  // namespace fileindexd_ref
