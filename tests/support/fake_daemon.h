// A stand-in for fileindexd that listens on the sandbox's socket and records every frame.
#pragma once

#include <string>
#include <vector>

#include <json/value.h>

namespace testkit {

struct Frame {
    uint32_t length = 0;   // the 4-byte prefix
    std::string payload;   // the bytes after it (length bytes when whole)
    Json::Value message;   // parsed JSON text (null when it does not parse)
    bool whole = false;    // payload has `length` bytes and ends with one NUL
};

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

    static Frame Decode(const std::string& bytes);

private:
    int fd_;
    std::string path_;
};

}  // namespace testkit
