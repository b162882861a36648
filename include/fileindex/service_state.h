// What the indexing service's two daemons are told, and whether the indexing daemon answers: for
// hosts that show an administrator the state of the service.
#pragma once

#include <string>

#include <json/value.h>

#include "fileindex/export.h"

namespace QIRA {
namespace FILEINDEX {

// True when the indexing daemon accepts a connection on its socket (DaemonSocketPath) within the
// command channel's one-second time-out; the connection is closed again without a command. False,
// with errno telling why (ENOENT: no socket, ECONNREFUSED: nobody listens), otherwise. No lock.
FILEINDEX_EXPORT bool DaemonAnswers();

// The monitor queue that UpsertQIRANotifydCfg registers for `share` with the notification daemon,
// built from folder.conf as it is now: {"queue", "config": [{"path", "mask", "ignore"}, ...]}.
// Nothing is registered. False, with "FILEIDXQueuePathGet failed" or "GetFullPath failed" logged
// or the load's error code, when it cannot be built. No lock.
FILEINDEX_EXPORT bool DescribeMonitorQueue(const std::string& share, Json::Value& out);

// What stands at the share's queue paths in its "@eaDir" when it is not a queue file: {"queue":
// "a directory"}, {"companion": "a FIFO"}, {"@eaDir": "a symbolic link"}, ... (a regular file with
// several links counts too); an empty object when both are regular files or absent. Such a file
// holds the share's changes back until the indexing daemon sets it aside. Nothing is opened but the
// share directory and "@eaDir", without following a link. No lock.
FILEINDEX_EXPORT Json::Value QueueFileProblems(const std::string& share);

}  // namespace FILEINDEX
}  // namespace QIRA
