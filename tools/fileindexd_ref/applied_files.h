// The files of a share's taken batch that the daemon has applied, over the share and per indexed
// folder, counted as the progress report counts pending files (FileChanges, in the companion's
// order), so that the tools can take one from the other.
#pragma once

#include <map>
#include <string>
#include <vector>

#include "fileindex/file_changes.h"
#include "fileindex/folder.h"
#include "queue_take.h"

namespace fileindexd_ref {

class AppliedFiles {
public:
    // Counts `batch`, just applied: for the share, and for each folder of `folders` that holds a
    // record's path or, for event 256, its old path. `restart` when the batch opens a companion.
    void Count(const Batch& batch, const std::vector<QIRA::FILEINDEX::Folder>& folders, bool restart);

    unsigned long long Files() const { return files_; }
    // By folder path ("/share/dir"): the folders that had files applied since the companion opened.
    const std::map<std::string, unsigned long long>& PerFolder() const { return perFolder_; }

private:
    QIRA::FILEINDEX::FileChanges changes_;
    unsigned long long files_ = 0;
    std::map<std::string, unsigned long long> perFolder_;
};

}  // namespace fileindexd_ref
