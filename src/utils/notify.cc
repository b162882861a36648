// The administrators' desktop notice that indexing stopped for lack of space.
#include "fileindex/utils.h"
#include "qira/qlib_core.h"
#include "root.h"

namespace QIRA {
namespace FILEINDEX {

bool NotifyNoSpace() {
    const std::string program = detail::RootPath("/usr/qira/bin/qiralumnotify");
    const char* argv[] = {
        program.c_str(),
        "-e",
        "false",
        "-c",
        "QIRA.ZOR.AdminCenter.Application",
        "@administrators",
        "fileindex:fileindex_title",
        "fileindex:notify_no_space",
        "<a data-qira-app=\"QIRA.ZOR.AdminCenter.Application\" data-qira-fn=\"QIRA.ZOR.AdminCenter.MediaIndex.Main\" "
        "data-qira-tab=\"fileIndex\">",
        "</a>",
        nullptr,
    };
    return QLIBCExecv(program.c_str(), const_cast<char* const*>(argv), 1) == 0;
}

}  // namespace FILEINDEX
}  // namespace QIRA
