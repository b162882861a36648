#include "tree_watcher.h"

#include <dirent.h>
#include <fcntl.h>
#include <poll.h>
#include <sys/inotify.h>
#include <sys/stat.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <cstring>
#include <fstream>
#include <iostream>

#include <json/value.h>
#include <json/writer.h>

#include "qiranotifyd/monitor_queue.h"
#include "queue_writer.h"

namespace qiranotifyd_sim {
namespace {

// Events that keep the watched tree whole, watched whatever a root reports.
constexpr uint32_t kTreeEvents = IN_CREATE | IN_MOVED_FROM | IN_MOVED_TO | IN_DELETE_SELF | IN_MOVE_SELF;
// How long an unpaired "moved from" waits for its "moved to" in the next read.
constexpr int kMovePairWaitMs = 2;

bool Ignored(const Root& root, const std::string& name) {
    return std::find(root.ignore.begin(), root.ignore.end(), name) != root.ignore.end();
}

bool IsWithin(const std::string& path, const std::string& dir) {
    return path.compare(0, dir.size(), dir) == 0 && (path.size() == dir.size() || path[dir.size()] == '/');
}

// Components of `dir` below the share directory holding the root's queue
// ("<share>/@eaDir/<queue>").
int DepthBelowShare(const Root& root, const std::string& dir) {
    const std::string eaDir = root.queue.substr(0, root.queue.rfind('/'));
    const std::string share = eaDir.substr(0, eaDir.rfind('/'));
    if (!IsWithin(dir, share)) return 0;
    return static_cast<int>(std::count(dir.begin() + static_cast<long>(share.size()), dir.end(), '/'));
}

std::string Limit(const char* name) {
    std::ifstream in(std::string("/proc/sys/fs/inotify/") + name);
    std::string value;
    return in >> value ? value : "unknown";
}

std::string Line(unsigned event, const std::string& path, bool dir, const std::string& pathOld) {
    Json::Value record(Json::objectValue);
    record["event"] = event;
    record["path"] = path;
    if (!pathOld.empty()) record["path_old"] = pathOld;
    record["data"]["dir"] = dir;
    Json::StreamWriterBuilder writer;
    writer["indentation"] = "";
    writer["emitUTF8"] = true;
    return Json::writeString(writer, record) + "\n";
}

}  // namespace

TreeWatcher::TreeWatcher(LostHandler lost) : fd_(inotify_init1(IN_NONBLOCK | IN_CLOEXEC)), lost_(std::move(lost)) {}

TreeWatcher::~TreeWatcher() {
    if (fd_ >= 0) close(fd_);
}

// Each directory is watched before it is listed: what is created in it afterwards is reported,
// what was there before is found by the listing.
void TreeWatcher::WatchTree(const Root& root, const std::string& dir, std::map<int, Watch>& into,
                            std::set<std::string>& exhausted) {
    std::vector<std::string> pending = {dir};
    while (!pending.empty()) {
        const std::string path = pending.back();
        pending.pop_back();
        if (!AddWatch(path, root, into, exhausted)) continue;
        DIR* listing = opendir(path.c_str());
        if (listing == nullptr) continue;
        while (const dirent* entry = readdir(listing)) {
            const std::string name = entry->d_name;
            if (name == "." || name == ".." || Ignored(root, name)) continue;
            struct stat st;
            if (fstatat(dirfd(listing), entry->d_name, &st, AT_SYMLINK_NOFOLLOW) == 0 && S_ISDIR(st.st_mode)) {
                pending.push_back(path + "/" + name);
            }
        }
        closedir(listing);
    }
}

bool TreeWatcher::AddWatch(const std::string& dir, const Root& root, std::map<int, Watch>& into,
                           std::set<std::string>& exhausted) {
    // What lies deeper is never indexed: its directories are not watched.
    if (DepthBelowShare(root, dir) >= QIRA::QIRANOTIFYD::kMaxTreeDepth) {
        if (tooDeep_.insert(root.path).second) {
            std::cout << "qiranotifyd-sim: not watching " << dir << " or anything deeper than "
                      << QIRA::QIRANOTIFYD::kMaxTreeDepth << " levels below its share" << std::endl;
        }
        return false;
    }
    const uint32_t mask = (root.mask & IN_ALL_EVENTS) | kTreeEvents | IN_ONLYDIR | IN_DONT_FOLLOW | IN_EXCL_UNLINK;
    const int wd = inotify_add_watch(fd_, dir.c_str(), mask);
    if (wd >= 0) {
        into[wd] = {dir, root};
        return true;
    }
    if (errno == ENOSPC && exhausted.insert(root.path).second) {
        lost_(root, "out of inotify watches at " + dir + "; raise fs.inotify.max_user_watches (now " +
                        Limit("max_user_watches") + ")");
    } else if (errno != ENOSPC && unwatchable_.insert(root.path).second) {
        std::cout << "qiranotifyd-sim: cannot watch " << dir << ": " << std::strerror(errno) << std::endl;
    }
    return false;
}

void TreeWatcher::Reconcile(const std::vector<Root>& roots) {
    std::vector<Root> ordered = roots;  // inner roots last, so that they govern their own trees
    std::stable_sort(ordered.begin(), ordered.end(), [](const Root& a, const Root& b) { return a.path.size() < b.path.size(); });
    std::map<int, Watch> next;
    std::set<std::string> exhausted;
    for (const auto& root : ordered) {
        struct stat st;
        if (lstat(root.path.c_str(), &st) != 0 || !S_ISDIR(st.st_mode)) {
            std::cout << "qiranotifyd-sim: cannot watch " << root.path << ": not a directory" << std::endl;
            continue;
        }
        WatchTree(root, root.path, next, exhausted);
    }
    for (const auto& [wd, watch] : watches_) {
        if (next.count(wd) == 0) inotify_rm_watch(fd_, wd);
    }
    watches_ = next;
    const auto named = [](const std::vector<Root>& list, const Root& root) {
        return std::any_of(list.begin(), list.end(), [&](const Root& r) { return r.path == root.path && r.queue == root.queue; });
    };
    for (const auto& root : roots_) {
        if (!named(roots, root)) std::cout << "qiranotifyd-sim: no longer watching " << root.path << std::endl;
    }
    for (const auto& root : roots) {
        if (named(roots_, root)) continue;
        const auto inside = std::count_if(watches_.begin(), watches_.end(), [&](const auto& w) { return IsWithin(w.second.path, root.path); });
        std::cout << "qiranotifyd-sim: watching " << root.path << " (" << inside << " directories) for " << root.queue << std::endl;
        // What was created before the watch was in place is found by the walk this record asks for.
        Emit(root, kCreated, IN_CREATE, root.path, true);
    }
    roots_ = roots;
    Flush();
}

void TreeWatcher::AddTree(const Root& root, const std::string& dir) {
    std::set<std::string> exhausted;
    WatchTree(root, dir, watches_, exhausted);
}

void TreeWatcher::RemoveUnder(const std::string& path) {
    for (auto it = watches_.begin(); it != watches_.end();) {
        if (IsWithin(it->second.path, path)) {
            inotify_rm_watch(fd_, it->first);
            it = watches_.erase(it);
        } else {
            ++it;
        }
    }
}

void TreeWatcher::Repath(const std::string& from, const std::string& to, const Root& root) {
    for (auto& [wd, watch] : watches_) {
        if (!IsWithin(watch.path, from)) continue;
        watch.path = to + watch.path.substr(from.size());
        watch.root = root;
    }
}

void TreeWatcher::Overflow(const std::string& cause) {
    std::cout << "qiranotifyd-sim: " << cause << "; changes were lost, every registered folder is reindexed" << std::endl;
    for (const auto& root : roots_) lost_(root, cause);
    Reconcile(roots_);
}

void TreeWatcher::DropPending() {
    char buffer[65536];
    while (read(fd_, buffer, sizeof buffer) > 0) {
    }
    Overflow("the kernel's inotify event queue was dropped on request (as in an overflow: raise "
             "fs.inotify.max_queued_events, now " + Limit("max_queued_events") + ")");
}

bool TreeWatcher::ReadInto(std::vector<Event>& events) {
    alignas(inotify_event) char buffer[65536];
    const ssize_t got = read(fd_, buffer, sizeof buffer);
    if (got <= 0) return false;
    for (ssize_t at = 0; at < got;) {
        const auto* event = reinterpret_cast<const inotify_event*>(buffer + at);
        events.push_back({event->wd, event->mask, event->cookie, event->len > 0 ? std::string(event->name) : std::string()});
        at += static_cast<ssize_t>(sizeof(inotify_event) + event->len);
    }
    return true;
}

void TreeWatcher::ReadEvents() {
    std::vector<Event> events;
    while (ReadInto(events)) {
    }
    // A "moved from" at the end may have its "moved to" still on the way.
    while (!events.empty() && (events.back().mask & IN_MOVED_FROM) != 0) {
        pollfd ready{fd_, POLLIN, 0};
        if (poll(&ready, 1, kMovePairWaitMs) <= 0 || !ReadInto(events)) break;
    }
    Handle(events);
    Flush();
}

void TreeWatcher::Handle(std::vector<Event>& events) {
    for (size_t i = 0; i < events.size(); ++i) {
        const Event& event = events[i];
        if ((event.mask & IN_Q_OVERFLOW) != 0) {
            Overflow("the kernel's inotify event queue overflowed; raise fs.inotify.max_queued_events (now " +
                     Limit("max_queued_events") + ")");
            continue;
        }
        const auto found = watches_.find(event.wd);
        if (found == watches_.end()) continue;
        if ((event.mask & IN_IGNORED) != 0) {
            watches_.erase(found);
            continue;
        }
        const Watch watch = found->second;
        const bool dir = (event.mask & IN_ISDIR) != 0;
        if (event.name.empty()) {  // the watched directory itself went away
            if ((event.mask & (IN_DELETE_SELF | IN_MOVE_SELF | IN_UNMOUNT)) != 0 && watch.path == watch.root.path) {
                Emit(watch.root, kDeleted, IN_DELETE_SELF, watch.path, true);
                RemoveUnder(watch.path);
            }
            continue;
        }
        if (Ignored(watch.root, event.name)) continue;
        const std::string path = watch.path + "/" + event.name;
        if ((event.mask & IN_MOVED_FROM) != 0) {
            const auto pair = std::find_if(events.begin() + static_cast<long>(i) + 1, events.end(), [&](const Event& e) {
                return (e.mask & IN_MOVED_TO) != 0 && e.cookie == event.cookie;
            });
            const auto to = pair != events.end() ? watches_.find(pair->wd) : watches_.end();
            if (to != watches_.end()) {
                HandleMove(watch, event, to->second, *pair);
                pair->mask = 0;  // consumed
            } else {
                MovedOut(watch.root, path, dir);
            }
        } else if ((event.mask & IN_MOVED_TO) != 0) {
            MovedIn(watch.root, path, dir);
        } else if ((event.mask & IN_CREATE) != 0) {
            if (dir) AddTree(watch.root, path);
            Emit(watch.root, kCreated, IN_CREATE, path, dir);
        } else if ((event.mask & IN_CLOSE_WRITE) != 0) {
            Emit(watch.root, kWritten, IN_CLOSE_WRITE, path, dir);
        } else if ((event.mask & IN_ATTRIB) != 0) {
            Emit(watch.root, kAttributes, IN_ATTRIB, path, dir);
        } else if ((event.mask & IN_DELETE) != 0) {
            Emit(watch.root, kDeleted, IN_DELETE, path, dir);
        }
    }
}

void TreeWatcher::HandleMove(const Watch& from, const Event& fromEvent, const Watch& to, const Event& toEvent) {
    const bool dir = (fromEvent.mask & IN_ISDIR) != 0;
    const std::string oldPath = from.path + "/" + fromEvent.name;
    const std::string newPath = to.path + "/" + toEvent.name;
    if (Ignored(to.root, toEvent.name)) return MovedOut(from.root, oldPath, dir);
    if (from.root.queue == to.root.queue) {
        Emit(to.root, kMoved, IN_MOVED_TO, newPath, dir, oldPath);
    } else {
        Emit(from.root, kDeleted, IN_MOVED_FROM, oldPath, dir);
        Emit(to.root, kCreated, IN_MOVED_TO, newPath, dir);
    }
    if (dir) Repath(oldPath, newPath, to.root);
}

void TreeWatcher::MovedOut(const Root& root, const std::string& path, bool dir) {
    Emit(root, kDeleted, IN_MOVED_FROM, path, dir);
    if (dir) RemoveUnder(path);
}

void TreeWatcher::MovedIn(const Root& root, const std::string& path, bool dir) {
    if (dir) AddTree(root, path);
    Emit(root, kCreated, IN_MOVED_TO, path, dir);
}

void TreeWatcher::Emit(const Root& root, unsigned event, uint32_t bit, const std::string& path, bool dir,
                       const std::string& pathOld) {
    if ((root.mask & bit) == 0) return;  // an event the registration does not ask for
    pending_[root.queue].push_back(Line(event, path, dir, pathOld));
    auto& concerned = pendingRoots_[root.queue];
    if (std::none_of(concerned.begin(), concerned.end(), [&](const Root& r) { return r.path == root.path; })) {
        concerned.push_back(root);
    }
}

void TreeWatcher::Flush() {
    for (const auto& [queue, lines] : pending_) {
        if (AppendLines(queue, lines)) continue;
        for (const auto& root : pendingRoots_[queue]) lost_(root, "its queue " + queue + " could not be written");
    }
    pending_.clear();
    pendingRoots_.clear();
}

}  // namespace qiranotifyd_sim
