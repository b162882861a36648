// The JSON API of the console: the library's management operations over HTTP.
#pragma once

#include <memory>
#include <string>

#include "host_check.h"
#include "http_server.h"

namespace web {

// The console's token, and the file it is kept in (named when a request lacks it).
struct Token {
    std::string value;
    std::string file;
};

// Routes under /api. Reads answer GET; writes and searches need the token in X-Fileindex-Token;
// writes answer POST with a JSON body, and one from another origin is refused. Library calls run
// one at a time.
void AddApiRoutes(HttpServer& server, const Token& token);

// Answers 421 before any route runs when the request's Host is not one `check` allows.
void GuardHost(HttpServer& server, std::shared_ptr<const HostCheck> check);

}  // namespace web
