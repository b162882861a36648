// The answer to "why is this file (not) found?": the library's explanation of a share path,
// completed with what only the tools know, the index and the file's type.
#pragma once

#include <json/value.h>

namespace tools {

// Adds to the library's explanation of a share path (ExplainPath):
//   "file": {"kind" ("file", "directory", "missing" or "other", not following a link), "type"
//     (as the index typed it by its content, else by the name's extension; null when no kind of
//     file the index keeps), "type_switched_on"
//     (the governing folder's switch for that type; null without a type or a folder),
//     "in_index" (the path or something beneath it is in the share's index; null when the index
//     could not be read), "indexed_files" (entries at or beneath the path), "index_problem"
//     (why the index could not be read, or null), "fields" (what was read of the file besides its
//     text, null when it is not in the index), "extraction_problem" (why no more than its name
//     was read, or null)};
//   "service": {"status" (the service word), "paused", "daemon_answers"};
//   "verdict": one sentence, the first thing that keeps the path out of search, or that it is in.
// The index is read as a search reads it: beneath the share, with a deadline, and only where the
// caller may read the share's directory.
void CompleteExplanation(Json::Value& explanation);

}  // namespace tools
