// A page of the folder listing as the tools show it, in either direction.
#pragma once

#include <string>

#include <json/value.h>

namespace tools {

// The additional facts a listing may ask for: the library's "status" and "is_valid", and
// "indexed_files", the files the share's index holds beneath each folder (null when the index
// could not be read; read as a search reads it).
bool IsListingFact(const std::string& name);

// The library's listing {"total", "offset", "folder"} for `offset` and `limit` in ascending or
// descending order of `sortBy`, with the refusing rule added to folders that cannot be indexed
// and the facts of `additional` that the tools add.
// A descending page is the ascending page that ends `offset` records before the end, reversed,
// so that pages follow each other as ascending ones do. False with the library's error code.
bool ListFolderPage(Json::Value& out, unsigned long offset, unsigned long limit, const std::string& sortBy, bool descending,
                    const Json::Value& additional);

}  // namespace tools
