// How far the indexing daemon has got, as it publishes it for the tools: per share, what it has
// applied of the batch it has taken (the queue's companion), so that a long batch does not look
// frozen, and when the share and each folder were last brought up to date.
#pragma once

#include <string>

#include <json/value.h>

namespace tools {

// "/var/run/fileindexd.progress" under the root prefix.
std::string DaemonProgressPath();

// {"shares": {"<share>": {"applied": records, "applied_files": files as FileChanges counts them,
// "up_to_date": epoch seconds or null, "folders": {"<folder path>": {"applied_files",
// "up_to_date"}}}}}, every share, its "folders" and each folder an object; null when there is
// none, or it is not a regular file of at most 1 MiB reached without a link.
Json::Value ReadDaemonProgress();

// Replaces the file whole; false on failure.
bool WriteDaemonProgress(const Json::Value& progress);

// What is left of `pending` (a count of the progress report) when the daemon reports `applied`
// of it done; all of it when `applied` is no count.
unsigned long long Left(unsigned long long pending, const Json::Value& applied);

// Adds to a share of the progress report (GetProgress) what the daemon published: "applied"
// (records of its batch, 0 when none), "files_left" and "up_to_date" (epoch seconds or null), and
// to each of its folders "files_left" and "up_to_date" (the folder's own, else the share's).
void AddDaemonProgress(Json::Value& share, const Json::Value& daemonProgress);

}  // namespace tools
