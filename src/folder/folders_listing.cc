// The sorted, paged folder listing of the management interface.
#include <algorithm>
#include <functional>
#include <map>

#include "fileindex/folders.h"
#include "fileindex/fileidx.h"
#include "fileindex/utils.h"
#include "path_rules.h"
#include "queue_readings.h"
#include "qira/qlib_core.h"

namespace QIRA {
namespace FILEINDEX {
namespace {

using Comparator = std::function<bool(const Folder&, const Folder&)>;

Comparator FlagFalseFirst(bool Folder::*flag) {
    return [flag](const Folder& a, const Folder& b) { return !(a.*flag) && (b.*flag); };
}

Comparator ChooseComparator(const std::string& sortBy) {
    if (sortBy == "name") {
        return [](const Folder& a, const Folder& b) {
            return QLIBCUnicodeUTF8StrCaseCmp(a.name.c_str(), b.name.c_str()) < 0;
        };
    }
    if (sortBy == "document") return FlagFalseFirst(&Folder::document);
    if (sortBy == "audio") return FlagFalseFirst(&Folder::audio);
    if (sortBy == "video") return FlagFalseFirst(&Folder::video);
    if (sortBy == "photo") return FlagFalseFirst(&Folder::photo);
    return [](const Folder& a, const Folder& b) {
        return QLIBCUnicodeUTF8StrCaseCmp(a.path.c_str(), b.path.c_str()) < 0;
    };
}

// Reads each queue file of the page's shares once for all the page's folders, so that the status
// of each folder is then answered from that reading without reading the file again.
void ReadPageQueues(const std::vector<Folder>& page) {
    std::map<std::string, std::vector<std::string>> byShare;
    for (const auto& folder : page) {
        std::string share;
        std::string fullPath;
        if (GetShareNameByPath(share, folder.path) && detail::ShareFullPath(share, folder.path, fullPath)) {
            byShare[share].push_back(fullPath + "/");
        }
    }
    for (const auto& [share, prefixes] : byShare) {
        char queue[4096];
        if (FILEIDXQueuePathGet(share.c_str(), queue, sizeof queue) < 0) continue;
        detail::QueueAnswer answer;
        detail::ReadQueue(queue, prefixes, answer);
        detail::ReadQueue(std::string(queue) + ".tmp", prefixes, answer);
    }
}

}  // namespace

bool Folders::List(Json::Value& out, unsigned long offset, unsigned long limit, const std::string& sort_by,
                   const std::string& sort_direction, const Json::Value& additional) {
    std::vector<Folder> all;
    List(all);
    out = Json::Value(Json::objectValue);
    out["total"] = static_cast<Json::UInt64>(all.size());
    out["offset"] = static_cast<Json::UInt64>(offset);
    std::sort(all.begin(), all.end(), ChooseComparator(sort_by));

    // The page never reaches past the end: an offset beyond the list gives an empty page.
    const unsigned long available = offset < all.size() ? all.size() - offset : 0;
    const unsigned long count = std::min(limit, available);
    // DESC is deliberately the first `count` records reversed: the offset only shortens the page.
    const bool descending = sort_direction == "DESC";
    const auto first = all.begin() + static_cast<long>(descending || count == 0 ? 0 : offset);
    std::vector<Folder> onPage(first, first + static_cast<long>(count));
    if (descending) std::reverse(onPage.begin(), onPage.end());
    ReadPageQueues(onPage);
    Json::Value page(Json::arrayValue);
    for (const auto& folder : onPage) page.append(folder.asJson(additional));
    out["folder"] = page;
    return true;
}

}  // namespace FILEINDEX
}  // namespace QIRA
