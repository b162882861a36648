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
    for (const auto& name : read["shares"].getMemberNames()) {
        Json::Value& share = read["shares"][name];
        if (!share.isObject()) continue;
        Json::Value folders(Json::objectValue);
        for (const auto& path : share["folders"].isObject() ? share["folders"].getMemberNames() : std::vector<std::string>()) {
            if (share["folders"][path].isObject()) folders[path] = share["folders"][path];
        }
        share["folders"] = folders;
        progress["shares"][name] = share;
    }
    return progress;
}

bool WriteDaemonProgress(const Json::Value& progress) { return QIRA::FILEINDEX::toFile(progress, DaemonProgressPath()); }

unsigned long long Left(unsigned long long pending, const Json::Value& applied) {
    const unsigned long long done = applied.isUInt64() ? applied.asUInt64() : 0;
    return pending > done ? pending - done : 0;
}

void AddDaemonProgress(Json::Value& share, const Json::Value& daemonProgress) {
    const Json::Value& published = daemonProgress["shares"][share["share"].asString()];
    const auto dateOr = [](const Json::Value& date, const Json::Value& otherwise) {
        return date.isInt64() ? date : otherwise;
    };
    share["applied"] = published["applied"].isUInt64() ? published["applied"] : Json::Value(0);
    share["files_left"] = static_cast<Json::Int64>(Left(share["files"].asUInt64(), published["applied_files"]));
    share["up_to_date"] = dateOr(published["up_to_date"], Json::Value());
    for (auto& folder : share["folders"]) {
        const Json::Value& own = published["folders"][folder["path"].asString()];
        folder["files_left"] = static_cast<Json::Int64>(Left(folder["files"].asUInt64(), own["applied_files"]));
        folder["up_to_date"] = dateOr(own["up_to_date"], share["up_to_date"]);
    }
}

}  // namespace tools
