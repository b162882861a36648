#include "queue_file.h"

#include <fcntl.h>
#include <unistd.h>

#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <memory>

#include <json/reader.h>

#include "ea_dir.h"
#include "fileindex/fileidx.h"
#include "fileindex/json.h"
#include "fileindex/utils.h"
#include "log.h"
#include "path_rules.h"

namespace QIRA {
namespace FILEINDEX {
namespace detail {
namespace {

std::unique_ptr<Json::CharReader> NewLineReader() {
    Json::CharReaderBuilder builder;
    builder["collectComments"] = false;
    builder["allowComments"] = false;
    builder["allowTrailingCommas"] = false;
    builder["stackLimit"] = kJsonNestingLimit;
    builder["failIfExtra"] = true;
    return std::unique_ptr<Json::CharReader>(builder.newCharReader());
}

const Json::Value* Member(const Json::Value& object, const char* key) {
    return object.find(key, key + std::strlen(key));
}

bool ParseRecord(Json::CharReader& reader, const char* begin, const char* end, QueueRecord& record) {
    Json::Value value;
    std::string errors;
    try {
        if (!reader.parse(begin, end, &value, &errors)) return false;
    } catch (const std::exception&) {
        return false;
    }
    if (!value.isObject()) return false;
    const Json::Value* event = Member(value, "event");
    const Json::Value* path = Member(value, "path");
    if (event == nullptr || path == nullptr || !event->isConvertibleTo(Json::uintValue) || !path->isString()) {
        return false;
    }
    record.event = event->asUInt();
    record.path = path->asString();
    record.path_old.clear();
    if (record.event == kEventRename) {
        const Json::Value* old = Member(value, "path_old");
        if (old != nullptr && old->isString()) record.path_old = old->asString();
    }
    return true;
}

}  // namespace

bool ScanQueue(const std::string& queueFile, const std::function<void(const QueueRecord&)>& onRecord,
               const std::function<void(const std::string&)>& onMalformed) {
    const int fd = OpenNoFollow(queueFile, O_RDONLY);
    if (fd < 0) return false;
    FILE* file = fdopen(fd, "r");
    if (file == nullptr) {
        close(fd);
        return false;
    }
    const auto reader = NewLineReader();
    char* line = nullptr;
    size_t capacity = 0;
    ssize_t length;
    QueueRecord record;
    while ((length = getline(&line, &capacity, file)) >= 0) {
        const char* end = line + length;
        if (length > 0 && end[-1] == '\n') --end;
        if (ParseRecord(*reader, line, end, record)) {
            onRecord(record);
        } else {
            onMalformed(std::string(static_cast<const char*>(line), end));
        }
    }
    free(line);
    fclose(file);
    return true;
}

bool IsReindexQueued(const std::string& path, const std::string& queueFile) {
    if (!IsFileExist(queueFile)) return false;
    bool queued = false;
    const bool opened = ScanQueue(
        queueFile,
        [&](const QueueRecord& record) {
            if (record.event == static_cast<unsigned>(kEventReindex) && record.path == path) queued = true;
        },
        [](const std::string&) {});
    if (!opened) FILEIDX_LOG("Failed to open queue=%s, reason=%m", queueFile.c_str());
    return queued;
}

bool ShareQueuePath(const std::string& share, std::string& queuePath) {
    if (!NulFree(share)) return false;
    char buffer[4096] = {0};
    if (FILEIDXQueuePathGet(share.c_str(), buffer, sizeof buffer) < 0) {
        FILEIDX_LOG("FILEIDXQueuePathGet failed, share=%s", share.c_str());
        return false;
    }
    queuePath = buffer;
    return true;
}

}  // namespace detail
}  // namespace FILEINDEX
}  // namespace QIRA
