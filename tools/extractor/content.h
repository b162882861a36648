// What a file holds, read from a descriptor only: its kind by content (libmagic); the text of plain
// text in any common encoding (as UTF-8), of HTML (tags, scripts and styles left out, the title as
// a field), of PDF, OOXML, ODF and EPUB documents with their title and author; the tags of songs
// and the metadata of photos and videos (readers.h).
#pragma once

#include <iconv.h>

#include <map>
#include <string>

#include <magic.h>

#include "protocol.h"

namespace extractor {

class ContentReader {
public:
    ContentReader() = default;
    ContentReader(const ContentReader&) = delete;
    ContentReader& operator=(const ContentReader&) = delete;
    ~ContentReader();

    // Loads what reading needs from files (libmagic's database, the encoding converters): before
    // the sandbox forbids opening them. False when libmagic cannot be loaded.
    bool Load();

    // Reads the regular file open as `fd` from its start; `problem` says why nothing was read.
    Reply Read(int fd, const Request& request);

private:
    std::string ToUtf8(const std::string& bytes, const std::string& charset);

    magic_t magic_ = nullptr;
    std::map<std::string, iconv_t> converters_;  // libmagic's charset name -> to UTF-8
};

}  // namespace extractor
