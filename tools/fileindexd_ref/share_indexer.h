// One share's search index kept in step with its queue records: each record under an indexed
// folder is applied, with the four switches of the folder that governs it deciding what is indexed.
//
// Everything a record names is written by the share's users. A record's path is taken only in
// canonical form beneath the share directory; every file and directory is opened beneath the share
// directory's descriptor without following a link or blocking; live records and walks keep out the
// same entries (the library's entry rules), so that applying changes and walking agree.
#pragma once

#include <sys/stat.h>

#include <csignal>
#include <map>
#include <memory>
#include <set>
#include <string>
#include <utility>
#include <vector>

#include <json/value.h>

#include "beneath.h"
#include "extractor_client.h"
#include "fileindex/folder.h"
#include "fileindex/queue_reader.h"
#include "search_index.h"

namespace fileindexd_ref {

// Text of documents is indexed up to this many bytes.
constexpr size_t kTextCap = 256 * 1024;

using Stored = std::map<std::string, tools::StoredFile>;  // by share path

class ShareIndexer {
public:
    // Statements and walks stop once `*stop` becomes nonzero. What files hold is read through
    // `extractor`: documents' text, and the kind of a file whose name tells none.
    ShareIndexer(std::string share, const volatile sig_atomic_t* stop, ExtractorClient& extractor)
        : share_(std::move(share)), stop_(stop), extractor_(extractor) {}

    // Applies the records in one transaction, each path once (a move starts afresh): 1 created, 2
    // written and 65536 reindex read the path afresh, 4 (attributes), 8 (deleted) and 131072
    // (settings) bring the index in step with what is there now, 256 moves it from "path_old".
    // A record whose path is not canonical beneath the share is refused (counted in one log line
    // per batch) and changes nothing. False when the index cannot be opened or written, or the
    // batch ran past its budget: nothing of the batch stays written.
    bool Apply(const std::vector<QIRA::FILEINDEX::QueueRecordView>& records, const std::vector<QIRA::FILEINDEX::Folder>& folders);
    // Walks every folder of the share from scratch, in one transaction.
    bool Reindex(const std::vector<QIRA::FILEINDEX::Folder>& folders);
    // The library removed the index data (the share's last folder went, or the share): close it.
    void ForgetIfRemoved();
    // Files in the index; -1 when it is not open.
    long long Count();
    // Why the last Apply or Reindex failed.
    tools::IndexProblem LastProblem() const { return problem_; }
    const std::string& Share() const { return share_; }

private:
    // Opens the index; one that fails the checks is set aside, the share marked need-reindex, and a
    // new one made.
    bool Open();
    bool Finish(bool done);
    void ApplyOne(const QIRA::FILEINDEX::QueueRecordView& record);
    // Brings the index in step with the file or tree at `fullPath`; `force` reads every file again.
    void Sync(const std::string& fullPath, bool force);
    void Walk(int fd, const std::string& path, int depth, bool force, std::set<std::string>& seen, const Stored& stored);
    void IndexFile(int dirFd, const std::string& name, const std::string& fullPath, const struct stat& st,
                   const Json::Value& governing, bool force, const Stored& stored, std::set<std::string>& seen);
    // What the file `name` in `dirFd` holds; a problem is logged.
    extractor::Reply Extract(int dirFd, const std::string& name, const std::string& sharePath);
    int Depth(const std::string& fullPath) const;
    // EntryRefusal of a directory on the way, asked once per batch.
    const char* WayRefusal(const std::string& dir);
    std::string SharePathOf(const std::string& fullPath) const { return fullPath.substr(volume_.size()); }
    std::string Relative(const std::string& fullPath) const;

    std::string share_;
    const volatile sig_atomic_t* stop_;
    ExtractorClient& extractor_;
    std::string shareDir_;  // the share directory: full path = volume_ + share path
    std::string volume_;
    tools::Fd shareFd_;
    std::unique_ptr<tools::SearchIndex> index_;
    tools::IndexProblem problem_ = tools::IndexProblem::None;
    const std::vector<QIRA::FILEINDEX::Folder>* folders_ = nullptr;  // during Apply and Reindex
    std::set<std::string> tooDeepLogged_;  // folders whose depth bound was logged
    std::map<std::string, bool> synced_;   // paths applied in this batch, and whether read afresh
    std::map<std::string, const char*> ways_;  // WayRefusal's answers in this batch
};

}  // namespace fileindexd_ref
