// Readers of one kind of file each, given the file's bytes (or its descriptor) and the reply to
// fill: text up to `maxText` bytes and the fields of the kind. Each catches what its library
// throws and says so in the reply's problem. Fields:
//   documents: "title", "author", "pages";
//   audio: "title", "artist", "album", "album_artist", "genre", "year", "track", "duration" (s);
//   photos: "taken" ("YYYY-MM-DD HH:MM:SS"), "camera_make", "camera_model", "lens",
//           "orientation", "width", "height", "latitude", "longitude";
//   video: "duration" (s), "width", "height", "codecs" (one name per stream), "created", "title".
#pragma once

#include <string>

#include "protocol.h"

namespace extractor {

void ReadPdf(const std::string& bytes, size_t maxText, Reply& reply);
// OOXML (docx, xlsx, pptx), ODF (odt, ods, odp) and EPUB: a zip of XML parts.
void ReadOfficeDocument(int fd, size_t maxText, Reply& reply);
// The MIME type of such a zip, from its "mimetype" part (ODF, EPUB) or its main part (OOXML), for
// the writers whose zips libmagic does not recognise; "" for any other zip.
std::string OfficeDocumentMime(int fd);
void ReadAudio(int fd, Reply& reply);
void ReadPhoto(const std::string& bytes, Reply& reply);
void ReadVideo(int fd, Reply& reply);

// At most `limit` bytes of valid UTF-8 text, cut at a character's start.
std::string Cut(std::string text, size_t limit);

}  // namespace extractor
