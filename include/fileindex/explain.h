// Why a share path is or is not indexed, for administrators and support.
#pragma once

#include <string>

#include <json/value.h>

#include "fileindex/export.h"

namespace QIRA {
namespace FILEINDEX {

// Fills `out` with the explanation of `path` (a share path):
//   "path", "share", "full_path" (null when it cannot be resolved), "indexable", "refused_by"
//   (the first refusing rule, null when none), "problem" (what that rule found, in words, e.g.
//   "the directory does not exist"; null when none), "rules" (every rule in its order: "rule",
//   "description", "verdict" = "pass" | "refuse" | "not_evaluated", "facts"; the last, "entry",
//   holds the rules the indexing daemon applies to every entry beneath a share, entry_rules.h,
//   its facts naming the "refusal" and the "max_depth"), "governing_folder"
//   (the folder whose settings govern the path: "path", "name" and the four flags, or null),
//   "inside_indexed_folder", "contains_indexed_folder", "share_flags" ("no_space",
//   "need_reindex"), "status" (the folder status word) and "pending" (records for the path or
//   beneath it in the share's queue: "queue", "companion", "unread": which of the two were
//   not read because they are sparse or larger than 1 GiB, counting 0, and "wrong_kind": what
//   stands at the queue paths that is not a queue file, as QueueFileProblems tells).
// The indexability verdict comes from the rules CanFullPathBeIndexed runs, with their platform
// calls and log lines, and from the entry rules: a path the daemon would never index is not
// called indexable. Takes no lock. False, with the error code of the load, when folder.conf
// cannot be read; error 1 for a path holding a NUL byte.
FILEINDEX_EXPORT bool ExplainPath(const std::string& path, Json::Value& out);

}  // namespace FILEINDEX
}  // namespace QIRA
