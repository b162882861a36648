#include "log_socket.h"

#include <poll.h>
#include <sys/socket.h>
#include <sys/un.h>
#include <unistd.h>

#include <algorithm>
#include <cstdio>
#include <cstring>

#include "fileindex/log_sink.h"

namespace bench {

namespace {

sockaddr_un AddressOf(const std::string& path) {
    sockaddr_un address{};
    address.sun_family = AF_UNIX;
    std::strncpy(address.sun_path, path.c_str(), sizeof address.sun_path - 1);
    return address;
}

// Formats the line as syslog(3) does for a local socket and sends it.
void SendLine(const QIRA::FILEINDEX::LogLine& line, void* context) {
    char datagram[8192];
    const int length = std::snprintf(datagram, sizeof datagram, "<%d>fileindex: %s:%d %s", line.priority | (1 << 3),
                                     line.file, line.line, line.message);
    if (length > 0) {
        if (getenv("NOSEND") == nullptr) send(*static_cast<int*>(context), datagram, std::min<size_t>(static_cast<size_t>(length), sizeof datagram - 1), 0);
    }
}

}  // namespace

LogSocket::LogSocket(const std::string& path) {
    const sockaddr_un address = AddressOf(path);
    listener_ = socket(AF_UNIX, SOCK_DGRAM | SOCK_CLOEXEC, 0);
    bind(listener_, reinterpret_cast<const sockaddr*>(&address), sizeof address);
    sender_ = socket(AF_UNIX, SOCK_DGRAM | SOCK_CLOEXEC, 0);
    connect(sender_, reinterpret_cast<const sockaddr*>(&address), sizeof address);
    drainer_ = std::thread([this] { Drain(); });
    QIRA::FILEINDEX::SetLogSink(SendLine, &sender_, QIRA::FILEINDEX::LogSinkMode::InsteadOfSyslog);
}

LogSocket::~LogSocket() {
    QIRA::FILEINDEX::SetLogSink(nullptr, nullptr, QIRA::FILEINDEX::LogSinkMode::InsteadOfSyslog);
    stopping_ = true;
    drainer_.join();
    close(sender_);
    close(listener_);
}

void LogSocket::Drain() {
    char datagram[8192];
    while (!stopping_) {
        pollfd ready{listener_, POLLIN, 0};
        if (poll(&ready, 1, 20) <= 0) continue;
        while (recv(listener_, datagram, sizeof datagram, MSG_DONTWAIT) > 0) ++received_;
    }
}

}  // namespace bench
