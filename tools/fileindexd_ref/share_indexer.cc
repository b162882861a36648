#include "share_indexer.h"

#include <dirent.h>
#include <fcntl.h>
#include <unistd.h>

#include <cstring>
#include <iostream>

#include "file_types.h"
#include "fileindex/fileidx.h"
#include "fileindex/utils.h"

namespace fileindexd_ref {
namespace {

using QIRA::FILEINDEX::QueueRecordView;

constexpr unsigned kCreated = 1;
constexpr unsigned kWritten = 2;
constexpr unsigned kAttributes = 4;
constexpr unsigned kDeleted = 8;
constexpr unsigned kMoved = 256;
constexpr unsigned kReindex = 0x10000;
constexpr unsigned kSettingChanged = 0x20000;
// Deeper trees are indexed to this depth, each level holding one descriptor.
constexpr int kMaxDepth = 64;
const char kEaDir[] = "@eaDir";

bool IsWithin(const std::string& path, const std::string& dir) {
    return path.compare(0, dir.size(), dir) == 0 && (path.size() == dir.size() || path[dir.size()] == '/');
}

// A directory below `base` reached one component at a time, never through a link. -1 otherwise.
int OpenBelow(const std::string& base, const std::string& relative) {
    int fd = open(base.c_str(), O_RDONLY | O_DIRECTORY | O_CLOEXEC);
    size_t begin = 0;
    while (fd >= 0 && begin < relative.size()) {
        const size_t end = relative.find('/', begin);
        const std::string component = relative.substr(begin, end == std::string::npos ? std::string::npos : end - begin);
        begin = end == std::string::npos ? relative.size() : end + 1;
        if (component.empty()) continue;
        const int next = openat(fd, component.c_str(), O_RDONLY | O_DIRECTORY | O_NOFOLLOW | O_NONBLOCK | O_CLOEXEC);
        close(fd);
        fd = next;
    }
    return fd;
}

// Valid UTF-8 of `text`, with every byte of a broken sequence replaced by a space.
std::string ValidUtf8(const std::string& text) {
    std::string out;
    out.reserve(text.size());
    for (size_t i = 0; i < text.size();) {
        const auto c = static_cast<unsigned char>(text[i]);
        const size_t length = c < 0x80 ? 1 : (c >> 5) == 0x6 ? 2 : (c >> 4) == 0xE ? 3 : (c >> 3) == 0x1E ? 4 : 0;
        bool valid = length > 0 && i + length <= text.size();
        for (size_t k = 1; valid && k < length; ++k) valid = (static_cast<unsigned char>(text[i + k]) >> 6) == 0x2;
        if (valid && c != 0) {
            out.append(text, i, length);
            i += length;
        } else {
            out += ' ';
            ++i;
        }
    }
    return out;
}

// The first kTextCap bytes of a regular file in `dirFd`, opened without following a link or blocking.
std::string ReadText(int dirFd, const std::string& name) {
    const int fd = openat(dirFd, name.c_str(), O_RDONLY | O_NOFOLLOW | O_NONBLOCK | O_CLOEXEC);
    if (fd < 0) return "";
    struct stat st;
    std::string text;
    if (fstat(fd, &st) == 0 && S_ISREG(st.st_mode)) {
        text.resize(kTextCap);
        const ssize_t got = read(fd, &text[0], text.size());
        text.resize(got > 0 ? static_cast<size_t>(got) : 0);
    }
    close(fd);
    return ValidUtf8(text);
}

}  // namespace

bool ShareIndexer::Open() {
    if (index_) return true;
    std::string shareDir;
    char dbDir[4096];
    if (!QIRA::FILEINDEX::GetFullPath(shareDir, "/" + share_) || FILEIDXDBPathGet(share_.c_str(), dbDir, sizeof dbDir) < 0) {
        return false;
    }
    volume_ = shareDir.substr(0, shareDir.size() - share_.size() - 1);
    std::string error;
    index_ = tools::SearchIndex::Open(dbDir, true, error);
    if (!index_) std::cout << "fileindexd-ref: cannot open the index of share " << share_ << ": " << error << std::endl;
    return index_ != nullptr;
}

void ShareIndexer::ForgetIfRemoved() {
    if (index_ && !index_->StillOnDisk()) {
        index_.reset();
        std::cout << "fileindexd-ref: the index of share " << share_ << " was removed; closed" << std::endl;
    }
}

long long ShareIndexer::Count() { return index_ ? index_->Count() : -1; }

bool ShareIndexer::Apply(const std::vector<QueueRecordView>& records, const std::vector<QIRA::FILEINDEX::Folder>& folders) {
    if (!Open() || !index_->Begin()) return false;
    folders_ = &folders;
    for (const auto& record : records) ApplyOne(record);
    folders_ = nullptr;
    return index_->Commit();
}

bool ShareIndexer::Reindex(const std::vector<QIRA::FILEINDEX::Folder>& folders) {
    if (!Open() || !index_->Begin()) return false;
    folders_ = &folders;
    for (const auto& folder : folders) {
        std::string share;
        if (QIRA::FILEINDEX::GetShareNameByPath(share, folder.path) && share == share_) Sync(folder.GetFullPath(), true);
    }
    folders_ = nullptr;
    return index_->Commit();
}

bool ShareIndexer::InShare(const std::string& fullPath) const {
    const std::string shareDir = volume_ + "/" + share_;
    if (!IsWithin(fullPath, shareDir)) return false;
    const std::string inside = fullPath.substr(shareDir.size()) + "/";
    return inside.find(std::string("/") + kEaDir + "/") == std::string::npos;
}

void ShareIndexer::ApplyOne(const QueueRecordView& record) {
    if (!InShare(record.path)) return;
    switch (record.event) {
        case kDeleted:
            index_->Remove(SharePathOf(record.path));
            break;
        case kMoved:
            if (InShare(record.path_old)) index_->Rename(SharePathOf(record.path_old), SharePathOf(record.path));
            Sync(record.path, false);
            break;
        case kAttributes:
        case kSettingChanged:
            Sync(record.path, false);
            break;
        case kCreated:
        case kWritten:
        case kReindex:
        default:
            Sync(record.path, true);
            break;
    }
}

void ShareIndexer::Sync(const std::string& fullPath, bool force) {
    const std::string sharePath = SharePathOf(fullPath);
    const auto stored = index_->Under(sharePath);
    std::set<std::string> seen;
    const std::string shareDir = volume_ + "/" + share_;
    const size_t slash = fullPath.rfind('/');
    const std::string parent = fullPath.substr(0, slash);
    const std::string name = fullPath.substr(slash + 1);
    const int parentFd = IsWithin(parent, shareDir) ? OpenBelow(shareDir, parent.substr(shareDir.size())) : -1;
    struct stat st;
    if (parentFd >= 0 && fstatat(parentFd, name.c_str(), &st, AT_SYMLINK_NOFOLLOW) == 0) {
        if (S_ISDIR(st.st_mode)) {
            WalkDirectory(fullPath, force, seen, stored);
        } else if (S_ISREG(st.st_mode)) {
            IndexFile(parentFd, name, fullPath, st, QIRA::FILEINDEX::GetMostSuitableCfg(*folders_, fullPath), force, stored, seen);
        }
    }
    if (parentFd >= 0) close(parentFd);
    for (const auto& entry : stored) {
        if (seen.count(entry.first) == 0) index_->Remove(entry.first);
    }
}

void ShareIndexer::WalkDirectory(const std::string& fullPath, bool force, std::set<std::string>& seen,
                                 const std::map<std::string, std::pair<long long, long long>>& stored) {
    const std::string shareDir = volume_ + "/" + share_;
    Walk(OpenBelow(shareDir, fullPath.substr(shareDir.size())), fullPath, 0, force, seen, stored);
}

// Takes ownership of `fd`; holds one descriptor per level of the tree.
void ShareIndexer::Walk(int fd, const std::string& path, int depth, bool force, std::set<std::string>& seen,
                        const std::map<std::string, std::pair<long long, long long>>& stored) {
    DIR* dir = fd >= 0 ? fdopendir(fd) : nullptr;
    if (dir == nullptr) {
        if (fd >= 0) close(fd);
        return;
    }
    const Json::Value governing = QIRA::FILEINDEX::GetMostSuitableCfg(*folders_, path);
    while (const dirent* entry = readdir(dir)) {
        const std::string name = entry->d_name;
        if (name == "." || name == ".." || name == kEaDir || QIRA::FILEINDEX::IsSystemPreservedFileName(name)) continue;
        const std::string childPath = path + "/" + name;
        struct stat st;
        if (fstatat(dirfd(dir), name.c_str(), &st, AT_SYMLINK_NOFOLLOW) != 0) continue;
        if (S_ISREG(st.st_mode)) {
            IndexFile(dirfd(dir), name, childPath, st, governing, force, stored, seen);
        } else if (S_ISDIR(st.st_mode) && depth < kMaxDepth && !QIRA::FILEINDEX::IsSkipIndex(childPath)) {
            Walk(openat(dirfd(dir), name.c_str(), O_RDONLY | O_DIRECTORY | O_NOFOLLOW | O_NONBLOCK | O_CLOEXEC), childPath,
                 depth + 1, force, seen, stored);
        }
    }
    closedir(dir);
}

void ShareIndexer::IndexFile(int dirFd, const std::string& name, const std::string& fullPath, const struct stat& st,
                             const Json::Value& governing, bool force,
                             const std::map<std::string, std::pair<long long, long long>>& stored,
                             std::set<std::string>& seen) {
    const std::string type = tools::FileTypeOf(name);
    if (type.empty() || !governing.get(type, false).asBool()) return;  // unseen: removed when stored
    const std::string sharePath = SharePathOf(fullPath);
    seen.insert(sharePath);
    const auto found = stored.find(sharePath);
    const std::pair<long long, long long> stamp(st.st_size, st.st_mtime);
    if (!force && found != stored.end() && found->second == stamp) return;
    index_->Put({sharePath, type, st.st_size, st.st_mtime, tools::HasPlainText(name) ? ReadText(dirFd, name) : ""});
}

}  // namespace fileindexd_ref
