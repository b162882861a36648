// The daemon channel's frame as a receiver decodes it: a 4-byte length N in host byte order,
// then N bytes, the JSON text and one NUL. Shared by the daemon stand-in and the tests' fake
// daemon.
#pragma once

#include <cstdint>
#include <cstring>
#include <string>

#include <json/value.h>

#include "fileindex/json.h"

namespace tools {

struct DaemonFrame {
    uint32_t length = 0;   // the 4-byte prefix
    std::string payload;   // the bytes after it
    bool whole = false;    // payload has `length` bytes and ends with one NUL
    Json::Value message;   // the JSON text, null when the frame is not whole or not JSON
};

inline DaemonFrame DecodeDaemonFrame(const std::string& bytes) {
    DaemonFrame frame;
    if (bytes.size() < sizeof frame.length) return frame;
    std::memcpy(&frame.length, bytes.data(), sizeof frame.length);
    frame.payload = bytes.substr(sizeof frame.length);
    frame.whole = frame.payload.size() == frame.length && !frame.payload.empty() && frame.payload.back() == '\0';
    if (frame.whole) QIRA::FILEINDEX::fromString(frame.message, frame.payload.substr(0, frame.payload.size() - 1));
    return frame;
}

}  // namespace tools
