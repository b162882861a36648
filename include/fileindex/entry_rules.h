// What the indexing daemon may take from beneath a share: one rule set for live events and for
// walks, so that a change applied as it happens and a reindex always give the same index.
#pragma once

#include <string>

#include "fileindex/export.h"

namespace QIRA {
namespace FILEINDEX {

// Entries lie at most this many components below their share directory; the notification daemon
// watches no deeper.
FILEINDEX_EXPORT int MaxEntryDepth();

// True when `fullPath` is `shareDir` itself or lies beneath it in canonical form: no empty, "."
// or ".." component, no NUL, each component within NAME_MAX and the whole within PATH_MAX. Paths
// read from a queue are taken only in this form. Logs nothing.
FILEINDEX_EXPORT bool IsCanonicalBeneath(const std::string& shareDir, const std::string& fullPath);

// The rule that keeps the entry `name` out of the index, the entry lying `depth` components below
// its share directory at `fullPath`; nullptr when it may be indexed. In this order:
//   "too_deep"     depth beyond MaxEntryDepth(), or a full path of PATH_MAX bytes or more
//   "system_name"  "@eaDir", a hidden metadata directory or a system-preserved name
//   "skipped_dir"  a directory IsSkipIndex refuses: recycle bin, snapshot, remote or image file
//                  system (asked of directories only, as a walk asks when it descends)
FILEINDEX_EXPORT const char* ChildRefusal(const std::string& fullPath, const std::string& name, int depth,
                                          bool isDirectory);

// ChildRefusal of every component of `fullPath` below `shareDir`, the last one with
// `isDirectory`: the verdict a walk from the share directory would reach. "not_beneath" when the
// path fails IsCanonicalBeneath.
FILEINDEX_EXPORT const char* EntryRefusal(const std::string& shareDir, const std::string& fullPath, bool isDirectory);

// The rule's words for people, e.g. "too deep: more than 64 levels below the share".
FILEINDEX_EXPORT std::string EntryRefusalWords(const char* rule);

}  // namespace FILEINDEX
}  // namespace QIRA
