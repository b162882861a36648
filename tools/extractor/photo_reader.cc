#include <cstdio>
#include <stdexcept>

#include <exiv2/exiv2.hpp>

#include "readers.h"
#include "xml_text.h"

namespace extractor {
namespace {

const Exiv2::Exifdatum* Find(const Exiv2::ExifData& exif, const char* key) {
    const auto found = exif.findKey(Exiv2::ExifKey(key));
    return found == exif.end() ? nullptr : &*found;
}

void PutText(Reply& reply, const char* field, const Exiv2::ExifData& exif, const char* key) {
    if (const Exiv2::Exifdatum* datum = Find(exif, key)) {
        const std::string text = Squeezed(datum->toString());
        if (!text.empty()) reply.fields[field] = text;
    }
}

// Degrees from the three rationals of a GPS coordinate, negative south or west.
void PutCoordinate(Reply& reply, const char* field, const Exiv2::ExifData& exif, const char* key, const char* refKey,
                   char negative) {
    const Exiv2::Exifdatum* value = Find(exif, key);
    const Exiv2::Exifdatum* ref = Find(exif, refKey);
    if (value == nullptr || value->count() != 3) return;
    double degrees = 0;
    for (long i = 2; i >= 0; --i) degrees = degrees / 60 + static_cast<double>(value->toFloat(i));
    const std::string side = ref != nullptr ? ref->toString() : "";
    reply.fields[field] = !side.empty() && side[0] == negative ? -degrees : degrees;
}

// "2019:06:14 10:20:30" as "2019-06-14 10:20:30"; nothing when it is not a date of that shape.
void PutDate(Reply& reply, const Exiv2::ExifData& exif) {
    for (const char* key : {"Exif.Photo.DateTimeOriginal", "Exif.Image.DateTime"}) {
        const Exiv2::Exifdatum* datum = Find(exif, key);
        if (datum == nullptr) continue;
        int year, month, day, hour, minute, second;
        if (std::sscanf(datum->toString().c_str(), "%4d:%2d:%2d %2d:%2d:%2d", &year, &month, &day, &hour, &minute, &second) != 6 ||
            month < 1 || month > 12 || day < 1 || day > 31) {
            continue;
        }
        char text[32];
        std::snprintf(text, sizeof text, "%04d-%02d-%02d %02d:%02d:%02d", year, month, day, hour, minute, second);
        reply.fields["taken"] = text;
        return;
    }
}

// Whether exiv2 reported an error (it reports nothing less) since this was last cleared. Its
// messages are kept from the worker's output: a hostile file could otherwise fill the daemon's log.
bool g_metadataDamaged = false;

void NoteError(int, const char*) { g_metadataDamaged = true; }

}  // namespace

void ReadPhoto(const std::string& bytes, Reply& reply) {
    Exiv2::LogMsg::setLevel(Exiv2::LogMsg::error);
    Exiv2::LogMsg::setHandler(NoteError);
    g_metadataDamaged = false;
    try {
        const auto image = Exiv2::ImageFactory::open(reinterpret_cast<const Exiv2::byte*>(bytes.data()), static_cast<long>(bytes.size()));
        image->readMetadata();
        // Metadata exiv2 found damaged and skipped whole (a directory of too many entries) is
        // a reason to give; a damaged part beside what was read (a maker's note) is not.
        if (g_metadataDamaged && image->exifData().empty()) throw std::runtime_error("damaged");
        if (image->pixelWidth() > 0) reply.fields["width"] = image->pixelWidth();
        if (image->pixelHeight() > 0) reply.fields["height"] = image->pixelHeight();
        const Exiv2::ExifData& exif = image->exifData();
        PutDate(reply, exif);
        PutText(reply, "camera_make", exif, "Exif.Image.Make");
        PutText(reply, "camera_model", exif, "Exif.Image.Model");
        PutText(reply, "lens", exif, "Exif.Photo.LensModel");
        if (const Exiv2::Exifdatum* orientation = Find(exif, "Exif.Image.Orientation")) {
            reply.fields["orientation"] = static_cast<Json::Int64>(orientation->toLong());
        }
        PutCoordinate(reply, "latitude", exif, "Exif.GPSInfo.GPSLatitude", "Exif.GPSInfo.GPSLatitudeRef", 'S');
        PutCoordinate(reply, "longitude", exif, "Exif.GPSInfo.GPSLongitude", "Exif.GPSInfo.GPSLongitudeRef", 'W');
    } catch (const std::exception&) {
        reply.fields = Json::Value(Json::objectValue);
        reply.problem = "the photo's metadata cannot be read";
    }
}

}  // namespace extractor
