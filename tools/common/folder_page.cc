#include "folder_page.h"

#include <algorithm>

#include "fileindex/index_mgr.h"
#include "folder_view.h"

namespace tools {
namespace {

using QIRA::FILEINDEX::IndexMgr;

// The library pages DESC as its first records reversed, so descending pages are cut from the
// ascending order here.
bool DescendingPage(Json::Value& out, unsigned long offset, unsigned long limit, const std::string& sortBy,
                    const Json::Value& additional) {
    Json::Value counted;
    if (!IndexMgr::List(counted, 0, 0, sortBy, "ASC", additional)) return false;
    const unsigned long total = counted["total"].asUInt64();
    const unsigned long end = offset < total ? total - offset : 0;
    const unsigned long count = std::min(limit, end);
    if (!IndexMgr::List(out, end - count, count, sortBy, "ASC", additional)) return false;
    Json::Value reversed(Json::arrayValue);
    for (auto i = out["folder"].size(); i-- > 0;) reversed.append(out["folder"][i]);
    out["folder"] = reversed;
    out["offset"] = static_cast<Json::UInt64>(offset);
    return true;
}

}  // namespace

bool ListFolderPage(Json::Value& out, unsigned long offset, unsigned long limit, const std::string& sortBy, bool descending,
                    const Json::Value& additional) {
    const bool listed = descending ? DescendingPage(out, offset, limit, sortBy, additional)
                                   : IndexMgr::List(out, offset, limit, sortBy, "ASC", additional);
    if (listed) AddRefusingRules(out);
    return listed;
}

}  // namespace tools
