// The extractor's channel: the indexing daemon asks, over a stream socket, for what a file holds;
// the worker answers. A request is a frame with the file's descriptor attached (SCM_RIGHTS); a
// reply is a frame followed by the extracted text. Frames are a 4-byte length in host byte order
// and that many bytes of JSON. Both sides decode what they read within fixed bounds: the worker
// reads what any process holding the socket may send, the daemon what a worker that a hostile file
// may have subverted answers.
#pragma once

#include <cstddef>
#include <cstdint>
#include <string>

#include <json/value.h>

namespace extractor {

constexpr size_t kMaxRequestBytes = 4096;
constexpr size_t kMaxName = 255;
constexpr size_t kMaxText = 1 << 20;
constexpr size_t kMaxReplyHeader = 64 * 1024;

struct Request {
    std::string name;     // the file's name: no "/", 1 to kMaxName bytes
    size_t maxText = 0;   // text wanted at most, in bytes: 0 to kMaxText
};

struct Reply {
    std::string type;     // "document", "audio", "video", "photo", or "" for none of them
    std::string mime;     // as the content reads, e.g. "text/html"
    Json::Value fields;   // an object of what was found besides the text (title, author, ...)
    std::string problem;  // why nothing could be extracted; "" when all went well
    std::string text;     // valid UTF-8, at most the request's maxText bytes
};

// The JSON of a request frame, without its length; false with `problem` naming the fault.
bool DecodeRequest(const std::string& json, Request& request, std::string& problem);
std::string EncodeRequest(const Request& request);

// A reply's header frame (JSON) and text; false with `problem` naming the fault.
bool DecodeReply(const std::string& header, std::string text, size_t maxText, Reply& reply, std::string& problem);
// The header frame's JSON; the text follows it, its length in the header.
std::string EncodeReplyHeader(const Reply& reply);

// Frames over a stream socket. SendFrame attaches `fd` when it is not negative; ReceiveFrame takes
// at most one descriptor (close-on-exec; -1 when none came), closes any other sent along, and
// refuses a frame longer than `maxBytes`. False on end of stream, an error or a refused frame
// (errno EMSGSIZE), with every descriptor received closed.
bool SendFrame(int socket, const std::string& payload, int fd = -1);
bool ReceiveFrame(int socket, size_t maxBytes, std::string& payload, int* fd = nullptr);
bool SendAll(int socket, const char* data, size_t size);
bool ReceiveAll(int socket, char* data, size_t size);

}  // namespace extractor
