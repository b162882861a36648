#include "process.h"

#include <fcntl.h>
#include <signal.h>
#include <sys/mman.h>
#include <sys/wait.h>

#include <cstring>
#include <regex>

#include "sandbox.h"

namespace testkit {
namespace {

std::vector<char*> Argv(const std::vector<std::string>& argv) {
    std::vector<char*> raw;
    for (const auto& arg : argv) raw.push_back(const_cast<char*>(arg.c_str()));
    raw.push_back(nullptr);
    return raw;
}

// The whole content of a memory file, read from its start.
std::string Slurp(int fd) {
    std::string text;
    char buffer[4096];
    lseek(fd, 0, SEEK_SET);
    for (ssize_t got; (got = read(fd, buffer, sizeof buffer)) > 0;) text.append(buffer, static_cast<size_t>(got));
    close(fd);
    return text;
}

}  // namespace

RunResult Run(const std::vector<std::string>& argv, const std::string& input) {
    // Memory files rather than pipes: nothing to drain while the tool runs.
    const int in = memfd_create("in", MFD_CLOEXEC), out = memfd_create("out", MFD_CLOEXEC),
              err = memfd_create("err", MFD_CLOEXEC);
    if (write(in, input.data(), input.size()) != static_cast<ssize_t>(input.size())) return {};
    lseek(in, 0, SEEK_SET);
    const pid_t pid = fork();
    if (pid == 0) {
        dup2(in, 0);
        dup2(out, 1);
        dup2(err, 2);
        execv(argv[0].c_str(), Argv(argv).data());
        _exit(127);
    }
    close(in);
    int status = 0;
    waitpid(pid, &status, 0);
    return {WIFEXITED(status) ? WEXITSTATUS(status) : -1, Slurp(out), Slurp(err)};
}

pid_t Start(const std::vector<std::string>& argv, const std::string& logFile) {
    const pid_t pid = fork();
    if (pid == 0) {
        const int fd = open(logFile.c_str(), O_WRONLY | O_CREAT | O_TRUNC, 0644);
        dup2(fd, 1);
        dup2(fd, 2);
        close(fd);
        execv(argv[0].c_str(), Argv(argv).data());
        _exit(127);
    }
    return pid;
}

int StartListening(const std::vector<std::string>& argv, const std::string& logFile, pid_t& pid) {
    pid = Start(argv, logFile);
    const std::regex listening("listening on http://127.0.0.1:([0-9]+)/");
    std::smatch port;
    std::string log;
    WaitFor([&] { return std::regex_search(log = ReadFile(logFile), port, listening); });
    return port.empty() ? 0 : std::stoi(port[1]);
}

int Stop(pid_t pid) {
    kill(pid, SIGTERM);
    int status = 0;
    waitpid(pid, &status, 0);
    return WIFEXITED(status) ? WEXITSTATUS(status) : -1;
}

}  // namespace testkit
