// Fixed paths resolve under the root prefix in QIRA_ROOT (unset, empty or "/" = the real root).
#pragma once

#include <string>

namespace QIRA {
namespace FILEINDEX {
namespace detail {

std::string RootPath(const std::string& fixedPath);

}  // namespace detail
}  // namespace FILEINDEX
}  // namespace QIRA
