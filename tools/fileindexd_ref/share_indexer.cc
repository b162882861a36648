#include "share_indexer.h"

#include <dirent.h>
#include <fcntl.h>
#include <unistd.h>

#include <algorithm>
#include <chrono>
#include <cstring>
#include <iostream>

#include "file_types.h"
#include "fileindex/entry_rules.h"
#include "fileindex/fileidx.h"
#include "fileindex/json.h"
#include "fileindex/status_mgr.h"
#include "fileindex/utils.h"
#include "text_safety.h"

namespace fileindexd_ref {
namespace {

using QIRA::FILEINDEX::QueueRecordView;

constexpr unsigned kCreated = 1;
constexpr unsigned kWritten = 2;
constexpr unsigned kMoved = 256;
constexpr unsigned kReindex = 0x10000;
// How long one batch may take in the index before it is given up.
constexpr std::chrono::seconds kBatchBudget{30};
constexpr int kDirFlags = O_RDONLY | O_DIRECTORY;

bool IsTooDeep(const char* refusal) { return refusal != nullptr && std::strcmp(refusal, "too_deep") == 0; }

void Say(const std::string& share, const std::string& what) {
    std::cout << "fileindexd-ref: share " << share << ": " << what << std::endl;
}

}  // namespace

bool ShareIndexer::Open() {
    if (index_) return true;
    char dbDir[4096];
    if (!QIRA::FILEINDEX::GetFullPath(shareDir_, "/" + share_) || FILEIDXDBPathGet(share_.c_str(), dbDir, sizeof dbDir) < 0) {
        problem_ = tools::IndexProblem::Failed;
        return false;
    }
    volume_ = shareDir_.substr(0, shareDir_.size() - share_.size() - 1);
    shareFd_ = tools::Fd(open(shareDir_.c_str(), kDirFlags | O_CLOEXEC));
    std::string error;
    index_ = tools::SearchIndex::Open(shareDir_, true, problem_, error);
    if (!index_ && problem_ == tools::IndexProblem::Damaged) {
        const std::string aside = tools::SearchIndex::SetAside(shareDir_);
        Say(share_, "the index is damaged or not this service's (" + error + "); " +
                        (aside.empty() ? "it could not be set aside" : "set aside as " + tools::EscapeForTerminal(aside)) +
                        "; the share is rebuilt from a walk");
        QIRA::FILEINDEX::StatusMgr::ShareSetNeedReindex(share_, true);
        FILEIDXDBPathGet(share_.c_str(), dbDir, sizeof dbDir);  // again, when the directory itself went aside
        index_ = tools::SearchIndex::Open(shareDir_, true, problem_, error);
    }
    if (!index_) Say(share_, "cannot open the index: " + error);
    return index_ != nullptr && shareFd_.Valid();
}

// Ends the transaction: committed when `done` and nothing failed in it, rolled back otherwise. An
// index found damaged meanwhile is set aside and the share marked need-reindex.
bool ShareIndexer::Finish(bool done) {
    folders_ = nullptr;
    synced_.clear();
    ways_.clear();
    problem_ = index_->LastProblem();
    if (done && problem_ == tools::IndexProblem::None && (stop_ == nullptr || *stop_ == 0) && index_->Commit()) return true;
    problem_ = index_->LastProblem() == tools::IndexProblem::None ? tools::IndexProblem::TimedOut : index_->LastProblem();
    index_->Rollback();
    if (problem_ == tools::IndexProblem::Damaged) {
        index_.reset();
        const std::string aside = tools::SearchIndex::SetAside(shareDir_);
        Say(share_, "the index turned out damaged; set aside as " + tools::EscapeForTerminal(aside) + "; the share is rebuilt from a walk");
        QIRA::FILEINDEX::StatusMgr::ShareSetNeedReindex(share_, true);
    }
    return false;
}

void ShareIndexer::ForgetIfRemoved() {
    if (index_ && !index_->StillOnDisk()) {
        index_.reset();
        shareFd_ = tools::Fd();
        Say(share_, "the index was removed; closed");
    }
}

long long ShareIndexer::Count() { return index_ ? index_->Count() : -1; }

bool ShareIndexer::Apply(const std::vector<QueueRecordView>& records, const std::vector<QIRA::FILEINDEX::Folder>& folders) {
    if (!Open()) return false;
    index_->SetDeadline(std::chrono::steady_clock::now() + kBatchBudget, stop_);
    if (!index_->Begin()) return Finish(false);
    folders_ = &folders;
    size_t refused = 0;
    std::string firstRefused;
    for (const auto& record : records) {
        if (!QIRA::FILEINDEX::IsCanonicalBeneath(shareDir_, record.path)) {
            if (refused++ == 0) firstRefused = record.path;
            continue;
        }
        ApplyOne(record);
    }
    if (refused > 0) {
        Say(share_, std::to_string(refused) + " records refused: their path is not in canonical form beneath the share (first: " +
                        tools::EscapeForTerminal(firstRefused) + ")");
    }
    return Finish(true);
}

bool ShareIndexer::Reindex(const std::vector<QIRA::FILEINDEX::Folder>& folders) {
    if (!Open()) return false;
    index_->SetDeadline(std::chrono::steady_clock::time_point::max(), stop_);
    if (!index_->Begin()) return Finish(false);
    folders_ = &folders;
    for (const auto& folder : folders) {
        std::string share;
        if (QIRA::FILEINDEX::GetShareNameByPath(share, folder.path) && share == share_) Sync(folder.GetFullPath(), true);
    }
    return Finish(true);
}

void ShareIndexer::ApplyOne(const QueueRecordView& record) {
    if (record.event == kMoved && record.path_old != record.path &&
        QIRA::FILEINDEX::IsCanonicalBeneath(shareDir_, record.path_old)) {
        index_->Rename(SharePathOf(record.path_old), SharePathOf(record.path));
        synced_.clear();  // what was applied before the move no longer stands where it was
        synced_[record.path] = false;
        return Sync(record.path, false);
    }
    const bool force = record.event == kCreated || record.event == kWritten || record.event == kReindex ||
                       record.event == kMoved;
    const auto found = synced_.find(record.path);
    if (found != synced_.end() && (found->second || !force)) return;  // applied already in this batch
    synced_[record.path] = force;
    Sync(record.path, force);
}

std::string ShareIndexer::Relative(const std::string& fullPath) const {
    return fullPath.size() > shareDir_.size() ? fullPath.substr(shareDir_.size() + 1) : "";
}

const char* ShareIndexer::WayRefusal(const std::string& dir) {
    const auto found = ways_.find(dir);
    if (found != ways_.end()) return found->second;
    return ways_[dir] = QIRA::FILEINDEX::EntryRefusal(shareDir_, dir, true);
}

int ShareIndexer::Depth(const std::string& fullPath) const {
    return static_cast<int>(std::count(fullPath.begin() + static_cast<long>(shareDir_.size()), fullPath.end(), '/'));
}

void ShareIndexer::Sync(const std::string& fullPath, bool force) {
    Stored stored;
    if (!index_->Under(SharePathOf(fullPath), stored)) return;
    std::set<std::string> seen;
    if (fullPath == shareDir_) {
        Walk(tools::OpenBeneath(shareFd_.Get(), "", kDirFlags), fullPath, 0, force, seen, stored);
    } else {
        const size_t slash = fullPath.rfind('/');
        const std::string parent = fullPath.substr(0, slash);
        const std::string name = fullPath.substr(slash + 1);
        const tools::Fd parentFd(WayRefusal(parent) == nullptr
                                     ? tools::OpenBeneath(shareFd_.Get(), Relative(parent), kDirFlags)
                                     : -1);
        struct stat st;
        if (parentFd.Valid() && fstatat(parentFd.Get(), name.c_str(), &st, AT_SYMLINK_NOFOLLOW) == 0) {
            const char* refusal = QIRA::FILEINDEX::ChildRefusal(fullPath, name, Depth(fullPath), S_ISDIR(st.st_mode));
            if (refusal != nullptr) {
                if (IsTooDeep(refusal)) Walk(-1, fullPath, Depth(fullPath), force, seen, stored);
            } else if (S_ISDIR(st.st_mode)) {
                Walk(tools::OpenBeneath(parentFd.Get(), name, kDirFlags), fullPath, Depth(fullPath), force, seen, stored);
            } else if (S_ISREG(st.st_mode)) {
                IndexFile(parentFd.Get(), name, fullPath, st, QIRA::FILEINDEX::GetMostSuitableCfg(*folders_, fullPath), force,
                          stored, seen);
            }
        }
    }
    for (const auto& entry : stored) {
        if (seen.count(entry.first) == 0) index_->Remove(entry.first);
    }
}

// Takes ownership of `fd` (-1: a directory past the depth bound, only logged); holds one
// descriptor per level of the tree. `depth` is that of `path` below the share directory.
void ShareIndexer::Walk(int fd, const std::string& path, int depth, bool force, std::set<std::string>& seen,
                        const Stored& stored) {
    const Json::Value governing = QIRA::FILEINDEX::GetMostSuitableCfg(*folders_, path);
    if (fd < 0) {
        if (depth > QIRA::FILEINDEX::MaxEntryDepth() && governing.isMember("path") &&
            tooDeepLogged_.insert(governing["path"].asString()).second) {
            Say(share_, "folder " + governing["path"].asString() + " holds entries too deep to index (first: " +
                            tools::EscapeForTerminal(SharePathOf(path)) + "): " +
                            QIRA::FILEINDEX::EntryRefusalWords("too_deep"));
        }
        return;
    }
    DIR* dir = fdopendir(fd);
    if (dir == nullptr) {
        close(fd);
        return;
    }
    while (const dirent* entry = readdir(dir)) {
        if (stop_ != nullptr && *stop_ != 0) break;
        const std::string name = entry->d_name;
        if (name == "." || name == "..") continue;
        const std::string childPath = path + "/" + name;
        struct stat st;
        if (fstatat(dirfd(dir), name.c_str(), &st, AT_SYMLINK_NOFOLLOW) != 0) continue;
        const char* refusal = QIRA::FILEINDEX::ChildRefusal(childPath, name, depth + 1, S_ISDIR(st.st_mode));
        if (IsTooDeep(refusal)) {
            Walk(-1, childPath, depth + 1, force, seen, stored);
        } else if (refusal != nullptr) {
            continue;
        } else if (S_ISREG(st.st_mode)) {
            IndexFile(dirfd(dir), name, childPath, st, governing, force, stored, seen);
        } else if (S_ISDIR(st.st_mode)) {
            Walk(openat(dirfd(dir), name.c_str(), kDirFlags | O_NOFOLLOW | O_NONBLOCK | O_CLOEXEC), childPath, depth + 1, force,
                 seen, stored);
        }
    }
    closedir(dir);
}

extractor::Reply ShareIndexer::Extract(int dirFd, const std::string& name, const std::string& sharePath) {
    const tools::Fd fd(openat(dirFd, name.c_str(), O_RDONLY | O_NOFOLLOW | O_NONBLOCK | O_CLOEXEC));
    struct stat st;
    extractor::Reply reply;
    reply.fields = Json::Value(Json::objectValue);
    if (!fd.Valid() || fstat(fd.Get(), &st) != 0 || !S_ISREG(st.st_mode)) {
        reply.problem = "not a regular file reached without a link";
    } else {
        reply = extractor_.Extract(fd.Get(), name, kTextCap);
    }
    if (!reply.problem.empty()) {
        Say(share_, tools::EscapeForTerminal(sharePath) + ": indexed by name only: " + tools::EscapeForTerminal(reply.problem));
    }
    return reply;
}

// A file is indexed as the kind its content tells (its name's when the content tells none), with
// its text and fields. Unchanged files
// in the index are not read again, so that a file that failed is not retried until it changes.
void ShareIndexer::IndexFile(int dirFd, const std::string& name, const std::string& fullPath, const struct stat& st,
                             const Json::Value& governing, bool force, const Stored& stored, std::set<std::string>& seen) {
    const std::string sharePath = SharePathOf(fullPath);
    const auto found = stored.find(sharePath);
    if (!force && found != stored.end() && found->second.size == st.st_size && found->second.mtime == st.st_mtime) {
        if (governing.get(found->second.type, false).asBool()) seen.insert(sharePath);  // else unseen: removed
        return;
    }
    extractor::Reply reply = Extract(dirFd, name, sharePath);
    const std::string type = reply.type.empty() ? tools::FileTypeOf(name) : reply.type;
    if (type.empty() || !governing.get(type, false).asBool()) return;  // unseen: removed when stored
    seen.insert(sharePath);
    index_->Put({sharePath, type, st.st_size, st.st_mtime, std::move(reply.text), std::move(reply.problem), reply.fields});
}

}  // namespace fileindexd_ref
