// "Is indexing done, and how much is in the index?" in one sentence: the first thing the console
// shows and `fileindexctl service status` prints.
#pragma once

#include <string>
#include <vector>

#include <json/value.h>

#include "fileindex/folder.h"

namespace tools {

struct BannerFacts {
    std::string word;                  // the service word
    long long resumeTime = -1;         // as GetPauseInfo gives it
    bool daemonAnswers = true;
    size_t folders = 0;                // indexed folders
    unsigned long long pending = 0;    // files waiting in every share's queue and companion
    std::string notDone;               // NotDoneReason's answer
    Json::Value filesIndexed;          // FilesIndexed's answer
    double rate = 0;                   // files drained per second lately; 0 when unknown
};

// The facts of the state read from the library: the service word, the pause (GetPauseInfo), the
// daemon's state (DaemonState), the indexed folders, a progress report (GetProgress) and what
// the daemon published (ReadDaemonProgress); the rate is left for the caller to measure.
BannerFacts GatherBannerFacts(const std::string& word, long long resumeTime, const Json::Value& daemon,
                              const std::vector<QIRA::FILEINDEX::Folder>& folders, const Json::Value& progress,
                              const Json::Value& daemonProgress);

// {"state": "no_folders" | "daemon_down" | "paused" | "working" | "up_to_date", "text",
//  "files_indexed", "pending", "resume_time" (null unless paused until a time), "rate" and
//  "seconds_left" (null when unknown)}. The daemon not answering comes first, as nothing gets
// done then; a pause next; work left, or what else keeps indexing from being done, before "up
// to date".
Json::Value Banner(const BannerFacts& facts);

// The files in the indexes of `shares`, read as a search reads them (beneath the share, under a
// deadline, only where the caller may read the share's directory); a share without an index yet
// counts none. Null when an index could not be read.
Json::Value FilesIndexed(const std::vector<std::string>& shares);

// The files pending over every share of a progress report (GetProgress), less what the daemon
// reports applied of the batches it has taken (ReadDaemonProgress).
unsigned long long PendingOf(const Json::Value& progress, const Json::Value& daemonProgress);

// "1 h 12 min", "5 min", "40 s".
std::string DurationText(long long seconds);

}  // namespace tools
