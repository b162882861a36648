// One logging path for every line of the library: the system log, a host's sink, or both.
#include "log.h"

#include <syslog.h>

#include <atomic>
#include <cerrno>
#include <cstdarg>
#include <cstdio>
#include <memory>
#include <mutex>
#include <string>
#include <vector>

#include "fileindex/log_sink.h"

namespace QIRA {
namespace FILEINDEX {
namespace {

struct Installed {
    LogSink sink;
    void* context;
    LogSinkMode mode;
};

// Replaced whole, so that a line being logged never sees a sink half installed; every sink ever
// installed is kept, since a line may still be on its way to it.
std::atomic<const Installed*> g_installed{nullptr};
std::mutex g_installing;
std::vector<std::unique_ptr<const Installed>> g_kept;

std::string Format(const char* format, va_list args) {
    va_list measure;
    va_copy(measure, args);
    const int length = vsnprintf(nullptr, 0, format, measure);
    va_end(measure);
    if (length <= 0) return std::string();
    std::string text(static_cast<size_t>(length) + 1, '\0');
    vsnprintf(&text[0], text.size(), format, args);
    text.pop_back();
    return text;
}

}  // namespace

void SetLogSink(LogSink sink, void* context, LogSinkMode mode) {
    std::lock_guard<std::mutex> lock(g_installing);
    if (sink != nullptr) g_kept.push_back(std::make_unique<const Installed>(Installed{sink, context, mode}));
    g_installed.store(sink == nullptr ? nullptr : g_kept.back().get());
}

namespace detail {

void Log(int priority, const char* file, int line, const char* format, ...) {
    const int savedErrno = errno;  // for "%m", and unchanged for the caller
    va_list args;
    va_start(args, format);
    errno = savedErrno;
    const std::string message = Format(format, args);
    va_end(args);
    const Installed* installed = g_installed.load();
    if (installed == nullptr || installed->mode == LogSinkMode::BesidesSyslog) {
        syslog(priority, "%s:%d %s", file, line, message.c_str());
    }
    if (installed != nullptr) installed->sink(LogLine{priority, file, line, message.c_str()}, installed->context);
    errno = savedErrno;
}

}  // namespace detail
}  // namespace FILEINDEX
}  // namespace QIRA
