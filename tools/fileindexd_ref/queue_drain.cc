#include "queue_drain.h"

#include <fcntl.h>
#include <ftw.h>
#include <sys/file.h>
#include <sys/stat.h>
#include <unistd.h>

#include <algorithm>
#include <cctype>
#include <fstream>
#include <iostream>
#include <set>

#include "fileindex/json.h"

namespace fileindexd_ref {
namespace {

struct MediaCount {
    int document = 0;
    int audio = 0;
    int video = 0;
    int photo = 0;
};

MediaCount* g_count = nullptr;

std::string Extension(const char* path) {
    std::string name(path);
    const size_t dot = name.rfind('.');
    if (dot == std::string::npos || name.find('/', dot) != std::string::npos) return "";
    std::string ext = name.substr(dot + 1);
    std::transform(ext.begin(), ext.end(), ext.begin(), [](unsigned char c) { return std::tolower(c); });
    return ext;
}

int CountFile(const char* path, const struct stat*, int type, struct FTW*) {
    static const std::set<std::string> documents = {"txt", "pdf", "doc", "docx", "md", "odt"};
    static const std::set<std::string> audio = {"mp3", "flac", "wav", "ogg", "m4a"};
    static const std::set<std::string> video = {"mp4", "mkv", "avi", "mov"};
    static const std::set<std::string> photos = {"jpg", "jpeg", "png", "gif", "heic"};
    if (type != FTW_F) return 0;
    const std::string ext = Extension(path);
    if (documents.count(ext)) ++g_count->document;
    if (audio.count(ext)) ++g_count->audio;
    if (video.count(ext)) ++g_count->video;
    if (photos.count(ext)) ++g_count->photo;
    return 0;
}

void Process(const Json::Value& record) {
    MediaCount count;
    g_count = &count;
    const std::string path = record["path"].asString();
    nftw(path.c_str(), CountFile, 16, FTW_PHYS);
    std::cout << "fileindexd-ref: event " << record["event"].asUInt() << " " << path << ": documents=" << count.document
              << " audio=" << count.audio << " video=" << count.video << " photo=" << count.photo << std::endl;
}

bool AppendAll(const std::string& path, const std::string& text) {
    const int fd = open(path.c_str(), O_WRONLY | O_CREAT | O_APPEND | O_NOFOLLOW | O_CLOEXEC, 0644);
    if (fd < 0) return false;
    const bool ok = write(fd, text.data(), text.size()) == static_cast<ssize_t>(text.size());
    close(fd);
    return ok;
}

}  // namespace

int TakeQueue(const std::string& queuePath) {
    const int fd = open(queuePath.c_str(), O_RDONLY | O_NOFOLLOW | O_CLOEXEC);
    if (fd < 0) return 0;
    if (flock(fd, LOCK_EX) != 0) {
        close(fd);
        return 0;
    }
    // The lock is held only for the rename (or, when records taken earlier still wait in the
    // companion, for the copy): writers wait as briefly as possible.
    const std::string taken = queuePath + ".tmp";
    struct stat st;
    bool moved = false;
    if (lstat(taken.c_str(), &st) != 0) {
        moved = rename(queuePath.c_str(), taken.c_str()) == 0;
    } else {
        std::string text;
        char buffer[65536];
        ssize_t got;
        while ((got = read(fd, buffer, sizeof buffer)) > 0) text.append(buffer, static_cast<size_t>(got));
        moved = AppendAll(taken, text) && unlink(queuePath.c_str()) == 0;
    }
    flock(fd, LOCK_UN);
    close(fd);
    return moved ? 1 : 0;
}

int ProcessTaken(const std::string& queuePath) {
    const std::string taken = queuePath + ".tmp";
    std::ifstream in(taken);
    if (!in) return 0;
    int processed = 0;
    std::string line;
    while (std::getline(in, line)) {
        Json::Value record;
        if (!QIRA::FILEINDEX::fromString(record, line) || !record.isObject() || !record["path"].isString() ||
            !record["event"].isConvertibleTo(Json::uintValue)) {
            std::cout << "fileindexd-ref: skipped malformed record: " << line << std::endl;
            continue;
        }
        Process(record);
        ++processed;
    }
    unlink(taken.c_str());
    return processed;
}

}  // namespace fileindexd_ref
