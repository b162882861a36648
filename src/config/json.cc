#include "fileindex/json.h"

#include <dirent.h>
#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <cstdlib>
#include <memory>

#include <json/reader.h>
#include <json/writer.h>

#include "strict_json.h"

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

struct Outline {
    bool slashOutsideStrings = false;
    bool stringOpen = false;  // at the end of what jsoncpp reads
    long depth = 0;           // openers minus closers outside strings, in what jsoncpp reads
};

// What a strict reading can tell without parsing: strings end at an unescaped quote, and jsoncpp
// reads a NUL byte outside a string as the end of the text.
Outline OutlineOf(const char* begin, const char* end) {
    Outline outline;
    bool inString = false;
    bool escaped = false;
    bool ended = false;
    for (const char* p = begin; p < end; ++p) {
        const char c = *p;
        if (escaped) {
            escaped = false;
        } else if (inString) {
            escaped = c == '\\';
            inString = c != '"';
        } else if (c == '"') {
            inString = true;
        } else if (c == '/') {
            outline.slashOutsideStrings = true;  // jsoncpp would skip it as a comment inside containers
        } else if (c == '\0') {
            ended = true;
        } else if (!ended && (c == '{' || c == '[')) {
            ++outline.depth;
        } else if (!ended && (c == '}' || c == ']')) {
            --outline.depth;
        }
        if (!ended) outline.stringOpen = inString;
    }
    return outline;
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

// The rename reaches the disk only with its directory.
void SyncDirectoryOf(const std::string& path) {
    const size_t slash = path.rfind('/');
    const std::string dir = slash == std::string::npos ? "." : slash == 0 ? "/" : path.substr(0, slash);
    const int fd = open(dir.c_str(), O_RDONLY | O_DIRECTORY | O_CLOEXEC);
    if (fd < 0) return;
    fsync(fd);
    close(fd);
}

bool IsSaveTemporaryOf(const std::string& name, const std::string& leaf) {
    if (name.size() != leaf.size() + 7 || name.compare(0, leaf.size() + 1, leaf + ".") != 0) return false;
    return name.find_first_not_of("ABCDEFGHIJKLMNOPQRSTUVWXYZabcdefghijklmnopqrstuvwxyz0123456789", leaf.size() + 1) ==
           std::string::npos;
}

}  // namespace

namespace detail {

bool ReadWholeFile(const std::string& path, std::string& text) {
    const int fd = open(path.c_str(), O_RDONLY | O_CLOEXEC);
    if (fd < 0) return false;
    char buffer[65536];
    ssize_t got;
    while ((got = read(fd, buffer, sizeof buffer)) > 0) text.append(buffer, static_cast<size_t>(got));
    close(fd);
    return got == 0;
}

void RemoveSaveTemporaries(const std::string& path) {
    const size_t slash = path.rfind('/');
    const std::string dir = slash == std::string::npos ? "." : slash == 0 ? "/" : path.substr(0, slash);
    const std::string leaf = path.substr(slash == std::string::npos ? 0 : slash + 1);
    DIR* listing = opendir(dir.c_str());
    if (listing == nullptr) return;
    while (const dirent* entry = readdir(listing)) {
        if (IsSaveTemporaryOf(entry->d_name, leaf)) unlinkat(dirfd(listing), entry->d_name, 0);
    }
    closedir(listing);
}

StrictJsonReader::StrictJsonReader() : reader_(StrictReader().newCharReader()) {}

bool StrictReadingRefuses(const char* begin, const char* end) {
    const Outline outline = OutlineOf(begin, end);
    return outline.slashOutsideStrings || outline.stringOpen || outline.depth != 0;
}

bool StrictJsonReader::Parse(const char* begin, const char* end, Json::Value& out) {
    if (OutlineOf(begin, end).slashOutsideStrings) return false;
    Json::Value parsed;
    std::string errors;
    try {
        if (!reader_->parse(begin, end, &parsed, &errors)) return false;
    } catch (const std::exception&) {
        return false;  // nesting limit exceeded
    }
    out.swap(parsed);
    return true;
}

}  // namespace detail

bool fromString(Json::Value& out, const std::string& text) {
    return detail::StrictJsonReader().Parse(text.data(), text.data() + text.size(), out);
}

bool fromFile(Json::Value& out, const std::string& path) {
    std::string text;
    return detail::ReadWholeFile(path, text) && fromString(out, text);
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
    SyncDirectoryOf(path);
    return true;
}

}  // namespace FILEINDEX
}  // namespace QIRA
