#include "daemon_progress.h"

#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include "fileindex/json.h"
#include "fileindex/root.h"

namespace tools {
namespace {

constexpr off_t kMaxProgressBytes = 1 << 20;

}  // namespace

std::string DaemonProgressPath() { return QIRA::FILEINDEX::RootPrefix() + "/var/run/fileindexd.progress"; }

Json::Value ReadDaemonProgress() {
    const int fd = open(DaemonProgressPath().c_str(), O_RDONLY | O_NOFOLLOW | O_NONBLOCK | O_CLOEXEC);
    if (fd < 0) return Json::Value();
    struct stat st;
    std::string text;
    if (fstat(fd, &st) == 0 && S_ISREG(st.st_mode) && st.st_size <= kMaxProgressBytes) {
        text.resize(static_cast<size_t>(st.st_size));
        const ssize_t got = read(fd, text.data(), text.size());
        text.resize(got > 0 ? static_cast<size_t>(got) : 0);
    }
    close(fd);
    Json::Value read;
    if (!QIRA::FILEINDEX::fromString(read, text) || !read.isObject() || !read["shares"].isObject()) return Json::Value();
    Json::Value progress(Json::objectValue);
    progress["shares"] = Json::Value(Json::objectValue);
    for (const auto& share : read["shares"].getMemberNames()) {
        if (read["shares"][share].isObject()) progress["shares"][share] = read["shares"][share];
    }
    return progress;
}

bool WriteDaemonProgress(const Json::Value& progress) { return QIRA::FILEINDEX::toFile(progress, DaemonProgressPath()); }

unsigned long long StillPending(unsigned long long pending, const Json::Value& daemonProgress, const std::string& share) {
    const Json::Value& applied = daemonProgress["shares"][share]["applied"];
    const unsigned long long done = applied.isUInt64() ? applied.asUInt64() : 0;
    return pending > done ? pending - done : 0;
}

}  // namespace tools
