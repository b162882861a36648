#include <sys/stat.h>
#include <unistd.h>

#include <taglib/audioproperties.h>
#include <taglib/fileref.h>
#include <taglib/tag.h>
#include <taglib/tiostream.h>
#include <taglib/tpropertymap.h>

#include "readers.h"
#include "xml_text.h"

namespace extractor {
namespace {

// The file as TagLib reads it: through the descriptor handed over, read-only.
class FdStream : public TagLib::IOStream {
public:
    explicit FdStream(int fd) : fd_(fd) {}
    TagLib::FileName name() const override { return ""; }
    TagLib::ByteVector readBlock(unsigned long length) override {
        TagLib::ByteVector block(static_cast<unsigned int>(std::min<unsigned long>(length, 1u << 26)), '\0');
        const ssize_t got = pread(fd_, block.data(), block.size(), position_);
        block.resize(got > 0 ? static_cast<unsigned int>(got) : 0);
        position_ += static_cast<long>(block.size());
        return block;
    }
    void writeBlock(const TagLib::ByteVector&) override {}
    void insert(const TagLib::ByteVector&, unsigned long, unsigned long) override {}
    void removeBlock(unsigned long, unsigned long) override {}
    bool readOnly() const override { return true; }
    bool isOpen() const override { return true; }
    void seek(long offset, Position from) override {
        const long base = from == Beginning ? 0 : from == Current ? position_ : length();
        position_ = std::max(0L, base + offset);
    }
    long tell() const override { return position_; }
    long length() override {
        struct stat st;
        return fstat(fd_, &st) == 0 ? static_cast<long>(st.st_size) : 0;
    }
    void truncate(long) override {}

private:
    int fd_;
    long position_ = 0;
};

void Put(Reply& reply, const char* field, const TagLib::String& value) {
    const std::string text = Squeezed(value.to8Bit(true));
    if (!text.empty()) reply.fields[field] = text;
}

}  // namespace

void ReadAudio(int fd, Reply& reply) {
    FdStream stream(fd);
    const TagLib::FileRef file(&stream, true, TagLib::AudioProperties::Fast);
    if (file.isNull()) {
        reply.problem = "the audio file cannot be read";
        return;
    }
    if (const TagLib::Tag* tag = file.tag()) {
        Put(reply, "title", tag->title());
        Put(reply, "artist", tag->artist());
        Put(reply, "album", tag->album());
        Put(reply, "genre", tag->genre());
        if (tag->year() > 0) reply.fields["year"] = tag->year();
        if (tag->track() > 0) reply.fields["track"] = tag->track();
        const TagLib::PropertyMap properties = file.file()->properties();
        const auto albumArtist = properties.find("ALBUMARTIST");
        if (albumArtist != properties.end() && !albumArtist->second.isEmpty()) Put(reply, "album_artist", albumArtist->second.front());
    }
    if (const TagLib::AudioProperties* audio = file.audioProperties()) reply.fields["duration"] = audio->lengthInSeconds();
}

}  // namespace extractor
