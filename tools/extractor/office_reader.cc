#include <archive.h>
#include <archive_entry.h>

#include <cstring>
#include <memory>

#include <unistd.h>

#include "readers.h"
#include "xml_text.h"

namespace extractor {
namespace {

// A zip bomb is read no further than this, per part and over all parts.
constexpr la_int64_t kMaxPartBytes = 16 << 20;
constexpr la_int64_t kMaxTotalBytes = 64 << 20;
constexpr int kMaxEntries = 10000;

using Archive = std::unique_ptr<archive, decltype(&archive_read_free)>;

bool EndsWith(const std::string& text, const char* end) {
    const size_t length = std::strlen(end);
    return text.size() >= length && text.compare(text.size() - length, length, end) == 0;
}

bool StartsWith(const std::string& text, const char* start) { return text.rfind(start, 0) == 0; }

// The parts that hold a document's text, in the order they are met.
bool IsTextPart(const std::string& name) {
    return name == "word/document.xml" || name == "xl/sharedStrings.xml" ||
           (StartsWith(name, "ppt/slides/slide") && EndsWith(name, ".xml")) || name == "content.xml" ||
           EndsWith(name, ".xhtml") || EndsWith(name, ".html");
}

// The parts that hold its title and author.
bool IsPropertiesPart(const std::string& name) {
    return name == "docProps/core.xml" || name == "meta.xml" || EndsWith(name, ".opf");
}

// The part's bytes, no more than `allowance`; false when it is larger.
bool ReadPart(archive* zip, la_int64_t& allowance, std::string& bytes) {
    char block[65536];
    for (;;) {
        const la_ssize_t got = archive_read_data(zip, block, sizeof block);
        if (got < 0) return false;
        if (got == 0) return true;
        if (static_cast<la_int64_t>(bytes.size()) + got > std::min(allowance, kMaxPartBytes)) return false;
        bytes.append(block, static_cast<size_t>(got));
    }
}

Archive OpenZip(int fd) {
    Archive zip(archive_read_new(), archive_read_free);
    archive_read_support_format_zip(zip.get());
    if (lseek(fd, 0, SEEK_SET) != 0 || archive_read_open_fd(zip.get(), fd, 65536) != ARCHIVE_OK) zip.reset();
    return zip;
}

}  // namespace

std::string OfficeDocumentMime(int fd) {
    static const std::pair<const char*, const char*> kMainParts[] = {
        {"word/document.xml", "application/vnd.openxmlformats-officedocument.wordprocessingml.document"},
        {"xl/workbook.xml", "application/vnd.openxmlformats-officedocument.spreadsheetml.sheet"},
        {"ppt/presentation.xml", "application/vnd.openxmlformats-officedocument.presentationml.presentation"}};
    const Archive zip = OpenZip(fd);
    archive_entry* entry = nullptr;
    for (int entries = 0; zip && entries < kMaxEntries && archive_read_next_header(zip.get(), &entry) == ARCHIVE_OK; ++entries) {
        const char* path = archive_entry_pathname(entry);
        const std::string name = path != nullptr ? path : "";
        if (name == "mimetype") {
            la_int64_t allowance = 256;
            std::string mime;
            return ReadPart(zip.get(), allowance, mime) ? Squeezed(mime) : "";
        }
        for (const auto& [part, mime] : kMainParts) {
            if (name == part) return mime;
        }
    }
    return "";
}

void ReadOfficeDocument(int fd, size_t maxText, Reply& reply) {
    const Archive zip = OpenZip(fd);
    if (!zip) {
        reply.problem = "the document's container cannot be read";
        return;
    }
    la_int64_t allowance = kMaxTotalBytes;
    std::string text;
    archive_entry* entry = nullptr;
    for (int entries = 0; entries < kMaxEntries && text.size() < maxText; ++entries) {
        const int next = archive_read_next_header(zip.get(), &entry);
        if (next == ARCHIVE_EOF) break;
        if (next != ARCHIVE_OK && next != ARCHIVE_WARN) {
            reply.problem = "the document's container is damaged";
            break;
        }
        const char* path = archive_entry_pathname(entry);
        const std::string name = path != nullptr ? path : "";
        if (!IsTextPart(name) && !IsPropertiesPart(name)) continue;
        std::string bytes;
        if (!ReadPart(zip.get(), allowance, bytes)) {
            reply.problem = "a part of the document is larger than 16 MiB, or all of them together than 64 MiB";
            break;
        }
        allowance -= static_cast<la_int64_t>(bytes.size());
        if (IsPropertiesPart(name)) {
            std::string title, author;
            XmlText(bytes, "title", &title, "creator", &author);
            if (!title.empty()) reply.fields["title"] = title;
            if (!author.empty()) reply.fields["author"] = author;
        } else {
            std::string ignored;
            text += (EndsWith(name, "html") ? HtmlText(bytes, ignored) : XmlText(bytes, nullptr, nullptr, nullptr, nullptr)) + "\n";
        }
    }
    reply.text = Cut(std::move(text), maxText);
}

}  // namespace extractor
