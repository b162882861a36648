// Simulated program execution: real fork and exec without a shell, journalled.
#include <fcntl.h>
#include <sys/wait.h>
#include <unistd.h>

#include <cerrno>
#include <string>
#include <vector>

#include "qira/qlib_core.h"
#include "sim_state.h"

namespace {

constexpr int kErrExec = 0x0F00;

// Forks and execs; a close-on-exec pipe tells the parent whether exec itself failed.
int Run(const std::string& program, char* const argv[], bool wait) {
    int report[2];
    if (pipe2(report, O_CLOEXEC) != 0) return -1;
    const pid_t pid = fork();
    if (pid < 0) {
        close(report[0]);
        close(report[1]);
        return -1;
    }
    if (pid == 0) {
        close(report[0]);
        execv(program.c_str(), argv);
        const int err = errno;
        if (write(report[1], &err, sizeof err) < 0) _exit(127);
        _exit(127);
    }
    close(report[1]);
    int execErrno = 0;
    const ssize_t got = read(report[0], &execErrno, sizeof execErrno);
    close(report[0]);
    if (got == static_cast<ssize_t>(sizeof execErrno)) {
        waitpid(pid, nullptr, 0);
        return -1;
    }
    if (!wait) return 0;
    int status = 0;
    while (waitpid(pid, &status, 0) < 0) {
        if (errno != EINTR) return -1;
    }
    return WIFEXITED(status) ? WEXITSTATUS(status) : 128 + WTERMSIG(status);
}

int Exec(const char* op, const std::string& program, const std::vector<std::string>& args, bool wait) {
    using namespace qira_sim::detail;
    Json::Value journalArgs(Json::arrayValue);
    journalArgs.append(program);
    for (const auto& arg : args) journalArgs.append(arg);
    int result = -1;
    if (!Faulted(op, program)) {
        std::vector<char*> argv;
        argv.push_back(const_cast<char*>(program.c_str()));
        for (const auto& arg : args) argv.push_back(const_cast<char*>(arg.c_str()));
        argv.push_back(nullptr);
        result = Run(program, argv.data(), wait);
        if (result < 0) SetError(kErrExec, __FILE__, __LINE__);
    }
    AppendJournal(op, journalArgs, result);
    return result;
}

}  // namespace

extern "C" {

int QLIBCExec(const char* szProgram, const char* a1, const char* a2, const char* a3, const char* a4) {
    std::vector<std::string> args;
    for (const char* arg : {a1, a2, a3, a4}) {
        if (arg == nullptr) break;
        args.emplace_back(arg);
    }
    return Exec("QLIBCExec", szProgram ? szProgram : "", args, true);
}

int QLIBCExecv(const char* szProgram, char* const argv[], int wait) {
    std::vector<std::string> args;
    for (int i = 1; argv != nullptr && argv[0] != nullptr && argv[i] != nullptr; ++i) args.emplace_back(argv[i]);
    return Exec("QLIBCExecv", szProgram ? szProgram : "", args, wait != 0);
}
}
