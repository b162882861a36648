// What kind of file a name is, by its extension, as the indexer sorts files under the four
// switches of the folder that governs them.
#pragma once

#include <string>

namespace tools {

// "document", "audio", "video", "photo", or "" for a file of none of these kinds.
std::string FileTypeOf(const std::string& name);

// True for plain-text documents (text, markdown, CSV, JSON, source files), whose text is indexed.
bool HasPlainText(const std::string& name);

}  // namespace tools
