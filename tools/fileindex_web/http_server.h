// The console's HTTP server, on libmicrohttpd: a few threads each polling many connections with
// epoll, so that idle or trickling connections cost a little memory each, never a thread, and
// real requests keep being answered. A connection is dropped after a spell without a byte, the
// connections and the memory of each are limited, and a request body over the limit is refused.
#pragma once

#include <condition_variable>
#include <deque>
#include <functional>
#include <map>
#include <mutex>
#include <set>
#include <string>
#include <thread>
#include <utility>
#include <vector>

struct MHD_Daemon;
struct MHD_Connection;

namespace web {

struct NoCaseLess {
    bool operator()(const std::string& a, const std::string& b) const;
};

struct Request {
    std::string method;
    std::string path;                                 // decoded
    std::map<std::string, std::string> params;        // the query's, the first of each name
    std::map<std::string, std::string, NoCaseLess> headers;
    std::string body;

    bool HasHeader(const std::string& name) const { return headers.count(name) != 0; }
    std::string Header(const std::string& name) const;  // empty when absent
    bool HasParam(const std::string& name) const { return params.count(name) != 0; }
    std::string Param(const std::string& name) const;   // empty when absent
};

struct Response {
    int status = 200;
    std::string body;
    std::string contentType = "text/plain; charset=utf-8";
    std::vector<std::pair<std::string, std::string>> headers;

    void SetContent(const std::string& content, const std::string& type) {
        body = content;
        contentType = type;
    }
    void SetHeader(const std::string& name, const std::string& value) { headers.emplace_back(name, value); }
};

using Handler = std::function<void(const Request&, Response&)>;
// Runs before the routes: true when it answered the request itself.
using Guard = std::function<bool(const Request&, Response&)>;

struct ServerLimits {
    size_t maxBody = 64 * 1024;               // a longer body is answered 413
    unsigned connections = 4096;              // at once; more wait in the kernel's backlog
    unsigned idleSeconds = 10;                // without a byte from the client
    size_t memoryPerConnection = 32 * 1024;   // for the request's head; a longer head is refused
    unsigned threads = 4;
    unsigned backlog = 1024;
    unsigned workers = 4;        // for slow routes (GetSlow), beside the serving threads
    size_t queuedSlow = 64;      // slow requests waiting for a worker; more are answered 503
};

class HttpServer {
public:
    explicit HttpServer(ServerLimits limits = ServerLimits()) : limits_(limits) {}
    ~HttpServer();
    HttpServer(const HttpServer&) = delete;
    HttpServer& operator=(const HttpServer&) = delete;

    void Get(const std::string& path, Handler handler) { routes_[{"GET", path}] = std::move(handler); }
    void Post(const std::string& path, Handler handler) { routes_[{"POST", path}] = std::move(handler); }
    // A route that may take long: its connection is set aside while a worker answers it, so the
    // serving threads go on answering every other request.
    void GetSlow(const std::string& path, Handler handler) {
        Get(path, std::move(handler));
        slow_.insert(path);
    }
    // GET of a file directly in `dir` (a name of letters, digits, ".", "-" and "_", not starting
    // with "."), "/" being its index.html; links are not followed.
    void ServeFiles(const std::string& dir) { files_ = dir; }
    void SetGuard(Guard guard) { guard_ = std::move(guard); }
    // Headers added to every answer.
    void SetDefaultHeaders(std::vector<std::pair<std::string, std::string>> headers) { defaults_ = std::move(headers); }

    // Starts serving on `host` (a numeric address or a name) and `port` (0: any free one); the
    // port bound, or -1.
    int Listen(const std::string& host, int port);
    void Stop();

    // Called by libmicrohttpd.
    int Answer(MHD_Connection* connection, const char* url, const char* method, const char* upload,
               size_t* uploadSize, void** state);

private:
    bool AnswerLater(MHD_Connection* connection, void* pending);
    // Runs `job` on a worker; false when too many wait already.
    bool Offload(std::function<void()> job);
    void Work();
    void StopWorkers();
    Response Route(const Request& request) const;
    Response ServeFile(const std::string& path) const;

    ServerLimits limits_;
    std::map<std::pair<std::string, std::string>, Handler> routes_;
    std::string files_;
    Guard guard_;
    std::vector<std::pair<std::string, std::string>> defaults_;
    std::set<std::string> slow_;
    MHD_Daemon* daemon_ = nullptr;
    std::mutex jobsMutex_;
    std::condition_variable jobsReady_;
    std::deque<std::function<void()>> jobs_;
    std::vector<std::thread> workers_;
    bool stopping_ = false;
};

}  // namespace web
