// Opening files in a share's "@eaDir" without following links planted by users of the share.
#pragma once

#include <sys/types.h>

#include <string>

namespace QIRA {
namespace FILEINDEX {
namespace detail {

// Opens `path` (".../<dir>/<leaf>") with the last two components reached without following
// symbolic links and without blocking (a FIFO never stalls the caller); the leaf must be a
// regular file with no other hard link. -1 with errno otherwise.
int OpenNoFollow(const std::string& path, int flags, mode_t mode = 0);

// mkdir of `path`'s last component inside its parent, the parent reached without following a
// symbolic link. 0 on success, -1 with errno otherwise.
int MkdirNoFollow(const std::string& path, mode_t mode);

// Removes `path`'s last component, and everything below it when it is a directory, through a
// handle on its parent reached without following a link: a parent swapped for a link, or a link
// inside, never leads the removal elsewhere. Failures are ignored.
void RemoveInEaDir(const std::string& path);

}  // namespace detail
}  // namespace FILEINDEX
}  // namespace QIRA
