#include "file_types.h"

#include <algorithm>
#include <cctype>
#include <set>

namespace tools {
namespace {

std::string Extension(const std::string& name) {
    const size_t dot = name.rfind('.');
    if (dot == std::string::npos || dot == 0 || dot + 1 == name.size()) return "";
    std::string extension = name.substr(dot + 1);
    std::transform(extension.begin(), extension.end(), extension.begin(), [](unsigned char c) { return std::tolower(c); });
    return extension;
}

const std::set<std::string> kPlainText = {"txt", "md", "csv", "json", "log", "ini", "yaml", "yml", "xml", "html",
                                          "c", "cc", "cpp", "h", "hpp", "py", "js", "ts", "java", "go", "rs", "sh", "tex"};
const std::set<std::string> kOtherDocuments = {"pdf", "doc", "docx", "odt", "rtf", "xls", "xlsx", "ods", "ppt", "pptx"};
const std::set<std::string> kAudio = {"mp3", "flac", "wav", "ogg", "m4a", "aac", "opus", "wma"};
const std::set<std::string> kVideo = {"mp4", "mkv", "avi", "mov", "webm", "m4v", "wmv", "mpg"};
const std::set<std::string> kPhoto = {"jpg", "jpeg", "png", "gif", "heic", "webp", "tif", "tiff", "bmp", "raw"};

}  // namespace

std::string FileTypeOf(const std::string& name) {
    const std::string extension = Extension(name);
    if (kPlainText.count(extension) != 0 || kOtherDocuments.count(extension) != 0) return "document";
    if (kAudio.count(extension) != 0) return "audio";
    if (kVideo.count(extension) != 0) return "video";
    if (kPhoto.count(extension) != 0) return "photo";
    return "";
}

bool HasPlainText(const std::string& name) { return kPlainText.count(Extension(name)) != 0; }

}  // namespace tools
