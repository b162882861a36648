// Small files of each kind the extractor reads, made here with the same libraries or by hand, so
// that every test knows exactly what they hold.
#pragma once

#include <cstdint>
#include <string>

namespace testkit {

// A one-page PDF whose information holds `title` and `author` and whose page shows `sentence`
// (printable ASCII, no parentheses or backslashes).
std::string MakePdf(const std::string& title, const std::string& author, const std::string& sentence);

// A PDF of a few KiB whose page draws a form that draws the next form ten times, nine deep: a
// billion drawings for whoever reads its text.
std::string MakeEndlessPdf();

// A JPEG whose EXIF lists `comments` entries, each claiming 4 GiB of data (5,000 fill most of
// the segment's 64 KiB), then the date, 2020:02:29 23:59:59, then `nextDirectory` as the offset
// of a next directory (0 for none).
std::string MakeJpegWithExif(uint32_t comments, uint32_t nextDirectory);

// A docx or an odt (`odt`) whose body is `text` and whose properties hold `title` and `author`.
std::string MakeOfficeDocument(bool odt, const std::string& title, const std::string& author, const std::string& text);

// A docx whose body expands from a few KiB to 17 MiB: a zip bomb.
std::string MakeZipBomb();

// Writes an MPEG audio file of a second or so with these ID3v2 tags to `path`.
void WriteMp3(const std::string& path, const std::string& title, const std::string& artist, const std::string& album,
              unsigned year);

// Writes a FLAC file that says it holds `seconds` of audio (it holds no frames), with these
// Vorbis comments, to `path`.
void WriteFlac(const std::string& path, const std::string& title, const std::string& artist, const std::string& album,
               unsigned year, unsigned seconds);

// Writes a 1 x 1 JPEG to `path` whose EXIF says when it was taken ("YYYY:MM:DD HH:MM:SS"), and the
// camera's make and model.
void WriteJpeg(const std::string& path, const std::string& taken, const std::string& make, const std::string& model);

// A HEIC photo (its image left out) whose EXIF says when it was taken and with which camera, and
// whose properties give its size.
std::string MakeHeic(const std::string& taken, const std::string& make, const std::string& model, unsigned width,
                     unsigned height);

// Writes a Matroska video of `seconds` one-second frames of 4 x 2 grey pixels, titled `title`.
void WriteVideo(const std::string& path, int seconds, const std::string& title);

}  // namespace testkit
