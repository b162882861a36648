// qiranotifyd-sim: the simulated appliance's notification daemon. It watches what is registered
// for the owner "fileindex" with the kernel's inotify API and appends one record per change to the
// registration's queue (the records are described in tree_watcher.h). Registrations take effect as
// they change. When changes may have been lost (the kernel's queue overflowed, no inotify watch
// was left, a queue could not be written) every folder concerned gets a reindex record through the
// library's AddCustomEvent, which marks the share need-reindex when even that cannot be queued.
// SIGUSR1 throws the kernel's pending events away, as an overflow does, for tests of the recovery.
#include <poll.h>
#include <sys/inotify.h>
#include <sys/signalfd.h>
#include <unistd.h>

#include <csignal>
#include <iostream>

#include <CLI/CLI.hpp>

#include "fileindex/root.h"
#include "fileindex/utils.h"
#include "qira_sim/appliance.h"
#include "registrations.h"
#include "tree_watcher.h"

namespace {

int SignalFd() {
    sigset_t signals;
    sigemptyset(&signals);
    for (const int signal : {SIGTERM, SIGINT, SIGUSR1}) sigaddset(&signals, signal);
    sigprocmask(SIG_BLOCK, &signals, nullptr);
    return signalfd(-1, &signals, SFD_CLOEXEC);
}

// True when the registrations file of the simulation was replaced.
bool RegistrationsChanged(int stateWatch) {
    alignas(inotify_event) char buffer[4096];
    bool changed = false;
    ssize_t got;
    while ((got = read(stateWatch, buffer, sizeof buffer)) > 0) {
        for (ssize_t at = 0; at < got;) {
            const auto* event = reinterpret_cast<const inotify_event*>(buffer + at);
            if (event->len > 0 && std::string(event->name) == "monitors.json") changed = true;
            at += static_cast<ssize_t>(sizeof(inotify_event) + event->len);
        }
    }
    return changed;
}

void QueueReindex(const qiranotifyd_sim::Root& root, const std::string& cause) {
    const bool queued = QIRA::FILEINDEX::AddCustomEvent(QIRA::FILEINDEX::kEventReindex, root.path, Json::Value());
    std::cout << "qiranotifyd-sim: " << cause << ": " << (queued ? "queued a reindex of " : "marked for a full reindex the share of ")
              << root.path << std::endl;
}

}  // namespace

int main(int argc, char** argv) {
    CLI::App app{"Simulated notification daemon: reports changes in registered folders to their queues", "qiranotifyd-sim"};
    app.set_version_flag("--version", "qiranotifyd-sim " FILEINDEX_VERSION);
    std::string root;
    app.add_option("--root", root, "Root of the simulated appliance (instead of QIRA_ROOT)")->check(CLI::ExistingDirectory);
    try {
        app.parse(argc, argv);
    } catch (const CLI::ParseError& e) {
        return app.exit(e) == 0 ? 0 : 2;
    }
    if (!root.empty()) QIRA::FILEINDEX::UseRootPrefix(root);
    if (qira_sim::Root().empty()) {
        std::cerr << "qiranotifyd-sim: give --root or QIRA_ROOT: a simulated appliance never lives in the real root\n";
        return 2;
    }
    const int signals = SignalFd();
    const int stateWatch = inotify_init1(IN_NONBLOCK | IN_CLOEXEC);
    if (signals < 0 || stateWatch < 0 ||
        inotify_add_watch(stateWatch, qira_sim::StateDir().c_str(), IN_MOVED_TO | IN_CLOSE_WRITE) < 0) {
        std::cerr << "qiranotifyd-sim: cannot watch " << qira_sim::StateDir() << " (run qira-sim init first)\n";
        return 1;
    }
    qiranotifyd_sim::TreeWatcher watcher(QueueReindex);
    watcher.Reconcile(qiranotifyd_sim::RegisteredRoots());
    std::cout << "qiranotifyd-sim: ready, " << watcher.Directories() << " directories watched" << std::endl;
    while (true) {
        pollfd fds[3] = {{watcher.Fd(), POLLIN, 0}, {stateWatch, POLLIN, 0}, {signals, POLLIN, 0}};
        if (poll(fds, 3, -1) < 0) continue;
        if (fds[2].revents & POLLIN) {
            signalfd_siginfo info;
            if (read(signals, &info, sizeof info) == sizeof info && info.ssi_signo != SIGUSR1) break;
            watcher.DropPending();
        }
        if ((fds[1].revents & POLLIN) && RegistrationsChanged(stateWatch)) watcher.Reconcile(qiranotifyd_sim::RegisteredRoots());
        if (fds[0].revents & POLLIN) watcher.ReadEvents();
    }
    std::cout << "qiranotifyd-sim: stopped" << std::endl;
    return 0;
}
