// Running the tools as separate processes.
#pragma once

#include <sys/types.h>

#include <string>
#include <vector>

namespace testkit {

struct RunResult {
    int status = -1;  // exit status
    std::string out;
    std::string err;
};

// Runs argv[0] with the arguments, feeding `input` on stdin, and waits for it.
RunResult Run(const std::vector<std::string>& argv, const std::string& input = std::string());

// Starts argv[0] in the background with stdout and stderr going to `logFile`.
pid_t Start(const std::vector<std::string>& argv, const std::string& logFile);
// SIGTERM and wait; returns the exit status (-1 when it did not exit normally).
int Stop(pid_t pid);

// Polls `done` every 2 ms, at most `attempts` times.
template <typename F>
bool WaitFor(F done, int attempts = 2500);

}  // namespace testkit

#include <unistd.h>

template <typename F>
bool testkit::WaitFor(F done, int attempts) {
    for (int i = 0; i < attempts; ++i) {
        if (done()) return true;
        usleep(2000);
    }
    return done();
}
