#include "http_server.h"

#include <fcntl.h>
#include <netdb.h>
#include <strings.h>
#include <sys/stat.h>
#include <unistd.h>

#include <atomic>
#include <cctype>
#include <cstring>
#include <memory>

#include <microhttpd.h>

namespace web {
namespace {

// What a request gathers while its body arrives.
struct Pending {
    Request request;
    bool tooLarge = false;
    std::atomic<bool> done{false};   // the worker's answer is in `response`
    Response response;
};

MHD_Result Collect(void* into, MHD_ValueKind, const char* key, const char* value) {
    static_cast<std::map<std::string, std::string>*>(into)->emplace(key, value != nullptr ? value : "");
    return MHD_YES;
}

MHD_Result CollectHeader(void* into, MHD_ValueKind, const char* key, const char* value) {
    static_cast<std::map<std::string, std::string, NoCaseLess>*>(into)->emplace(key, value != nullptr ? value : "");
    return MHD_YES;
}

MHD_Result Dispatch(void* server, MHD_Connection* connection, const char* url, const char* method, const char*,
                    const char* upload, size_t* uploadSize, void** state) {
    return static_cast<HttpServer*>(server)->Answer(connection, url, method, upload, uploadSize, state) == MHD_YES
               ? MHD_YES
               : MHD_NO;
}

void Completed(void*, MHD_Connection*, void** state, MHD_RequestTerminationCode) {
    delete static_cast<Pending*>(*state);
    *state = nullptr;
}

std::string ContentTypeOf(const std::string& name) {
    static const std::map<std::string, std::string> types = {{".html", "text/html; charset=utf-8"},
                                                             {".js", "text/javascript; charset=utf-8"},
                                                             {".css", "text/css; charset=utf-8"},
                                                             {".svg", "image/svg+xml"},
                                                             {".png", "image/png"}};
    const size_t dot = name.rfind('.');
    const auto found = dot == std::string::npos ? types.end() : types.find(name.substr(dot));
    return found == types.end() ? "application/octet-stream" : found->second;
}

bool IsPlainName(const std::string& name) {
    if (name.empty() || name[0] == '.') return false;
    for (const char c : name) {
        if (!std::isalnum(static_cast<unsigned char>(c)) && c != '.' && c != '-' && c != '_') return false;
    }
    return true;
}

Response NotFound() {
    Response response;
    response.status = 404;
    response.body = "not found\n";
    return response;
}

// The first address `host` names, for binding.
bool AddressOf(const std::string& host, int port, sockaddr_storage& address, socklen_t& length) {
    addrinfo hints{};
    hints.ai_family = AF_UNSPEC;
    hints.ai_socktype = SOCK_STREAM;
    hints.ai_flags = AI_PASSIVE;
    addrinfo* found = nullptr;
    if (getaddrinfo(host.c_str(), std::to_string(port).c_str(), &hints, &found) != 0 || found == nullptr) return false;
    std::unique_ptr<addrinfo, decltype(&freeaddrinfo)> owner(found, freeaddrinfo);
    std::memcpy(&address, found->ai_addr, found->ai_addrlen);
    length = found->ai_addrlen;
    return true;
}

}  // namespace

bool NoCaseLess::operator()(const std::string& a, const std::string& b) const {
    return strcasecmp(a.c_str(), b.c_str()) < 0;
}

std::string Request::Header(const std::string& name) const {
    const auto found = headers.find(name);
    return found == headers.end() ? "" : found->second;
}

std::string Request::Param(const std::string& name) const {
    const auto found = params.find(name);
    return found == params.end() ? "" : found->second;
}

HttpServer::~HttpServer() { Stop(); }

int HttpServer::Listen(const std::string& host, int port) {
    sockaddr_storage address{};
    socklen_t length = 0;
    if (!AddressOf(host, port, address, length)) return -1;
    unsigned flags = MHD_USE_EPOLL_INTERNAL_THREAD | MHD_USE_TURBO | MHD_ALLOW_SUSPEND_RESUME;
    if (address.ss_family == AF_INET6) flags |= MHD_USE_IPv6;
    daemon_ = MHD_start_daemon(flags, static_cast<uint16_t>(port), nullptr, nullptr, &Dispatch, this,
                               MHD_OPTION_SOCK_ADDR, reinterpret_cast<sockaddr*>(&address),
                               MHD_OPTION_THREAD_POOL_SIZE, limits_.threads,
                               MHD_OPTION_CONNECTION_LIMIT, limits_.connections,
                               MHD_OPTION_CONNECTION_TIMEOUT, limits_.idleSeconds,
                               MHD_OPTION_CONNECTION_MEMORY_LIMIT, limits_.memoryPerConnection,
                               MHD_OPTION_LISTEN_BACKLOG_SIZE, limits_.backlog,
                               MHD_OPTION_NOTIFY_COMPLETED, &Completed, nullptr,
                               MHD_OPTION_END);
    if (daemon_ == nullptr) return -1;
    {
        std::lock_guard<std::mutex> lock(jobsMutex_);
        stopping_ = false;
    }
    for (unsigned i = 0; i < limits_.workers; ++i) workers_.emplace_back([this] { Work(); });
    const MHD_DaemonInfo* info = MHD_get_daemon_info(daemon_, MHD_DAEMON_INFO_BIND_PORT);
    return info != nullptr ? info->port : -1;
}

void HttpServer::Stop() {
    StopWorkers();  // every suspended connection is resumed before the daemon stops
    if (daemon_ != nullptr) MHD_stop_daemon(daemon_);
    daemon_ = nullptr;
}

// Suspends the connection while a worker routes the request; resumed, it is answered with the
// worker's response. False when no worker can take it.
bool HttpServer::AnswerLater(MHD_Connection* connection, void* state) {
    auto& pending = *static_cast<Pending*>(state);
    MHD_suspend_connection(connection);
    const bool taken = Offload([this, connection, &pending] {
        pending.response = Route(pending.request);
        pending.done = true;
        MHD_resume_connection(connection);
    });
    if (!taken) MHD_resume_connection(connection);
    return taken;
}

bool HttpServer::Offload(std::function<void()> job) {
    std::lock_guard<std::mutex> lock(jobsMutex_);
    if (stopping_ || jobs_.size() >= limits_.queuedSlow) return false;
    jobs_.push_back(std::move(job));
    jobsReady_.notify_one();
    return true;
}

void HttpServer::Work() {
    while (true) {
        std::function<void()> job;
        {
            std::unique_lock<std::mutex> lock(jobsMutex_);
            jobsReady_.wait(lock, [this] { return stopping_ || !jobs_.empty(); });
            if (jobs_.empty()) return;
            job = std::move(jobs_.front());
            jobs_.pop_front();
        }
        job();
    }
}

// Lets the workers finish what waits, then ends them.
void HttpServer::StopWorkers() {
    {
        std::lock_guard<std::mutex> lock(jobsMutex_);
        stopping_ = true;
    }
    jobsReady_.notify_all();
    for (auto& worker : workers_) worker.join();
    workers_.clear();
}

// Called first with no state (the head has arrived), then with each piece of the body, then once
// more with none left: the moment to answer.
int HttpServer::Answer(MHD_Connection* connection, const char* url, const char* method, const char* upload,
                       size_t* uploadSize, void** state) {
    if (*state == nullptr) {
        auto pending = std::make_unique<Pending>();
        pending->request.method = method;
        pending->request.path = url;
        MHD_get_connection_values(connection, MHD_GET_ARGUMENT_KIND, &Collect, &pending->request.params);
        MHD_get_connection_values(connection, MHD_HEADER_KIND, &CollectHeader, &pending->request.headers);
        *state = pending.release();
        return MHD_YES;
    }
    Pending& pending = *static_cast<Pending*>(*state);
    if (*uploadSize != 0) {
        if (pending.request.body.size() + *uploadSize > limits_.maxBody) pending.tooLarge = true;
        if (!pending.tooLarge) pending.request.body.append(upload, *uploadSize);
        *uploadSize = 0;
        return MHD_YES;
    }
    Response response;
    if (pending.done) {
        response = std::move(pending.response);
    } else if (pending.tooLarge) {
        response.status = MHD_HTTP_CONTENT_TOO_LARGE;
        response.body = "the request body is over " + std::to_string(limits_.maxBody) + " bytes\n";
    } else if (!guard_ || !guard_(pending.request, response)) {
        if (pending.request.method == "GET" && slow_.count(pending.request.path) != 0) {
            if (AnswerLater(connection, &pending)) return MHD_YES;
            response.status = MHD_HTTP_SERVICE_UNAVAILABLE;
            response.body = "too many slow requests wait; try again\n";
            response.headers.emplace_back("Retry-After", "1");
        } else {
            response = Route(pending.request);
        }
    }
    MHD_Response* answer =
        MHD_create_response_from_buffer(response.body.size(), response.body.data(), MHD_RESPMEM_MUST_COPY);
    if (answer == nullptr) return MHD_NO;
    for (const auto& [name, value] : defaults_) MHD_add_response_header(answer, name.c_str(), value.c_str());
    for (const auto& [name, value] : response.headers) MHD_add_response_header(answer, name.c_str(), value.c_str());
    MHD_add_response_header(answer, MHD_HTTP_HEADER_CONTENT_TYPE, response.contentType.c_str());
    const MHD_Result queued = MHD_queue_response(connection, static_cast<unsigned>(response.status), answer);
    MHD_destroy_response(answer);
    return queued;
}

Response HttpServer::Route(const Request& request) const {
    const auto route = routes_.find({request.method, request.path});
    if (route != routes_.end()) {
        Response response;
        route->second(request, response);
        return response;
    }
    if (request.method == "GET" && !files_.empty()) return ServeFile(request.path == "/" ? "/index.html" : request.path);
    return NotFound();
}

Response HttpServer::ServeFile(const std::string& path) const {
    const std::string name = path.substr(1);
    if (!IsPlainName(name)) return NotFound();
    const int fd = open((files_ + "/" + name).c_str(), O_RDONLY | O_NOFOLLOW | O_NONBLOCK | O_CLOEXEC);
    if (fd < 0) return NotFound();
    struct stat st;
    Response response;
    if (fstat(fd, &st) != 0 || !S_ISREG(st.st_mode) || st.st_size > (off_t{16} << 20)) {
        close(fd);
        return NotFound();
    }
    response.body.resize(static_cast<size_t>(st.st_size));
    const ssize_t got = response.body.empty() ? 0 : pread(fd, &response.body[0], response.body.size(), 0);
    close(fd);
    if (got != st.st_size) return NotFound();
    response.contentType = ContentTypeOf(name);
    return response;
}

}  // namespace web
