// The service's state as the tools and the console show it: whether the indexing daemon answers,
// what the notification daemon is told to watch, and whether indexing can be called done.
#pragma once

#include <string>
#include <vector>

#include <json/value.h>

#include "fileindex/folder.h"

namespace tools {

// {"socket", "answers", "reason" (why not, e.g. "Connection refused"; null when it answers)}.
Json::Value DaemonState();

// Per share holding indexed folders, what the library registers with the notification daemon:
// [{"share", "queue", "folders": [full paths]}]; a share whose registration cannot be built
// carries "error" instead of "queue" and "folders"; one with something not a queue file at its
// queue paths carries "queue_problems" (QueueFileProblems).
Json::Value WatchedShares(const std::vector<QIRA::FILEINDEX::Folder>& folders);

// Words for QueueFileProblems' answer, e.g. "its queue's companion is a directory, not a queue
// file (the indexing daemon sets it aside)"; "" when there is none.
std::string QueueProblemText(const Json::Value& problems);

// The shares holding `folders`, in name order.
std::vector<std::string> SharesOf(const std::vector<QIRA::FILEINDEX::Folder>& folders);

// Why indexing is not done although nothing may be left to do, or "" when nothing stands in the
// way: the service word is "finished", no share waits for a full reindex or has something not a
// queue file at its queue paths, and, while folders are indexed, the daemon answers. `stuck` is set when it cannot get done by waiting: work is left
// and no daemon answers to do it.
std::string NotDoneReason(const std::string& word, const std::vector<QIRA::FILEINDEX::Folder>& folders,
                          const Json::Value& daemon, bool& stuck);

}  // namespace tools
