// A stand-in for fileindexd that listens on the sandbox's socket and records every frame.
#pragma once

#include <sys/socket.h>

#include <string>
#include <vector>

#include <json/value.h>

#include "daemon_frame.h"

namespace testkit {

using Frame = tools::DaemonFrame;

// A unix stream socket bound to `path` and listening; -1 on failure.
int ListenUnix(const std::string& path, int backlog, int flags = SOCK_CLOEXEC);

class FakeDaemon {
public:
    explicit FakeDaemon(const std::string& socketPath);
    ~FakeDaemon();
    FakeDaemon(const FakeDaemon&) = delete;
    FakeDaemon& operator=(const FakeDaemon&) = delete;

    // Accepts every connection already made and reads each to its end. Clients of the library
    // close before the call returns, so after a call everything it sent is here.
    std::vector<Frame> Drain();
    // The same, keeping only "type" and "data" of each message.
    std::vector<Json::Value> Messages();

private:
    int fd_;
    std::string path_;
};

}  // namespace testkit
