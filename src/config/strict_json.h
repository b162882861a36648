// The strict reading of JSON text, with a jsoncpp reader that a caller reading many texts keeps.
#pragma once

#include <memory>
#include <string>

#include <json/reader.h>
#include <json/value.h>

namespace QIRA {
namespace FILEINDEX {
namespace detail {

// True when the strict reading surely refuses the text, seen without parsing it: a "/" outside
// strings, a string left open, or brackets that do not balance.
bool StrictReadingRefuses(const char* begin, const char* end);

// Appends the whole content of `path` to `text`; false when it cannot be read.
bool ReadWholeFile(const std::string& path, std::string& text);

// Removes the temporaries "<file>.XXXXXX" that saves killed before their rename left beside
// `path`. REQUIRES: the file's lock is held, so that no save is writing one now.
void RemoveSaveTemporaries(const std::string& path);

class StrictJsonReader {
public:
    StrictJsonReader();
    // No comments, no trailing commas, nothing but white space after the value, at most
    // kJsonNestingLimit levels; false on any error, `out` then unchanged.
    bool Parse(const char* begin, const char* end, Json::Value& out);

private:
    std::unique_ptr<Json::CharReader> reader_;
};

}  // namespace detail
}  // namespace FILEINDEX
}  // namespace QIRA
