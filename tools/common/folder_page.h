// A page of the folder listing as the tools show it, in either direction.
#pragma once

#include <string>

#include <json/value.h>

namespace tools {

// The library's listing {"total", "offset", "folder"} for `offset` and `limit` in ascending or
// descending order of `sortBy`, with the refusing rule added to folders that cannot be indexed.
// A descending page is the ascending page that ends `offset` records before the end, reversed,
// so that pages follow each other as ascending ones do. False with the library's error code.
bool ListFolderPage(Json::Value& out, unsigned long offset, unsigned long limit, const std::string& sortBy, bool descending,
                    const Json::Value& additional);

}  // namespace tools
