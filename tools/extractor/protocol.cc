#include "protocol.h"

#include <sys/socket.h>
#include <unistd.h>

#include <cerrno>
#include <cstring>

#include "fileindex/json.h"
#include "search_query.h"
#include "text_safety.h"

namespace extractor {
namespace {

bool KnownType(const std::string& type) { return type.empty() || tools::IsSearchTypeName(type); }

// Closes every descriptor of a control message but the first, which it hands back.
int TakeDescriptors(msghdr& message) {
    int kept = -1;
    for (cmsghdr* header = CMSG_FIRSTHDR(&message); header != nullptr; header = CMSG_NXTHDR(&message, header)) {
        if (header->cmsg_level != SOL_SOCKET || header->cmsg_type != SCM_RIGHTS) continue;
        const size_t count = (header->cmsg_len - CMSG_LEN(0)) / sizeof(int);
        for (size_t i = 0; i < count; ++i) {
            int fd;
            std::memcpy(&fd, CMSG_DATA(header) + i * sizeof(int), sizeof fd);
            if (kept < 0) kept = fd;
            else close(fd);
        }
    }
    return kept;
}

}  // namespace

bool DecodeRequest(const std::string& json, Request& request, std::string& problem) {
    Json::Value value;
    if (json.size() > kMaxRequestBytes || !QIRA::FILEINDEX::fromString(value, json) || !value.isObject()) {
        problem = "the request is not a JSON object of at most 4096 bytes";
        return false;
    }
    const Json::Value& name = value["name"];
    const Json::Value& maxText = value["max_text"];
    if (!name.isString() || name.asString().empty() || name.asString().size() > kMaxName ||
        name.asString().find_first_of(std::string("/\0", 2)) != std::string::npos) {
        problem = "\"name\" is not a file name of 1 to 255 bytes";
        return false;
    }
    if (!maxText.isIntegral() || maxText.asLargestInt() < 0 || maxText.asLargestInt() > static_cast<Json::Int64>(kMaxText)) {
        problem = "\"max_text\" is not a whole number from 0 to 1048576";
        return false;
    }
    request.name = name.asString();
    request.maxText = static_cast<size_t>(maxText.asLargestInt());
    return true;
}

std::string EncodeRequest(const Request& request) {
    Json::Value value(Json::objectValue);
    value["name"] = request.name;
    value["max_text"] = static_cast<Json::UInt64>(request.maxText);
    return QIRA::FILEINDEX::toString(value);
}

bool DecodeReply(const std::string& header, std::string text, size_t maxText, Reply& reply, std::string& problem) {
    Json::Value value;
    if (header.size() > kMaxReplyHeader || !QIRA::FILEINDEX::fromString(value, header) || !value.isObject()) {
        problem = "the extractor's answer is not a JSON object";
        return false;
    }
    const Json::Value& type = value["type"];
    const Json::Value& mime = value["mime"];
    const Json::Value& fields = value["fields"];
    const Json::Value& why = value["problem"];
    if (!type.isString() || !KnownType(type.asString()) || !mime.isString() || !fields.isObject() ||
        !(why.isString() || why.isNull()) || text.size() > maxText) {
        problem = "the extractor's answer is malformed";
        return false;
    }
    reply.type = type.asString();
    reply.mime = tools::ValidUtf8(mime.asString(), "?");
    reply.fields = fields;
    reply.problem = why.isString() ? tools::ValidUtf8(why.asString(), "?") : "";
    reply.text = tools::ValidUtf8(text, " ");
    return true;
}

std::string EncodeReplyHeader(const Reply& reply) {
    Json::Value value(Json::objectValue);
    value["type"] = reply.type;
    value["mime"] = reply.mime;
    value["fields"] = reply.fields.isObject() ? reply.fields : Json::Value(Json::objectValue);
    value["problem"] = reply.problem.empty() ? Json::Value() : Json::Value(reply.problem);
    value["text_bytes"] = static_cast<Json::UInt64>(reply.text.size());
    return QIRA::FILEINDEX::toString(value);
}

bool SendAll(int socket, const char* data, size_t size) {
    while (size > 0) {
        const ssize_t sent = send(socket, data, size, MSG_NOSIGNAL);
        if (sent < 0 && errno == EINTR) continue;
        if (sent <= 0) return false;
        data += sent;
        size -= static_cast<size_t>(sent);
    }
    return true;
}

bool ReceiveAll(int socket, char* data, size_t size) {
    while (size > 0) {
        const ssize_t got = recv(socket, data, size, 0);
        if (got < 0 && errno == EINTR) continue;
        if (got <= 0) return false;
        data += got;
        size -= static_cast<size_t>(got);
    }
    return true;
}

bool SendFrame(int socket, const std::string& payload, int fd) {
    const auto length = static_cast<uint32_t>(payload.size());
    iovec part{const_cast<uint32_t*>(&length), sizeof length};
    msghdr message{};
    message.msg_iov = &part;
    message.msg_iovlen = 1;
    alignas(cmsghdr) char control[CMSG_SPACE(sizeof(int))];
    if (fd >= 0) {
        message.msg_control = control;
        message.msg_controllen = sizeof control;
        cmsghdr* header = CMSG_FIRSTHDR(&message);
        header->cmsg_level = SOL_SOCKET;
        header->cmsg_type = SCM_RIGHTS;
        header->cmsg_len = CMSG_LEN(sizeof(int));
        std::memcpy(CMSG_DATA(header), &fd, sizeof fd);
    }
    ssize_t sent;
    do {
        sent = sendmsg(socket, &message, MSG_NOSIGNAL);
    } while (sent < 0 && errno == EINTR);
    if (sent != static_cast<ssize_t>(sizeof length)) return false;
    return SendAll(socket, payload.data(), payload.size());
}

bool ReceiveFrame(int socket, size_t maxBytes, std::string& payload, int* fd) {
    uint32_t length = 0;
    iovec part{&length, sizeof length};
    msghdr message{};
    message.msg_iov = &part;
    message.msg_iovlen = 1;
    alignas(cmsghdr) char control[CMSG_SPACE(sizeof(int) * 4)];
    message.msg_control = control;
    message.msg_controllen = sizeof control;
    ssize_t got;
    do {
        got = recvmsg(socket, &message, MSG_CMSG_CLOEXEC | MSG_WAITALL);
    } while (got < 0 && errno == EINTR);
    int passed = TakeDescriptors(message);
    bool whole = got == static_cast<ssize_t>(sizeof length);
    if (whole && length > maxBytes) {
        errno = EMSGSIZE;
        whole = false;
    }
    if (whole) {
        payload.assign(length, '\0');
        whole = length == 0 || ReceiveAll(socket, &payload[0], length);
    }
    if (fd != nullptr && whole) {
        *fd = passed;
        passed = -1;
    }
    if (passed >= 0) close(passed);
    return whole;
}

}  // namespace extractor
