#include "fake_daemon.h"

#include <fcntl.h>
#include <sys/socket.h>
#include <sys/un.h>
#include <unistd.h>

#include <algorithm>
#include <cstring>
#include <stdexcept>

#include "fileindex/json.h"

namespace testkit {

int ListenUnix(const std::string& path, int backlog, int flags) {
    const int fd = socket(AF_UNIX, SOCK_STREAM | flags, 0);
    sockaddr_un address{};
    address.sun_family = AF_UNIX;
    // Linux binds a path filling sun_path without a NUL: a client must not reach it by cutting its own.
    std::memcpy(address.sun_path, path.data(), std::min(path.size(), sizeof address.sun_path));
    if (fd >= 0 && (bind(fd, reinterpret_cast<sockaddr*>(&address), sizeof address) != 0 || listen(fd, backlog) != 0)) {
        close(fd);
        return -1;
    }
    return fd;
}

FakeDaemon::FakeDaemon(const std::string& socketPath) : fd_(-1), path_(socketPath) {
    unlink(path_.c_str());
    fd_ = ListenUnix(path_, 512, SOCK_CLOEXEC | SOCK_NONBLOCK);
    if (fd_ < 0) throw std::runtime_error("fake daemon cannot listen on " + path_);
}

FakeDaemon::~FakeDaemon() {
    close(fd_);
    unlink(path_.c_str());
}

std::vector<Frame> FakeDaemon::Drain() {
    std::vector<Frame> frames;
    int client;
    while ((client = accept4(fd_, nullptr, nullptr, SOCK_CLOEXEC)) >= 0) {
        std::string bytes;
        char buffer[4096];
        ssize_t got;
        while ((got = read(client, buffer, sizeof buffer)) > 0) bytes.append(buffer, static_cast<size_t>(got));
        close(client);
        frames.push_back(tools::DecodeDaemonFrame(bytes));
    }
    return frames;
}

std::vector<Json::Value> FakeDaemon::Messages() {
    std::vector<Json::Value> messages;
    for (const auto& frame : Drain()) messages.push_back(frame.message);
    return messages;
}

}  // namespace testkit
