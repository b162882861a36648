#include "worker_sandbox.h"

#include <sched.h>
#include <seccomp.h>
#include <sys/prctl.h>
#include <sys/resource.h>

#include <cerrno>
#include <initializer_list>
#include <memory>

namespace extractor {
namespace {

using Filter = std::unique_ptr<void, decltype(&seccomp_release)>;

bool SetLimit(int resource, rlim_t value) {
    const rlimit limit{value, value};
    return setrlimit(resource, &limit) == 0;
}

bool Deny(scmp_filter_ctx filter, uint32_t action, std::initializer_list<int> calls) {
    for (const int call : calls) {
        if (call < 0) continue;  // not a system call on this architecture
        if (seccomp_rule_add(filter, action, call, 0) != 0) return false;
    }
    return true;
}

}  // namespace

bool EnterSandbox(const Limits& limits) {
#ifdef __SANITIZE_ADDRESS__
    // AddressSanitizer's shadow memory spans terabytes of address space: no limit can leave room.
    const bool memoryCapped = limits.memoryMiB > 0;
#else
    const bool memoryCapped = SetLimit(RLIMIT_AS, static_cast<rlim_t>(limits.memoryMiB) << 20);
#endif
    if (!memoryCapped || !SetLimit(RLIMIT_FSIZE, 0) ||
        !SetLimit(RLIMIT_CORE, 0) || prctl(PR_SET_NO_NEW_PRIVS, 1, 0, 0, 0) != 0) {
        return false;
    }
    Filter filter(seccomp_init(SCMP_ACT_ALLOW), seccomp_release);
    if (!filter) return false;
    const uint32_t kill = SCMP_ACT_KILL_PROCESS;
    const bool built =
        Deny(filter.get(), kill,
             {SCMP_SYS(execve), SCMP_SYS(execveat), SCMP_SYS(fork), SCMP_SYS(vfork), SCMP_SYS(socket),
              SCMP_SYS(socketpair), SCMP_SYS(connect), SCMP_SYS(bind), SCMP_SYS(listen), SCMP_SYS(accept),
              SCMP_SYS(accept4), SCMP_SYS(ptrace), SCMP_SYS(process_vm_writev)}) &&
        Deny(filter.get(), SCMP_ACT_ERRNO(EACCES),
             {SCMP_SYS(open), SCMP_SYS(openat), SCMP_SYS(openat2), SCMP_SYS(creat), SCMP_SYS(open_by_handle_at)}) &&
        // Threads only: a clone without CLONE_THREAD makes a process. clone3 cannot be inspected,
        // and the C library falls back to clone when it is missing.
        seccomp_rule_add(filter.get(), kill, SCMP_SYS(clone), 1, SCMP_A0(SCMP_CMP_MASKED_EQ, CLONE_THREAD, 0)) == 0 &&
        Deny(filter.get(), SCMP_ACT_ERRNO(ENOSYS), {SCMP_SYS(clone3)});
    return built && seccomp_load(filter.get()) == 0;
}

bool CpuBudget(int seconds) {
    rusage usage{};
    if (getrusage(RUSAGE_SELF, &usage) != 0) return false;
    // The soft limit only: a process may not raise its hard limit again.
    rlimit limit{};
    if (getrlimit(RLIMIT_CPU, &limit) != 0) return false;
    limit.rlim_cur = static_cast<rlim_t>(usage.ru_utime.tv_sec + usage.ru_stime.tv_sec) + 1 + static_cast<rlim_t>(seconds);
    return setrlimit(RLIMIT_CPU, &limit) == 0;
}

}  // namespace extractor
