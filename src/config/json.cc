#include "fileindex/json.h"

#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <cstdlib>
#include <memory>

#include <json/reader.h>
#include <json/writer.h>

namespace QIRA {
namespace FILEINDEX {
namespace {

const Json::CharReaderBuilder& StrictReader() {
    static const Json::CharReaderBuilder builder = [] {
        Json::CharReaderBuilder b;
        b["collectComments"] = false;
        b["allowComments"] = false;
        b["allowTrailingCommas"] = false;
        b["strictRoot"] = false;
        b["allowDroppedNullPlaceholders"] = false;
        b["allowNumericKeys"] = false;
        b["allowSingleQuotes"] = false;
        b["stackLimit"] = kJsonNestingLimit;
        b["failIfExtra"] = true;
        b["rejectDupKeys"] = false;
        b["allowSpecialFloats"] = false;
        b["skipBom"] = false;
        return b;
    }();
    return builder;
}

const Json::StreamWriterBuilder& CompactWriter() {
    static const Json::StreamWriterBuilder builder = [] {
        Json::StreamWriterBuilder b;
        b["indentation"] = "";
        b["emitUTF8"] = true;
        return b;
    }();
    return builder;
}

// jsoncpp skips comments inside objects and arrays even when comments are not allowed; in strict
// JSON a '/' can only stand inside a string.
bool HasSlashOutsideStrings(const std::string& text) {
    bool inString = false;
    bool escaped = false;
    for (const char c : text) {
        if (escaped) {
            escaped = false;
        } else if (inString) {
            escaped = c == '\\';
            inString = c != '"';
        } else if (c == '"') {
            inString = true;
        } else if (c == '/') {
            return true;
        }
    }
    return false;
}

bool ReadWholeFile(const std::string& path, std::string& text) {
    const int fd = open(path.c_str(), O_RDONLY | O_CLOEXEC);
    if (fd < 0) return false;
    char buffer[65536];
    ssize_t got;
    while ((got = read(fd, buffer, sizeof buffer)) > 0) text.append(buffer, static_cast<size_t>(got));
    close(fd);
    return got == 0;
}

bool WriteAll(int fd, const std::string& text) {
    size_t done = 0;
    while (done < text.size()) {
        const ssize_t wrote = write(fd, text.data() + done, text.size() - done);
        if (wrote < 0 && errno == EINTR) continue;
        if (wrote <= 0) return false;
        done += static_cast<size_t>(wrote);
    }
    return true;
}

}  // namespace

bool fromString(Json::Value& out, const std::string& text) {
    if (HasSlashOutsideStrings(text)) return false;
    std::unique_ptr<Json::CharReader> reader(StrictReader().newCharReader());
    Json::Value parsed;
    std::string errors;
    try {
        if (!reader->parse(text.data(), text.data() + text.size(), &parsed, &errors)) return false;
    } catch (const std::exception&) {
        return false;  // nesting limit exceeded
    }
    out.swap(parsed);
    return true;
}

bool fromFile(Json::Value& out, const std::string& path) {
    std::string text;
    return ReadWholeFile(path, text) && fromString(out, text);
}

std::string toString(const Json::Value& value) { return Json::writeString(CompactWriter(), value); }

bool toFile(const Json::Value& value, const std::string& path) {
    std::string tmp = path + ".XXXXXX";
    const int fd = mkostemp(&tmp[0], O_CLOEXEC);
    if (fd < 0) return false;
    const bool written = fchmod(fd, 0644) == 0 && WriteAll(fd, toString(value) + "\n") && fsync(fd) == 0;
    const bool closed = close(fd) == 0;
    if (!written || !closed || rename(tmp.c_str(), path.c_str()) != 0) {
        unlink(tmp.c_str());
        return false;
    }
    return true;
}

}  // namespace FILEINDEX
}  // namespace QIRA
