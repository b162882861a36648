// Why an operation failed, for a person and a script alike: the library's error code when it set
// one; otherwise a cause derived from the step that failed, as the library's log lines name it
// (the daemon did not answer, a platform call failed, a share is unknown, ...). A failure is never
// reported with the code of success.
#pragma once

#include <string>

namespace tools {

struct Cause {
    std::string name;  // "FILEINDEX_ERR_LOCK", or a derived one such as "DAEMON_UNREACHABLE"
    int number = 0;    // the library's error code; 0 for a derived cause
    std::string text;  // what went wrong, in words
    int httpStatus = 500;
};

// The cause of the failure that the library's present error code and the captured log tell.
Cause CauseOfFailure();

}  // namespace tools
