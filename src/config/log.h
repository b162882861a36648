// The log-line convention: LOG_ERR, "%s:%d " with the source file's name and line, through the
// one logging path of log.cc.
#pragma once

#include <syslog.h>

#include "fileindex/error.h"
#include "qira/qlib_core.h"

namespace QIRA {
namespace FILEINDEX {
namespace detail {

constexpr const char* SourceName(const char* path) {
    const char* name = path;
    for (const char* p = path; *p != '\0'; ++p) {
        if (*p == '/') name = p + 1;
    }
    return name;
}

// Formats one line and hands it to the system log and/or the host's sink (fileindex/log_sink.h).
void Log(int priority, const char* file, int line, const char* format, ...) __attribute__((format(printf, 4, 5)));

}  // namespace detail
}  // namespace FILEINDEX
}  // namespace QIRA

#define FILEIDX_LOG(fmt, ...) \
    ::QIRA::FILEINDEX::detail::Log(LOG_ERR, ::QIRA::FILEINDEX::detail::SourceName(__FILE__), __LINE__, fmt, ##__VA_ARGS__)

// Only when LOG_LEVEL is 7 (contention and short-write lines of the event queue).
#define FILEIDX_DEBUG_LOG(fmt, ...)                                                   \
    do {                                                                              \
        if (::QIRA::FILEINDEX::LOG_LEVEL == 7) FILEIDX_LOG(fmt, ##__VA_ARGS__);       \
    } while (0)

// Logs "<what> failed: err=[0x%04X %s:%d]" with the platform's last error, file and line.
#define FILEIDX_LOG_PLATFORM(what) \
    FILEIDX_LOG(what " failed: err=[0x%04X %s:%d]", QLIBCErrGet(), QLIBCErrorGetFile(), QLIBCErrorGetLine())
