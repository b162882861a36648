// Share paths as the tools accept them for new folders, with what is wrong with one in words
// before the library is asked (it would only answer "bad parameter").
#pragma once

#include <string>

#include "cause.h"

namespace tools {

// False, with `cause` telling what is wrong and how to write it, when `path` is not the share
// path of a known share: a missing leading "/", a trailing "/", an empty, "." or ".." component,
// a full path on the volume given instead, or a share the appliance does not know.
bool CheckSharePath(const std::string& path, Cause& cause);

}  // namespace tools
