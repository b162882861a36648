// How far indexing has got, for progress displays and scripts that wait for indexing.
#pragma once

#include <json/value.h>

#include "fileindex/export.h"

namespace QIRA {
namespace FILEINDEX {

// Fills `out` with {"pause": {"paused", "resume_time"}, "shares": [...]}: one entry per share
// holding indexed folders, in name order, with "share", "queue" and "companion" (the lines
// pending in its queue file and in the ".tmp" companion, counted without parsing; a malformed
// line is work for the daemon too), "unread" (which of "queue" and "companion" were not read
// because they are sparse or larger than 1 GiB: their share is marked need-reindex and they count
// 0 here), "pending" (their sum), "files" (the files their well-formed records change, counted
// with FileChanges in each file) and "folders" (per indexed folder of the share: "path",
// "pending", the well-formed records whose path, or old path for event 256, is the folder or
// beneath it, as the folder status counts them, and "files", the files of those). Takes no lock.
// The queues are read incrementally, as for GetFolderStatus, and a malformed line is logged once
// per process.
// False, with the error code of the load, when folder.conf or status.conf cannot be read.
FILEINDEX_EXPORT bool GetProgress(Json::Value& out);

}  // namespace FILEINDEX
}  // namespace QIRA
