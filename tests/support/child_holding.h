// A forked process that takes something (a lock) and keeps it until the object is destroyed.
#pragma once

#include <signal.h>
#include <sys/wait.h>
#include <unistd.h>

#include <stdexcept>

namespace testkit {

class ChildHolding {
public:
    // `take` runs in the child; its result is reported before the child waits to be released.
    template <typename F>
    explicit ChildHolding(F take) {
        int ready[2];
        if (pipe(ready) != 0 || pipe(release_) != 0) throw std::runtime_error("pipe");
        pid_ = fork();
        if (pid_ == 0) {
            close(ready[0]);
            const char ok = take() ? 'y' : 'n';
            if (write(ready[1], &ok, 1) != 1) _exit(2);
            char go;
            if (read(release_[0], &go, 1) < 0) _exit(2);
            _exit(0);
        }
        close(ready[1]);
        if (read(ready[0], &state_, 1) != 1) state_ = '?';
        close(ready[0]);
    }
    ~ChildHolding() { Release(); }
    ChildHolding(const ChildHolding&) = delete;
    ChildHolding& operator=(const ChildHolding&) = delete;

    bool Took() const { return state_ == 'y'; }
    void Release() {
        if (pid_ <= 0) return;
        const char go = 'g';
        if (write(release_[1], &go, 1) != 1) kill(pid_, SIGKILL);
        waitpid(pid_, nullptr, 0);
        close(release_[0]);
        close(release_[1]);
        pid_ = -1;
    }

private:
    pid_t pid_ = -1;
    int release_[2] = {-1, -1};
    char state_ = '?';
};

}  // namespace testkit
