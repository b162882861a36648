// The JSON API of the console: the library's management operations over HTTP.
#pragma once

#include <string>

#include <httplib.h>

namespace web {

// Routes under /api. Reads answer GET; writes answer POST with a JSON body and need the token in
// X-Fileindex-Token; a write from another origin is refused. Library calls run one at a time.
void AddApiRoutes(httplib::Server& server, const std::string& token);

}  // namespace web
