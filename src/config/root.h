// Fixed paths resolve under the root prefix of RootPrefix (fileindex/root.h).
#pragma once

#include <string>

namespace QIRA {
namespace FILEINDEX {
namespace detail {

std::string RootPath(const std::string& fixedPath);

}  // namespace detail
}  // namespace FILEINDEX
}  // namespace QIRA
