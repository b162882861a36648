// Watching registered directory trees with the kernel's inotify API and turning each change into
// one record of the registration's event queue.
//
// The records: {"event": N, "path": <full path>, "data": {"dir": <bool>}}, and for a move
// "path_old" as well. The numbers are this stand-in's own, except 256 (a move inside the watched
// tree of one queue, with "path_old"), which the status readers know:
//   1    created (a file or directory; also one moved in from outside the watched tree)
//   2    written (the file was closed after writing: one record per write, not per block)
//   4    attributes changed
//   8    deleted (also moved out of the watched tree, or into an ignored name)
//   256  moved inside the watched tree, from "path_old" to "path"
// A directory created later is watched as it appears. Names on a root's ignore list (such as
// "@eaDir") are neither watched nor reported, at any depth; nor are directories deeper than
// kMaxTreeDepth below the share directory, which is logged once per root.
#pragma once

#include <sys/types.h>

#include <functional>
#include <map>
#include <set>
#include <string>
#include <vector>

#include "registrations.h"

namespace qiranotifyd_sim {

constexpr unsigned kCreated = 1;
constexpr unsigned kWritten = 2;
constexpr unsigned kAttributes = 4;
constexpr unsigned kDeleted = 8;
constexpr unsigned kMoved = 256;

class TreeWatcher {
public:
    // `lost` is told of a root whose changes may have gone unrecorded, with the cause.
    using LostHandler = std::function<void(const Root& root, const std::string& cause)>;

    explicit TreeWatcher(LostHandler lost);
    ~TreeWatcher();
    TreeWatcher(const TreeWatcher&) = delete;
    TreeWatcher& operator=(const TreeWatcher&) = delete;

    int Fd() const { return fd_; }
    size_t Directories() const { return watches_.size(); }

    // Watches every directory of `roots` and stops watching what they no longer hold.
    void Reconcile(const std::vector<Root>& roots);
    // Reads the kernel's pending events and appends their records to the queues.
    void ReadEvents();
    // Throws the kernel's pending events away and handles it as an overflow: for tests of the
    // recovery.
    void DropPending();

private:
    struct Watch {
        std::string path;
        Root root;
    };
    struct Event {
        int wd;
        uint32_t mask;
        uint32_t cookie;
        std::string name;
    };

    void WatchTree(const Root& root, const std::string& dir, std::map<int, Watch>& into, std::set<std::string>& exhausted);
    void AddTree(const Root& root, const std::string& dir);
    bool AddWatch(const std::string& dir, const Root& root, std::map<int, Watch>& into, std::set<std::string>& exhausted);
    void RemoveUnder(const std::string& path);
    void Repath(const std::string& from, const std::string& to, const Root& root);
    void Overflow(const std::string& cause);

    bool ReadInto(std::vector<Event>& events);
    void Handle(std::vector<Event>& events);
    void HandleMove(const Watch& from, const Event& fromEvent, const Watch& to, const Event& toEvent);
    void MovedOut(const Root& root, const std::string& path, bool dir);
    void MovedIn(const Root& root, const std::string& path, bool dir);
    void Emit(const Root& root, unsigned event, uint32_t bit, const std::string& path, bool dir,
              const std::string& pathOld = std::string());
    void Flush();

    int fd_;
    LostHandler lost_;
    std::vector<Root> roots_;
    std::map<int, Watch> watches_;
    std::map<std::string, std::vector<std::string>> pending_;  // queue -> lines not yet appended
    std::map<std::string, std::vector<Root>> pendingRoots_;    // queue -> the roots they concern
    std::set<std::string> tooDeep_;      // roots whose depth bound was logged
    std::set<std::string> unwatchable_;  // roots with a directory that could not be watched, logged
};

}  // namespace qiranotifyd_sim
