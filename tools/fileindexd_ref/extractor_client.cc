#include "extractor_client.h"

#include <poll.h>
#include <signal.h>
#include <spawn.h>
#include <sys/socket.h>
#include <sys/syscall.h>
#include <sys/wait.h>
#include <unistd.h>

#include <cerrno>
#include <climits>
#include <cstring>
#include <vector>

#include "fileindex/json.h"

extern char** environ;

namespace fileindexd_ref {
namespace {

using Clock = std::chrono::steady_clock;

// How long a worker whose answer broke off may take to end.
constexpr int kEndingMs = 1000;

std::string SignalText(int signal) {
    switch (signal) {
        case SIGXCPU: return "the extractor ran past its CPU time limit";
        case SIGSYS: return "the extractor tried a system call its sandbox forbids";
        default: return "the extractor was stopped by signal " + std::to_string(signal);
    }
}

// Reads `size` bytes before `deadline`; false when the stream ends, fails or time runs out
// (`late` set then).
bool ReadBefore(int socket, char* data, size_t size, Clock::time_point deadline, bool& late) {
    while (size > 0) {
        const auto left = std::chrono::duration_cast<std::chrono::milliseconds>(deadline - Clock::now()).count();
        pollfd pfd{socket, POLLIN, 0};
        const int ready = left > 0 ? poll(&pfd, 1, static_cast<int>(std::min<long long>(left, INT_MAX))) : 0;
        if (ready < 0 && errno == EINTR) continue;
        if (ready == 0) late = true;
        if (ready <= 0) return false;
        const ssize_t got = recv(socket, data, size, MSG_DONTWAIT);
        if (got < 0 && (errno == EINTR || errno == EAGAIN)) continue;
        if (got <= 0) return false;
        data += got;
        size -= static_cast<size_t>(got);
    }
    return true;
}

bool ReadFrameBefore(int socket, size_t maxBytes, std::string& payload, Clock::time_point deadline, bool& late) {
    uint32_t length = 0;
    if (!ReadBefore(socket, reinterpret_cast<char*>(&length), sizeof length, deadline, late) || length > maxBytes) {
        return false;
    }
    payload.assign(length, '\0');
    return length == 0 || ReadBefore(socket, &payload[0], length, deadline, late);
}

// The "text_bytes" of a reply header, bounded by `maxText`; -1 when missing or out of bounds.
long long TextBytes(const std::string& header, size_t maxText) {
    Json::Value value;
    if (!QIRA::FILEINDEX::fromString(value, header) || !value.isObject() || !value["text_bytes"].isIntegral()) return -1;
    const long long bytes = value["text_bytes"].asLargestInt();
    return bytes >= 0 && static_cast<unsigned long long>(bytes) <= maxText ? bytes : -1;
}

}  // namespace

std::string DefaultExtractorProgram() {
    char self[PATH_MAX];
    const ssize_t length = readlink("/proc/self/exe", self, sizeof self - 1);
    if (length <= 0) return "fileindex-extractor";
    const std::string program(self, static_cast<size_t>(length));
    return program.substr(0, program.rfind('/') + 1) + "fileindex-extractor";
}

bool ExtractorClient::Start() {
    int ends[2];
    if (socketpair(AF_UNIX, SOCK_STREAM | SOCK_CLOEXEC, 0, ends) != 0) return false;
    posix_spawn_file_actions_t actions;
    posix_spawn_file_actions_init(&actions);
    posix_spawn_file_actions_adddup2(&actions, ends[1], STDIN_FILENO);
    const std::string memory = std::to_string(settings_.limits.memoryMiB);
    const std::string cpu = std::to_string(settings_.limits.cpuSeconds);
    std::vector<char*> argv = {const_cast<char*>(settings_.program.c_str()), const_cast<char*>("--memory"),
                               const_cast<char*>(memory.c_str()), const_cast<char*>("--cpu"),
                               const_cast<char*>(cpu.c_str()), nullptr};
    const int spawned = posix_spawn(&pid_, settings_.program.c_str(), &actions, nullptr, argv.data(), environ);
    posix_spawn_file_actions_destroy(&actions);
    close(ends[1]);
    if (spawned != 0) {
        pid_ = 0;
        close(ends[0]);
        return false;
    }
    socket_ = ends[0];
    return true;
}

std::string ExtractorClient::Stop() {
    if (socket_ >= 0) close(socket_);
    socket_ = -1;
    if (pid_ == 0) return "the extractor ended";
    // A worker whose answer broke off is ending: give it a moment to, then make sure it has.
    const int pidfd = static_cast<int>(syscall(SYS_pidfd_open, pid_, 0));
    pollfd pfd{pidfd, POLLIN, 0};
    if (pidfd >= 0) {
        while (poll(&pfd, 1, kEndingMs) < 0 && errno == EINTR) {
        }
        close(pidfd);
    }
    int status = 0;
    if (waitpid(pid_, &status, WNOHANG) != pid_) {
        kill(pid_, SIGKILL);
        waitpid(pid_, &status, 0);
        status = 0;  // stopped by us: the caller names the reason
    }
    pid_ = 0;
    return WIFSIGNALED(status) ? SignalText(WTERMSIG(status)) : "the extractor ended";
}

extractor::Reply ExtractorClient::Extract(int fd, const std::string& name, size_t maxText) {
    extractor::Reply reply;
    reply.fields = Json::Value(Json::objectValue);
    if (pid_ == 0 && !Start()) {
        reply.problem = "the extractor cannot be started";
        return reply;
    }
    const auto deadline = Clock::now() + settings_.deadline;
    bool late = false;
    std::string header;
    std::string text;
    const bool answered = extractor::SendFrame(socket_, extractor::EncodeRequest({name, maxText}), fd) &&
                          ReadFrameBefore(socket_, extractor::kMaxReplyHeader, header, deadline, late);
    const long long textBytes = answered ? TextBytes(header, maxText) : -1;
    if (textBytes >= 0) {
        text.assign(static_cast<size_t>(textBytes), '\0');
        if (textBytes == 0 || ReadBefore(socket_, &text[0], text.size(), deadline, late)) {
            std::string problem;
            if (extractor::DecodeReply(header, std::move(text), maxText, reply, problem)) return reply;
            reply.problem = problem;
            Stop();
            return reply;
        }
    }
    const std::string ended = Stop();
    if (late) reply.problem = "the extractor took longer than " + std::to_string(settings_.deadline.count()) + " ms";
    else if (answered) reply.problem = "the extractor's answer is malformed";
    else reply.problem = ended;
    return reply;
}

}  // namespace fileindexd_ref
