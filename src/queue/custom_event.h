// Appending custom events within an operation that queues several of them.
#pragma once

#include <string>

#include <json/value.h>

#include "pending_reindex.h"

namespace QIRA {
namespace FILEINDEX {
namespace detail {

// AddCustomEvent with the pending-reindex check answered by `pending`, which the operation keeps
// across its events so that each queue is read once.
bool AddCustomEvent(const int& event, const std::string& path, const Json::Value& data, PendingReindex& pending);

}  // namespace detail
}  // namespace FILEINDEX
}  // namespace QIRA
