// The library's log lines, sent as the system log would receive them: one datagram per line to a
// listening unix socket that a thread drains, so that a benchmark pays for every line it logs.
#pragma once

#include <atomic>
#include <string>
#include <thread>

namespace bench {

class LogSocket {
public:
    // Binds `path`, starts draining it and routes the library's lines to it.
    explicit LogSocket(const std::string& path);
    ~LogSocket();  // restores the system log
    LogSocket(const LogSocket&) = delete;
    LogSocket& operator=(const LogSocket&) = delete;

    size_t received() const { return received_; }

private:
    void Drain();

    int listener_ = -1;
    int sender_ = -1;
    std::atomic<bool> stopping_{false};
    std::atomic<size_t> received_{0};
    std::thread drainer_;
};

}  // namespace bench
