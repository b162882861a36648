// The JSON API of the console: the library's management operations over HTTP.
#pragma once

#include <memory>
#include <string>

#include "host_check.h"
#include "http_server.h"

namespace web {

// Routes under /api. Reads answer GET; writes answer POST with a JSON body and need the token in
// X-Fileindex-Token; a write from another origin is refused. Library calls run one at a time.
void AddApiRoutes(HttpServer& server, const std::string& token);

// Answers 421 before any route runs when the request's Host is not one `check` allows.
void GuardHost(HttpServer& server, std::shared_ptr<const HostCheck> check);

}  // namespace web
