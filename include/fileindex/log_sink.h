// Where the library's log lines go.
//
// Every failure the library detects is logged as one line: by default to the system log, at
// LOG_ERR, as "file.cc:line message". A host that wants the lines itself (to show them with the
// failure they explain, or to route them to its own log) installs a sink. Install it once at start,
// before other threads call the library; installing again later is safe, but a line logged at that
// moment may reach either sink.
#pragma once

#include "fileindex/export.h"

namespace QIRA {
namespace FILEINDEX {

struct LogLine {
    int priority;         // syslog priority, LOG_ERR for every line of the library
    const char* file;     // source file name without directories, e.g. "config.cc"
    int line;             // source line
    const char* message;  // the text after "file.cc:line ", e.g. "Failed to lock folder"
};

// Called on the logging thread for every line; it must not call back into the library.
using LogSink = void (*)(const LogLine& line, void* context);

enum class LogSinkMode {
    BesidesSyslog,   // the sink receives each line and the system log still does
    InsteadOfSyslog, // only the sink receives them
};

// Installs `sink` (with `context` passed back to it); a null sink restores the system log alone.
FILEINDEX_EXPORT void SetLogSink(LogSink sink, void* context, LogSinkMode mode);

}  // namespace FILEINDEX
}  // namespace QIRA
