// Fire-and-forget commands to fileindexd over its unix stream socket.
#include "daemon_channel.h"

#include <sys/socket.h>
#include <sys/time.h>
#include <sys/un.h>
#include <unistd.h>

#include <cerrno>
#include <csignal>
#include <cstdint>
#include <cstring>

#include "fileindex/json.h"
#include "fileindex/root.h"
#include "fileindex/service_state.h"
#include "fileindex/utils.h"
#include "root.h"

namespace QIRA {
namespace FILEINDEX {
namespace detail {
namespace {

constexpr int kZeroWriteRetries = 3;

int ConnectToDaemon() {
    const std::string path = DaemonSocketPath();
    sockaddr_un address;
    std::memset(&address, 0, sizeof address);
    if (path.size() + 1 > sizeof address.sun_path) {
        errno = ENAMETOOLONG;
        return -1;
    }
    const int fd = socket(AF_UNIX, SOCK_STREAM | SOCK_CLOEXEC, 0);
    if (fd < 0) return -1;
    address.sun_family = AF_UNIX;
    std::memcpy(address.sun_path, path.c_str(), path.size() + 1);
    // Set before connecting: Linux bounds a unix stream connect by the send time-out, so a daemon
    // that listens but never accepts cannot hold the caller (and its lock) forever.
    const timeval timeout{1, 0};
    if (setsockopt(fd, SOL_SOCKET, SO_SNDTIMEO, &timeout, sizeof timeout) != 0 ||
        connect(fd, reinterpret_cast<const sockaddr*>(&address), sizeof address) != 0) {
        const int reason = errno;
        close(fd);
        errno = reason;
        return -1;
    }
    return fd;
}

}  // namespace

Json::Value ShareNameData(const std::string& share) {
    Json::Value data(Json::objectValue);
    data["share_name"] = share;
    return data;
}

Json::Value FolderPathData(const std::string& path) {
    Json::Value data(Json::objectValue);
    data["folder_path"] = path;
    return data;
}

bool WriteChunked(int fd, const char* data, size_t size) {
    long offset = 0;
    long remaining = static_cast<long>(size);
    int zeroRetries = 0;
    while (remaining > 0) {
        const size_t piece = remaining < static_cast<long>(kDaemonWriteChunk) ? static_cast<size_t>(remaining)
                                                                              : kDaemonWriteChunk;
        const ssize_t wrote = write(fd, data + offset, piece);
        if (wrote == 0) {
            if (errno != EINTR || ++zeroRetries > kZeroWriteRetries) return false;
            continue;
        }
        if (offset + wrote < 0) return false;
        offset += wrote;
        remaining -= wrote;
    }
    return true;
}

}  // namespace detail

bool DaemonAnswers() {
    const int fd = detail::ConnectToDaemon();
    if (fd < 0) return false;
    close(fd);
    return true;
}

bool SendCammandToDaemon(const std::string& type, const Json::Value& data) {
    signal(SIGPIPE, SIG_IGN);
    const int fd = detail::ConnectToDaemon();
    if (fd < 0) return false;
    Json::Value message(Json::objectValue);
    message["type"] = type;
    message["data"] = data;
    const std::string text = toString(message);
    const uint32_t length = static_cast<uint32_t>(text.size() + 1);
    const bool sent = detail::WriteChunked(fd, reinterpret_cast<const char*>(&length), sizeof length) &&
                      detail::WriteChunked(fd, text.c_str(), text.size() + 1);
    close(fd);
    return sent;
}

}  // namespace FILEINDEX
}  // namespace QIRA
