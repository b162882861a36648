#include "media_fixtures.h"

#include <archive.h>
#include <archive_entry.h>

#include <fstream>
#include <stdexcept>
#include <utility>
#include <vector>

#include <cstdint>
#include <cstdio>
#include <cstring>

#include <exiv2/exiv2.hpp>
extern "C" {
#include <libavformat/avformat.h>
}
#include <taglib/flacfile.h>
#include <taglib/mpegfile.h>
#include <taglib/tag.h>
#include <taglib/xiphcomment.h>

namespace testkit {
namespace {

void WriteBytes(const std::string& path, const std::string& bytes) { std::ofstream(path, std::ios::trunc | std::ios::binary) << bytes; }

std::string Zip(const std::vector<std::pair<std::string, std::string>>& parts, bool deflate = false) {
    archive* zip = archive_write_new();
    archive_write_set_format_zip(zip);
    // An ODF's "mimetype" must be stored.
    archive_write_set_options(zip, deflate ? "zip:compression=deflate" : "zip:compression=store");
    std::vector<char> buffer(1 << 20);
    size_t used = 0;
    if (archive_write_open_memory(zip, buffer.data(), buffer.size(), &used) != ARCHIVE_OK) throw std::runtime_error("zip");
    for (const auto& [name, content] : parts) {
        archive_entry* entry = archive_entry_new();
        archive_entry_set_pathname(entry, name.c_str());
        archive_entry_set_size(entry, static_cast<la_int64_t>(content.size()));
        archive_entry_set_filetype(entry, AE_IFREG);
        archive_entry_set_perm(entry, 0644);
        archive_write_header(zip, entry);
        archive_write_data(zip, content.data(), content.size());
        archive_entry_free(entry);
    }
    archive_write_close(zip);
    archive_write_free(zip);
    return std::string(buffer.data(), used);
}

// A 1 x 1 grey JPEG without metadata.
std::string BareJpeg() {
    const unsigned char jpeg[] = {
        0xFF, 0xD8,                                                                            // start
        0xFF, 0xE0, 0x00, 0x10, 'J', 'F', 'I', 'F', 0x00, 0x01, 0x01, 0x00, 0x00, 0x01, 0x00, 0x01, 0x00, 0x00,
        0xFF, 0xDB, 0x00, 0x43, 0x00, 1, 1, 1, 1, 1, 1, 1, 1, 1, 1, 1, 1, 1, 1, 1, 1, 1, 1, 1, 1, 1, 1, 1, 1, 1, 1,
        1, 1, 1, 1, 1, 1, 1, 1, 1, 1, 1, 1, 1, 1, 1, 1, 1, 1, 1, 1, 1, 1, 1, 1, 1, 1, 1, 1, 1, 1, 1, 1, 1, 1, 1, 1,
        1, 1, 1, 1, 1,                                                                         // quantisation table
        0xFF, 0xC0, 0x00, 0x0B, 0x08, 0x00, 0x01, 0x00, 0x01, 0x01, 0x01, 0x11, 0x00,         // 1 x 1, one component
        0xFF, 0xC4, 0x00, 0x14, 0x00, 0x01, 0, 0, 0, 0, 0, 0, 0, 0, 0, 0, 0, 0, 0, 0, 0, 0, 0x00,  // DC table
        0xFF, 0xC4, 0x00, 0x14, 0x10, 0x01, 0, 0, 0, 0, 0, 0, 0, 0, 0, 0, 0, 0, 0, 0, 0, 0, 0x00,  // AC table
        0xFF, 0xDA, 0x00, 0x08, 0x01, 0x01, 0x00, 0x00, 0x3F, 0x00, 0x00,                     // scan
        0xFF, 0xD9};                                                                           // end
    return std::string(reinterpret_cast<const char*>(jpeg), sizeof jpeg);
}

// A PDF of these objects, numbered from 1, the first the catalog and the last the information.
std::string PdfOf(const std::vector<std::string>& objects) {
    std::string pdf = "%PDF-1.4\n";
    std::vector<size_t> offsets;
    for (size_t i = 0; i < objects.size(); ++i) {
        offsets.push_back(pdf.size());
        pdf += std::to_string(i + 1) + " 0 obj\n" + objects[i] + "\nendobj\n";
    }
    const size_t xref = pdf.size();
    pdf += "xref\n0 " + std::to_string(objects.size() + 1) + "\n0000000000 65535 f \n";
    for (const size_t offset : offsets) {
        char line[24];
        snprintf(line, sizeof line, "%010zu 00000 n \n", offset);
        pdf += line;
    }
    return pdf + "trailer\n<< /Size " + std::to_string(objects.size() + 1) + " /Root 1 0 R /Info " +
           std::to_string(objects.size()) + " 0 R >>\nstartxref\n" + std::to_string(xref) + "\n%%EOF\n";
}

std::string Stream(const std::string& dictionary, const std::string& content) {
    return "<< " + dictionary + " /Length " + std::to_string(content.size()) + " >>\nstream\n" + content + "\nendstream";
}

}  // namespace

std::string MakePdf(const std::string& title, const std::string& author, const std::string& sentence) {
    return PdfOf({
        "<< /Type /Catalog /Pages 2 0 R >>",
        "<< /Type /Pages /Kids [3 0 R] /Count 1 >>",
        "<< /Type /Page /Parent 2 0 R /MediaBox [0 0 600 100] /Contents 4 0 R /Resources << /Font << /F1 5 0 R >> >> >>",
        Stream("", "BT /F1 12 Tf 20 50 Td (" + sentence + ") Tj ET"),
        "<< /Type /Font /Subtype /Type1 /BaseFont /Helvetica >>",
        "<< /Title (" + title + ") /Author (" + author + ") >>",
    });
}

std::string MakeEndlessPdf() {
    std::vector<std::string> objects = {
        "<< /Type /Catalog /Pages 2 0 R >>",
        "<< /Type /Pages /Kids [3 0 R] /Count 1 >>",
        "<< /Type /Page /Parent 2 0 R /MediaBox [0 0 10 10] /Contents 4 0 R /Resources << /XObject << /X 5 0 R >> >> >>",
        Stream("", "/X Do"),
    };
    // Forms 5 to 13, each drawing the next ten times; the last saves and restores the state.
    for (int form = 5; form <= 13; ++form) {
        const std::string next = std::to_string(form + 1) + " 0 R";
        std::string draws;
        for (int i = 0; i < 10; ++i) draws += "/X Do\n";
        objects.push_back(form < 13 ? Stream("/Type /XObject /Subtype /Form /BBox [0 0 10 10] /Resources << /XObject << /X " + next + " >> >>", draws)
                                    : Stream("/Type /XObject /Subtype /Form /BBox [0 0 10 10]", "q Q"));
    }
    objects.push_back("<< /Title (Endless) >>");
    return PdfOf(objects);
}

std::string MakeJpegWithExif(uint32_t comments, uint32_t nextDirectory) {
    const auto le = [](uint32_t value, int bytes) {
        std::string out;
        for (int i = 0; i < bytes; ++i) out += static_cast<char>(value >> (8 * i) & 0xFF);
        return out;
    };
    // A little-endian TIFF header and one IFD: the user comments, each claiming 4 GiB at an
    // offset inside the block, then the date (DateTime), then the next IFD's offset.
    const std::string taken = std::string("2020:02:29 23:59:59") + '\0';
    std::string tiff = std::string("II*\0\x08\0\0\0", 8) + le(comments + 1, 2);
    for (uint32_t i = 0; i < comments; ++i) tiff += le(0x9286, 2) + le(7, 2) + le(0xFFFFFFFF, 4) + le(8, 4);
    const uint32_t takenAt = static_cast<uint32_t>(tiff.size()) + 12 + 4;
    tiff += le(0x0132, 2) + le(2, 2) + le(static_cast<uint32_t>(taken.size()), 4) + le(takenAt, 4) + le(nextDirectory, 4) + taken;
    const std::string exif = "Exif" + std::string(2, '\0') + tiff;
    const size_t length = exif.size() + 2;  // big-endian, counting itself
    const std::string segment = "\xFF\xE1" + std::string(1, static_cast<char>(length >> 8)) + std::string(1, static_cast<char>(length & 0xFF)) + exif;
    const std::string bare = BareJpeg();
    return bare.substr(0, 2) + segment + bare.substr(2);
}

std::string MakeOfficeDocument(bool odt, const std::string& title, const std::string& author, const std::string& text) {
    const std::string dc = R"(xmlns:dc="http://purl.org/dc/elements/1.1/")";
    if (odt) {
        return Zip({{"mimetype", "application/vnd.oasis.opendocument.text"},
                    {"content.xml", R"(<office:document-content xmlns:office="urn:oasis:names:tc:opendocument:xmlns:office:1.0" )"
                                    R"(xmlns:text="urn:oasis:names:tc:opendocument:xmlns:text:1.0"><office:body><office:text>)"
                                    "<text:p>" + text + "</text:p></office:text></office:body></office:document-content>"},
                    {"meta.xml", "<office:document-meta xmlns:office=\"urn:oasis:names:tc:opendocument:xmlns:office:1.0\" " + dc +
                                     "><office:meta><dc:title>" + title + "</dc:title><dc:creator>" + author +
                                     "</dc:creator></office:meta></office:document-meta>"}});
    }
    const std::string w = R"(xmlns:w="http://schemas.openxmlformats.org/wordprocessingml/2006/main")";
    return Zip({{"[Content_Types].xml", R"(<Types xmlns="http://schemas.openxmlformats.org/package/2006/content-types">)"
                                        R"(<Override PartName="/word/document.xml" ContentType="application/)"
                                        R"(vnd.openxmlformats-officedocument.wordprocessingml.document.main+xml"/></Types>)"},
                {"_rels/.rels", R"(<Relationships xmlns="http://schemas.openxmlformats.org/package/2006/relationships"/>)"},
                {"word/document.xml", "<w:document " + w + "><w:body><w:p><w:r><w:t>" + text + "</w:t></w:r></w:p></w:body></w:document>"},
                {"docProps/core.xml", "<cp:coreProperties xmlns:cp=\"http://schemas.openxmlformats.org/package/2006/metadata/core-properties\" " +
                                          dc + "><dc:title>" + title + "</dc:title><dc:creator>" + author + "</dc:creator></cp:coreProperties>"}});
}

std::string MakeZipBomb() {
    const std::string body = "<w:document><w:body>" + std::string(17 << 20, ' ') + "</w:body></w:document>";
    return Zip({{"[Content_Types].xml", "<Types/>"}, {"word/document.xml", body}}, true);
}

void WriteMp3(const std::string& path, const std::string& title, const std::string& artist, const std::string& album,
              unsigned year) {
    std::string frames;
    for (int i = 0; i < 40; ++i) frames += std::string("\xFF\xFB\x90\x64", 4) + std::string(413, '\0');  // 128 kbit/s, 44.1 kHz
    WriteBytes(path, frames);
    TagLib::MPEG::File file(path.c_str());
    file.tag()->setTitle(TagLib::String(title, TagLib::String::UTF8));
    file.tag()->setArtist(TagLib::String(artist, TagLib::String::UTF8));
    file.tag()->setAlbum(TagLib::String(album, TagLib::String::UTF8));
    file.tag()->setYear(year);
    if (!file.save(TagLib::MPEG::File::ID3v2)) throw std::runtime_error("mp3");
}

void WriteFlac(const std::string& path, const std::string& title, const std::string& artist, const std::string& album,
               unsigned year, unsigned seconds) {
    // "fLaC" and its one STREAMINFO block: 4096-sample blocks, 44.1 kHz, two channels of 16 bits,
    // `seconds` of samples; no audio frames, which no tag reader needs.
    const uint64_t packed = (44100ULL << 44) | (1ULL << 41) | (15ULL << 36) | (44100ULL * seconds);
    std::string info = std::string("\x10\x00\x10\x00", 4) + std::string(6, '\0');
    for (int shift = 56; shift >= 0; shift -= 8) info += static_cast<char>(packed >> shift & 0xFF);
    info += std::string(16, '\0');  // no MD5 of the audio
    WriteBytes(path, "fLaC" + std::string("\x80\x00\x00", 3) + static_cast<char>(info.size()) + info);
    TagLib::FLAC::File file(path.c_str());
    TagLib::Tag* tag = file.xiphComment(true);
    tag->setTitle(TagLib::String(title, TagLib::String::UTF8));
    tag->setArtist(TagLib::String(artist, TagLib::String::UTF8));
    tag->setAlbum(TagLib::String(album, TagLib::String::UTF8));
    tag->setYear(year);
    if (!file.save()) throw std::runtime_error("flac");
}

void WriteJpeg(const std::string& path, const std::string& taken, const std::string& make, const std::string& model) {
    WriteBytes(path, BareJpeg());
    const auto image = Exiv2::ImageFactory::open(path);
    Exiv2::ExifData exif;
    exif["Exif.Photo.DateTimeOriginal"] = taken;
    exif["Exif.Image.Make"] = make;
    exif["Exif.Image.Model"] = model;
    image->setExifData(exif);
    image->writeMetadata();
}

std::string MakeHeic(const std::string& taken, const std::string& make, const std::string& model, unsigned width,
                     unsigned height) {
    const auto be = [](uint32_t value, int bytes) {
        std::string out;
        for (int i = bytes - 1; i >= 0; --i) out += static_cast<char>(value >> (8 * i) & 0xFF);
        return out;
    };
    const auto box = [&be](const std::string& type, const std::string& content) { return be(static_cast<uint32_t>(8 + content.size()), 4) + type + content; };
    const std::string fullBox = std::string(4, '\0');  // version 0, no flags
    Exiv2::ExifData exif;
    exif["Exif.Photo.DateTimeOriginal"] = taken;
    exif["Exif.Image.Make"] = make;
    exif["Exif.Image.Model"] = model;
    Exiv2::Blob tiff;
    Exiv2::ExifParser::encode(tiff, Exiv2::littleEndian, exif);
    // The Exif item: the offset of the TIFF header past "Exif\0\0", then both.
    const std::string item = be(6, 4) + "Exif" + std::string(2, '\0') + std::string(tiff.begin(), tiff.end());
    const std::string ftyp = box("ftyp", "heic" + be(0, 4) + "mif1heic");
    const std::string infe = box("infe", std::string("\x02\0\0\0", 4) + be(1, 2) + be(0, 2) + "Exif" + '\0');
    const std::string properties = box("iprp", box("ipco", box("ispe", fullBox + be(width, 4) + be(height, 4))));
    // The item's place: one item, one extent of 4-byte offset and length, found once the sizes
    // before it are known.
    const auto meta = [&](uint32_t itemAt) {
        const std::string iloc = box("iloc", fullBox + "\x44" + '\0' + be(1, 2) + be(1, 2) + be(0, 2) + be(1, 2) + be(itemAt, 4) +
                                                 be(static_cast<uint32_t>(item.size()), 4));
        return box("meta", fullBox + box("iinf", fullBox + be(1, 2) + infe) + iloc + properties);
    };
    const uint32_t itemAt = static_cast<uint32_t>(ftyp.size() + meta(0).size() + 8);
    return ftyp + meta(itemAt) + box("mdat", item);
}

void WriteVideo(const std::string& path, int seconds, const std::string& title) {
    av_log_set_level(AV_LOG_QUIET);  // raw frames in Matroska draw a warning; they are read back all the same
    AVFormatContext* out = nullptr;
    if (avformat_alloc_output_context2(&out, nullptr, "matroska", path.c_str()) < 0) throw std::runtime_error("video");
    AVStream* stream = avformat_new_stream(out, nullptr);
    stream->codecpar->codec_type = AVMEDIA_TYPE_VIDEO;
    stream->codecpar->codec_id = AV_CODEC_ID_RAWVIDEO;
    stream->codecpar->width = 4;
    stream->codecpar->height = 2;
    stream->codecpar->format = AV_PIX_FMT_BGR24;
    stream->time_base = {1, 1};
    av_dict_set(&out->metadata, "title", title.c_str(), 0);
    AVDictionary* options = nullptr;
    av_dict_set(&options, "allow_raw_vfw", "1", 0);  // raw frames: nothing to encode
    const bool opened = avio_open(&out->pb, path.c_str(), AVIO_FLAG_WRITE) >= 0 && avformat_write_header(out, &options) >= 0;
    av_dict_free(&options);
    if (!opened) throw std::runtime_error("video");
    for (int i = 0; i < seconds; ++i) {
        AVPacket* packet = av_packet_alloc();
        av_new_packet(packet, 4 * 2 * 3);
        std::memset(packet->data, 0x80, 4 * 2 * 3);
        packet->pts = packet->dts = i;
        packet->duration = 1;
        av_packet_rescale_ts(packet, {1, 1}, stream->time_base);
        av_interleaved_write_frame(out, packet);
        av_packet_free(&packet);
    }
    av_write_trailer(out);
    avio_closep(&out->pb);
    avformat_free_context(out);
}

}  // namespace testkit
