#include "fileindex/entry_rules.h"

#include <algorithm>
#include <cstring>

#include "fileindex/utils.h"
#include "path_rules.h"
#include "qiranotifyd/monitor_queue.h"

namespace QIRA {
namespace FILEINDEX {
namespace {

constexpr char kTooDeep[] = "too_deep";
constexpr char kSystemName[] = "system_name";
constexpr char kSkippedDir[] = "skipped_dir";
constexpr char kNotBeneath[] = "not_beneath";

}  // namespace

int MaxEntryDepth() { return QIRANOTIFYD::kMaxTreeDepth; }

bool IsCanonicalBeneath(const std::string& shareDir, const std::string& fullPath) {
    if (shareDir.empty() || !detail::IsWithin(fullPath, shareDir)) return false;
    if (fullPath.size() == shareDir.size()) return true;
    // The rest with a stand-in share name is a share path of the same components.
    return detail::IsCanonicalSharePath("/s" + fullPath.substr(shareDir.size())) && detail::FitsPathMax(fullPath.size());
}

const char* ChildRefusal(const std::string& fullPath, const std::string& name, int depth, bool isDirectory) {
    if (depth > MaxEntryDepth() || !detail::FitsPathMax(fullPath.size())) return kTooDeep;
    if (name == "@eaDir" || IsSystemPreservedFileName(name)) return kSystemName;
    if (isDirectory && IsSkipIndex(fullPath)) return kSkippedDir;
    return nullptr;
}

const char* EntryRefusal(const std::string& shareDir, const std::string& fullPath, bool isDirectory) {
    if (!IsCanonicalBeneath(shareDir, fullPath)) return kNotBeneath;
    int depth = 0;
    size_t begin = shareDir.size() + 1;
    while (begin <= fullPath.size()) {
        const size_t end = std::min(fullPath.find('/', begin), fullPath.size());
        const bool last = end == fullPath.size();
        const char* refusal =
            ChildRefusal(fullPath.substr(0, end), fullPath.substr(begin, end - begin), ++depth, !last || isDirectory);
        if (refusal != nullptr) return refusal;
        begin = end + 1;
    }
    return nullptr;
}

std::string EntryRefusalWords(const char* rule) {
    if (rule == nullptr) return "";
    if (std::strcmp(rule, kTooDeep) == 0) {
        return "too deep: more than " + std::to_string(MaxEntryDepth()) + " levels below the share, or a path too long";
    }
    if (std::strcmp(rule, kSystemName) == 0) return "a component is a system name (\"@eaDir\", a hidden or reserved name)";
    if (std::strcmp(rule, kSkippedDir) == 0) return "a directory on the way is a recycle bin, a snapshot or on a remote or image file system";
    return "not in canonical form beneath its share";
}

}  // namespace FILEINDEX
}  // namespace QIRA
