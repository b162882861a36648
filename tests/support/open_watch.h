// What inotify reports of the watched paths: opens and reads by default, or the events asked for.
#pragma once

#include <sys/inotify.h>
#include <unistd.h>

#include <string>
#include <vector>

namespace testkit {

class OpenWatch {
public:
    explicit OpenWatch(const std::vector<std::string>& paths, uint32_t mask = IN_OPEN | IN_ACCESS)
        : fd_(inotify_init1(IN_NONBLOCK | IN_CLOEXEC)) {
        for (const auto& path : paths) inotify_add_watch(fd_, path.c_str(), mask);
    }
    ~OpenWatch() { close(fd_); }
    OpenWatch(const OpenWatch&) = delete;
    OpenWatch& operator=(const OpenWatch&) = delete;
    // The names reported since the last call ("." for a watched path itself).
    std::vector<std::string> Opened() {
        std::vector<std::string> names;
        alignas(inotify_event) char buffer[4096];
        ssize_t got;
        while ((got = read(fd_, buffer, sizeof buffer)) > 0) {
            for (ssize_t at = 0; at < got;) {
                const auto* event = reinterpret_cast<const inotify_event*>(buffer + at);
                names.push_back(event->len > 0 ? event->name : ".");
                at += static_cast<ssize_t>(sizeof(inotify_event) + event->len);
            }
        }
        return names;
    }

private:
    int fd_;
};

}  // namespace testkit
