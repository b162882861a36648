// What stands at a share's queue paths, for the administrator's views.
#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include "fileindex/service_state.h"
#include "queue_file.h"

namespace QIRA {
namespace FILEINDEX {
namespace {

const char* KindOf(const struct stat& st) {
    if (S_ISREG(st.st_mode)) return st.st_nlink == 1 ? nullptr : "a file with several links";
    if (S_ISDIR(st.st_mode)) return "a directory";
    if (S_ISFIFO(st.st_mode)) return "a FIFO";
    if (S_ISLNK(st.st_mode)) return "a symbolic link";
    if (S_ISSOCK(st.st_mode)) return "a socket";
    return "a device";
}

}  // namespace

Json::Value QueueFileProblems(const std::string& share) {
    Json::Value problems(Json::objectValue);
    std::string queuePath;
    if (!detail::ShareQueuePath(share, queuePath)) return problems;
    const std::string eaDir = queuePath.substr(0, queuePath.rfind('/'));
    const std::string shareDir = eaDir.substr(0, eaDir.rfind('/'));
    const int shareFd = open(shareDir.c_str(), O_PATH | O_DIRECTORY | O_CLOEXEC);
    if (shareFd < 0) return problems;
    struct stat st;
    if (fstatat(shareFd, "@eaDir", &st, AT_SYMLINK_NOFOLLOW) == 0 && !S_ISDIR(st.st_mode)) problems["@eaDir"] = KindOf(st);
    const int eaFd = openat(shareFd, "@eaDir", O_PATH | O_DIRECTORY | O_NOFOLLOW | O_CLOEXEC);
    close(shareFd);
    if (eaFd < 0) return problems;
    const std::string leaf = queuePath.substr(queuePath.rfind('/') + 1);
    for (const auto& [role, name] : {std::pair<const char*, std::string>{"queue", leaf}, {"companion", leaf + ".tmp"}}) {
        if (fstatat(eaFd, name.c_str(), &st, AT_SYMLINK_NOFOLLOW) != 0) continue;
        if (const char* kind = KindOf(st)) problems[role] = kind;
    }
    close(eaFd);
    return problems;
}

}  // namespace FILEINDEX
}  // namespace QIRA
