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
// Starts argv[0] as Start does and waits until its log says it listens on a loopback port: that
// port, or 0 when it never said so.
int StartListening(const std::vector<std::string>& argv, const std::string& logFile, pid_t& pid);
// SIGTERM and wait; returns the exit status (-1 when it did not exit normally).
int Stop(pid_t pid);

// Runs `call` in a forked child that SIGALRM ends after `seconds`: 1 when it returned true,
// 0 when false, -1 when it did not return in time.
template <typename F>
int RunBounded(unsigned seconds, F call);

// Polls `done` every 2 ms until it holds; gives up after two minutes, a guard against a hang
// rather than a deadline any step is expected to meet.
template <typename F>
bool WaitFor(F done);

}  // namespace testkit

#include <sys/wait.h>
#include <unistd.h>

#include <ctime>

template <typename F>
int testkit::RunBounded(unsigned seconds, F call) {
    const pid_t pid = fork();
    if (pid == 0) {
        alarm(seconds);
        _exit(call() ? 1 : 0);
    }
    int status = 0;
    if (pid < 0 || waitpid(pid, &status, 0) != pid || !WIFEXITED(status)) return -1;
    return WEXITSTATUS(status);
}

template <typename F>
bool testkit::WaitFor(F done) {
    const time_t giveUp = time(nullptr) + 120;
    while (time(nullptr) < giveUp) {
        if (done()) return true;
        usleep(2000);
    }
    return done();
}
