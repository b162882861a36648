// What crosses the extractor's channel: a request as the worker decodes it (from anyone holding
// the socket), and a reply header with text as the daemon decodes it (from a worker a hostile
// file may have subverted). Either decodes within its bounds or says why not.
#include <cstdlib>
#include <string>

#include "protocol.h"
#include "text_safety.h"

extern "C" int LLVMFuzzerTestOneInput(const unsigned char* data, size_t size) {
    const std::string bytes(reinterpret_cast<const char*>(data), size);
    extractor::Request request;
    std::string problem;
    if (extractor::DecodeRequest(bytes, request, problem)) {
        if (request.name.empty() || request.name.size() > extractor::kMaxName || request.name.find('/') != std::string::npos ||
            request.maxText > extractor::kMaxText) {
            abort();
        }
    } else if (problem.empty()) {
        abort();
    }
    // The first line is the header, the rest the text, as the daemon receives them.
    const size_t newline = bytes.find('\n');
    const std::string header = bytes.substr(0, newline);
    const std::string text = newline == std::string::npos ? "" : bytes.substr(newline + 1);
    extractor::Reply reply;
    if (extractor::DecodeReply(header, text, 64, reply, problem)) {
        if (!reply.fields.isObject() || reply.text.size() > 64 || !tools::IsValidUtf8(reply.text) ||
            !tools::IsValidUtf8(reply.mime) || !tools::IsValidUtf8(reply.problem)) {
            abort();
        }
    }
    return 0;
}
