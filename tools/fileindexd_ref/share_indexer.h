// One share's search index kept in step with its queue records: each record under an indexed
// folder is applied, with the four switches of the folder that governs it deciding what is indexed.
#pragma once

#include <sys/stat.h>

#include <map>
#include <memory>
#include <set>
#include <string>
#include <utility>
#include <vector>

#include <json/value.h>

#include "fileindex/folder.h"
#include "fileindex/queue_reader.h"
#include "search_index.h"

namespace fileindexd_ref {

// Text of plain-text documents is indexed up to this many bytes.
constexpr size_t kTextCap = 256 * 1024;

class ShareIndexer {
public:
    explicit ShareIndexer(std::string share) : share_(std::move(share)) {}

    // Applies the records in one transaction: 1 created and 2 written index the path afresh, 4
    // (attributes) and 131072 (settings) re-apply the governing folder's settings beneath it,
    // 65536 walks it again from scratch, 8 removes it and what lies beneath, 256 moves it from
    // "path_old". Records outside the share or in an "@eaDir" are ignored. False when the index
    // cannot be opened or written.
    bool Apply(const std::vector<QIRA::FILEINDEX::QueueRecordView>& records, const std::vector<QIRA::FILEINDEX::Folder>& folders);
    // Walks every folder of the share from scratch.
    bool Reindex(const std::vector<QIRA::FILEINDEX::Folder>& folders);
    // The library removed the index data (the share's last folder went, or the share): close it.
    void ForgetIfRemoved();
    // Files in the index; -1 when it is not open.
    long long Count();

private:
    bool Open();
    void ApplyOne(const QIRA::FILEINDEX::QueueRecordView& record);
    // Brings the index in step with the file or tree at `fullPath`; `force` reads every file again.
    void Sync(const std::string& fullPath, bool force);
    void WalkDirectory(const std::string& fullPath, bool force, std::set<std::string>& seen,
                       const std::map<std::string, std::pair<long long, long long>>& stored);
    void Walk(int fd, const std::string& path, int depth, bool force, std::set<std::string>& seen,
              const std::map<std::string, std::pair<long long, long long>>& stored);
    void IndexFile(int dirFd, const std::string& name, const std::string& fullPath, const struct stat& st,
                   const Json::Value& governing, bool force, const std::map<std::string, std::pair<long long, long long>>& stored,
                   std::set<std::string>& seen);
    bool InShare(const std::string& fullPath) const;
    std::string SharePathOf(const std::string& fullPath) const { return fullPath.substr(volume_.size()); }

    std::string share_;
    std::string volume_;     // the share directory's parent: full path = volume_ + share path
    std::unique_ptr<tools::SearchIndex> index_;
    const std::vector<QIRA::FILEINDEX::Folder>* folders_ = nullptr;  // during Apply and Reindex
};

}  // namespace fileindexd_ref
