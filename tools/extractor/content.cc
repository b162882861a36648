#include "content.h"

#include <sys/stat.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <cstring>
#include <memory>

#include <libxml/parser.h>

#include <exiv2/exiv2.hpp>

#include "readers.h"
#include "text_safety.h"
#include "xml_text.h"

namespace extractor {
namespace {

// What libmagic is given to tell a file's kind.
constexpr size_t kTypingBytes = 256 << 10;
// Bytes of text read at most: text wants a little more than it keeps (encodings, markup).
constexpr size_t kMaxRead = 8 << 20;
// A PDF or a photo is read whole, up to this size.
constexpr size_t kMaxWhole = 128 << 20;

const std::pair<const char*, const char*> kCharsets[] = {
    {"iso-8859-1", "WINDOWS-1252"}, {"unknown-8bit", "WINDOWS-1252"}, {"utf-16le", "UTF-16LE"}, {"utf-16be", "UTF-16BE"}};

bool StartsWith(const std::string& text, const char* prefix) { return text.compare(0, std::strlen(prefix), prefix) == 0; }

// The first `limit` bytes of a file of `size` bytes (fewer should it shrink meanwhile).
std::string ReadUpTo(int fd, size_t limit, off_t size) {
    limit = std::min(limit, static_cast<size_t>(size));
    std::string bytes(limit, '\0');
    size_t done = 0;
    while (done < limit) {
        const ssize_t got = pread(fd, &bytes[done], limit - done, static_cast<off_t>(done));
        if (got <= 0) break;
        done += static_cast<size_t>(got);
    }
    bytes.resize(done);
    return bytes;
}

// The kind a MIME type is indexed as: "document", "audio", "video", "photo" or "".
std::string KindOf(const std::string& mime) {
    static const std::pair<const char*, const char*> kinds[] = {
        {"text/", "document"}, {"application/pdf", "document"}, {"application/msword", "document"},
        {"application/vnd.openxmlformats-officedocument.", "document"}, {"application/vnd.oasis.opendocument.", "document"},
        {"application/epub+zip", "document"}, {"application/rtf", "document"}, {"audio/", "audio"},
        {"video/", "video"}, {"image/", "photo"}};
    for (const auto& [prefix, kind] : kinds) {
        if (StartsWith(mime, prefix)) return kind;
    }
    return "";
}

}  // namespace

ContentReader::~ContentReader() {
    for (auto& entry : converters_) iconv_close(entry.second);
    if (magic_ != nullptr) magic_close(magic_);
}

bool ContentReader::Load() {
    magic_ = magic_open(MAGIC_MIME_TYPE | MAGIC_NO_CHECK_COMPRESS | MAGIC_ERROR);
    if (magic_ == nullptr || magic_load(magic_, nullptr) != 0) return false;
    for (const auto& [name, charset] : kCharsets) {
        const iconv_t converter = iconv_open("UTF-8", charset);
        if (converter != reinterpret_cast<iconv_t>(-1)) converters_[name] = converter;
    }
    xmlInitParser();
    Exiv2::enableBMFF(true);  // HEIC and AVIF photos
    return true;
}

std::string ContentReader::ToUtf8(const std::string& bytes, const std::string& charset) {
    const auto found = converters_.find(charset);
    if (found == converters_.end()) return bytes;  // UTF-8, ASCII, or a charset read as it stands
    iconv(found->second, nullptr, nullptr, nullptr, nullptr);
    std::string out(bytes.size() * 3 + 4, '\0');
    char* in = const_cast<char*>(bytes.data());
    size_t inLeft = bytes.size();
    char* to = &out[0];
    size_t outLeft = out.size();
    while (inLeft > 0 && iconv(found->second, &in, &inLeft, &to, &outLeft) == static_cast<size_t>(-1)) {
        if (errno != EILSEQ && errno != EINVAL) break;
        ++in;  // a byte the encoding does not know
        --inLeft;
    }
    out.resize(out.size() - outLeft);
    return out;
}

Reply ContentReader::Read(int fd, const Request& request) {
    Reply reply;
    reply.fields = Json::Value(Json::objectValue);
    struct stat st;
    if (fstat(fd, &st) != 0 || !S_ISREG(st.st_mode)) {
        reply.problem = "not a regular file";
        return reply;
    }
    std::string head = ReadUpTo(fd, kTypingBytes, st.st_size);
    const char* mime = magic_buffer(magic_, head.data(), head.size());
    reply.mime = mime != nullptr ? mime : "application/octet-stream";
    if (reply.mime == "application/zip") {
        const std::string document = OfficeDocumentMime(fd);
        if (!document.empty()) reply.mime = document;
    }
    reply.type = KindOf(reply.mime);
    if (StartsWith(reply.mime, "text/") && head.size() < static_cast<size_t>(st.st_size)) {
        head = ReadUpTo(fd, std::min(kMaxRead, std::max(request.maxText * 4, kTypingBytes)), st.st_size);
    }
    if (reply.mime == "text/html") {
        std::string title;
        reply.text = Cut(HtmlText(head, title), request.maxText);
        if (!title.empty()) reply.fields["title"] = title;
    } else if (StartsWith(reply.mime, "text/")) {
        magic_setflags(magic_, MAGIC_MIME_ENCODING | MAGIC_NO_CHECK_COMPRESS | MAGIC_ERROR);
        const char* charset = magic_buffer(magic_, head.data(), head.size());
        magic_setflags(magic_, MAGIC_MIME_TYPE | MAGIC_NO_CHECK_COMPRESS | MAGIC_ERROR);
        std::string text = tools::ValidUtf8(ToUtf8(head, charset != nullptr ? charset : ""), " ");
        if (StartsWith(text, "\xEF\xBB\xBF")) text.erase(0, 3);  // a byte order mark is no text
        reply.text = Cut(std::move(text), request.maxText);
    } else if (reply.mime == "application/pdf" || reply.type == "photo") {
        if (static_cast<size_t>(st.st_size) > kMaxWhole) {
            reply.problem = "larger than 128 MiB";
        } else if (reply.type == "photo") {
            ReadPhoto(ReadUpTo(fd, kMaxWhole, st.st_size), reply);
        } else {
            ReadPdf(ReadUpTo(fd, kMaxWhole, st.st_size), request.maxText, reply);
        }
    } else if (StartsWith(reply.mime, "application/vnd.openxmlformats-officedocument.") ||
               StartsWith(reply.mime, "application/vnd.oasis.opendocument.") || reply.mime == "application/epub+zip") {
        ReadOfficeDocument(fd, request.maxText, reply);
    } else if (reply.type == "audio") {
        ReadAudio(fd, reply);
    } else if (reply.type == "video") {
        ReadVideo(fd, reply);
    }
    return reply;
}

std::string Cut(std::string text, size_t limit) {
    if (text.size() <= limit) return text;
    size_t end = limit;
    while (end > 0 && (static_cast<unsigned char>(text[end]) & 0xC0) == 0x80) --end;
    text.resize(end);
    return text;
}


}  // namespace extractor
