// fileindexd-ref: a stand-in for the indexing daemon, for development and demonstrations. It
// listens on the daemon socket, logs every command, keeps the pause state it is told and, while not
// paused, takes each indexed share's queue and applies its records to the share's search index.
#include <poll.h>
#include <sys/socket.h>
#include <sys/un.h>
#include <unistd.h>

#include <algorithm>
#include <chrono>
#include <csignal>
#include <cstdint>
#include <cstring>
#include <ctime>
#include <iostream>
#include <map>
#include <memory>
#include <vector>

#include <CLI/CLI.hpp>

#include "applied_files.h"
#include "appliance_root.h"
#include "cli.h"
#include "daemon_frame.h"
#include "daemon_progress.h"
#include "fileindex/fileindex.h"
#include "queue_take.h"
#include "service_view.h"
#include "share_indexer.h"

namespace {

volatile sig_atomic_t g_stop = 0;

// Records applied to a share's index in one transaction.
constexpr size_t kBatchSize = 1000;
// How long one share is served before the next one's turn, and how long a pass goes on serving.
constexpr std::chrono::milliseconds kSlice{250};
constexpr std::chrono::seconds kPassBudget{2};

void OnTerm(int) { g_stop = 1; }

int Listen(const std::string& path) {
    sockaddr_un address;
    std::memset(&address, 0, sizeof address);
    if (path.size() + 1 > sizeof address.sun_path) return -1;
    address.sun_family = AF_UNIX;
    std::memcpy(address.sun_path, path.c_str(), path.size() + 1);
    unlink(path.c_str());
    const int fd = socket(AF_UNIX, SOCK_STREAM | SOCK_CLOEXEC, 0);
    if (fd < 0 || bind(fd, reinterpret_cast<sockaddr*>(&address), sizeof address) != 0 || listen(fd, 64) != 0) return -1;
    return fd;
}

bool ReadExactly(int fd, char* buffer, size_t size) {
    size_t done = 0;
    while (done < size) {
        const ssize_t got = read(fd, buffer + done, size - done);
        if (got <= 0) return false;
        done += static_cast<size_t>(got);
    }
    return true;
}

class Daemon {
public:
    // `pace`: at most this many records applied per share and pass; 0 for no limit.
    Daemon(int listener, size_t pace, fileindexd_ref::ExtractorSettings extraction)
        : listener_(listener), pace_(pace), extractor_(std::move(extraction)) { QIRA::FILEINDEX::StatusMgr::GetPauseInfo(resume_time_); }

    // Commands are answered at once; the queues are drained once per interval.
    void Serve(int intervalMs) {
        auto nextDrain = std::chrono::steady_clock::now() + std::chrono::milliseconds(intervalMs);
        while (!g_stop) {
            // Rounded up: a wait cut to 0 ms would spin through the last millisecond.
            const auto wait = std::chrono::ceil<std::chrono::milliseconds>(nextDrain - std::chrono::steady_clock::now());
            pollfd pfd{listener_, POLLIN, 0};
            if (poll(&pfd, 1, std::max<int>(0, static_cast<int>(wait.count()))) > 0) Accept();
            if (std::chrono::steady_clock::now() < nextDrain) continue;
            AcceptPending();
            if (!Paused()) DrainAll();
            nextDrain = std::chrono::steady_clock::now() + std::chrono::milliseconds(intervalMs);
        }
    }

private:
    bool Paused() const { return resume_time_ == 0 || time(nullptr) < resume_time_; }

    void AcceptPending() {
        pollfd pfd{listener_, POLLIN, 0};
        while (poll(&pfd, 1, 0) > 0) Accept();
    }

    void Accept() {
        const int client = accept4(listener_, nullptr, nullptr, SOCK_CLOEXEC);
        if (client < 0) return;
        timeval timeout{1, 0};
        setsockopt(client, SOL_SOCKET, SO_RCVTIMEO, &timeout, sizeof timeout);
        uint32_t length = 0;
        std::string text;
        if (ReadExactly(client, reinterpret_cast<char*>(&length), sizeof length) && length > 0 && length < (1u << 24)) {
            text.resize(length);
            if (!ReadExactly(client, &text[0], length)) text.clear();
        }
        close(client);
        if (text.empty() && length == 0) return;  // a probe: connected and closed without a command
        const tools::DaemonFrame frame =
            tools::DecodeDaemonFrame(std::string(reinterpret_cast<const char*>(&length), sizeof length) + text);
        if (!frame.message.isObject()) {
            std::cout << "fileindexd-ref: malformed frame" << std::endl;
            return;
        }
        std::cout << "fileindexd-ref: command " << QIRA::FILEINDEX::toString(frame.message) << std::endl;
        Apply(frame.message);
    }

    void Apply(const Json::Value& message) {
        const std::string type = message["type"].isString() ? message["type"].asString() : "";
        if (type == "pause" && message["data"]["resume_time"].isInt64()) resume_time_ = message["data"]["resume_time"].asInt64();
        if (type == "resume") resume_time_ = -1;
    }

    struct ShareWork {
        fileindexd_ref::ShareIndexer indexer;
        fileindexd_ref::QueueTake queue;
        fileindexd_ref::AppliedFiles files;
    };

    // One pass over the shares holding indexed folders: take each queue, apply the records to the
    // shares' indexes in turn, a slice of each share at a time, so that a flood in one share holds
    // the others back by a slice only; then walk again the shares marked need-reindex.
    void DrainAll() {
        std::vector<QIRA::FILEINDEX::Folder> folders;
        if (!QIRA::FILEINDEX::IndexMgr::List(folders)) return;
        const std::vector<std::string> shares = tools::SharesOf(folders);
        ForgetSharesNoLongerIndexed(shares);
        std::vector<ShareWork*> serving;
        for (const auto& share : shares) {
            std::string shareDir;
            if (!QIRA::FILEINDEX::GetFullPath(shareDir, "/" + share)) continue;
            auto& work = shares_[share];
            if (!work) work.reset(new ShareWork{{share, &g_stop, extractor_}, {share, shareDir}, {}});
            work->indexer.ForgetIfRemoved();
            work->queue.Take();
            serving.push_back(work.get());
        }
        // A pause sent before a taken record was queued is in the backlog by now: obey it first,
        // and leave the taken records waiting in the companion.
        AcceptPending();
        if (Paused()) return;
        const auto passEnd = std::chrono::steady_clock::now() + kPassBudget;
        std::vector<size_t> allowance(serving.size(), pace_ > 0 ? pace_ : SIZE_MAX);
        for (bool more = true; more && !g_stop && std::chrono::steady_clock::now() < passEnd;) {
            more = false;
            for (size_t i = 0; i < serving.size(); ++i) {
                ShareWork* work = serving[i];
                if (allowance[i] == 0) continue;  // paced: its turn is over for this pass
                size_t applied = 0;
                more = (ServeSlice(*work, folders, allowance[i], applied) && allowance[i] > 0) || more;
                Publish(*work, applied > 0);
                AcceptPending();
                if (Paused() || g_stop) return;
            }
        }
        for (ShareWork* work : serving) {
            const std::string& share = work->indexer.Share();
            if (g_stop || !QIRA::FILEINDEX::StatusMgr::ShareIsNeedReindex(share) ||
                !QIRA::FILEINDEX::StatusMgr::ShareSetNeedReindex(share, false)) {
                continue;
            }
            // A mark set meanwhile stays for the next pass; a walk that failed marks the share again.
            if (work->indexer.Reindex(folders)) {
                Report(share, "reindexed (it was marked need-reindex)", work->indexer);
            } else {
                QIRA::FILEINDEX::StatusMgr::ShareSetNeedReindex(share, true);
            }
        }
    }

    // Tells the tools how far the share has got: the records and files of its taken batch applied,
    // over the share and per folder, and when the share and the folders the batch touched were
    // last brought up to date. Written only when that changes.
    void Publish(ShareWork& work, bool appliedSome) {
        Json::Value& share = published_["shares"][work.indexer.Share()];
        const bool reading = work.queue.Applied() > 0;  // a finished companion is gone, and so is what it counted
        const Json::Value applied = static_cast<Json::UInt64>(work.queue.Applied());
        const bool caughtUp = !work.queue.HasMore() && (appliedSome || share["up_to_date"].isNull());
        if (share["applied"] == applied && !caughtUp) return;
        const Json::Value now = static_cast<Json::Int64>(time(nullptr));
        share["applied"] = applied;
        share["applied_files"] = static_cast<Json::UInt64>(reading ? work.files.Files() : 0);
        if (caughtUp) share["up_to_date"] = now;
        for (auto& folder : share["folders"]) folder["applied_files"] = 0;
        for (const auto& [path, files] : work.files.PerFolder()) {
            Json::Value& folder = share["folders"][path];
            folder["applied_files"] = static_cast<Json::UInt64>(reading ? files : 0);
            if (caughtUp) folder["up_to_date"] = now;
        }
        tools::WriteDaemonProgress(published_);
    }

    // Batches of one share for at most kSlice and `allowance` records, counted in `applied` and
    // taken from `allowance`; true when its companion holds more.
    bool ServeSlice(ShareWork& work, const std::vector<QIRA::FILEINDEX::Folder>& folders, size_t& allowance,
                    size_t& applied) {
        const auto sliceEnd = std::chrono::steady_clock::now() + kSlice;
        do {
            const size_t done = work.queue.ApplyNext(std::min(kBatchSize, allowance), [&](const fileindexd_ref::Batch& batch) {
                const bool restart = work.queue.Applied() == 0;
                if (work.indexer.Apply(batch, folders)) {
                    work.files.Count(batch, folders, restart);
                    return true;
                }
                if (g_stop || work.indexer.LastProblem() != tools::IndexProblem::TimedOut) return false;
                // Applying it again would take as long: the walk the mark asks for covers it.
                Report(work.indexer.Share(), std::to_string(batch.size()) + " records ran past the batch's time and were"
                                             " dropped; the share is marked need-reindex", work.indexer);
                QIRA::FILEINDEX::StatusMgr::ShareSetNeedReindex(work.indexer.Share(), true);
                work.files.Count(batch, folders, restart);
                return true;
            });
            applied += done;
            allowance -= done;
        } while (work.queue.HasMore() && allowance > 0 && !g_stop && std::chrono::steady_clock::now() < sliceEnd);
        if (applied > 0) Report(work.indexer.Share(), std::to_string(applied) + " records applied", work.indexer);
        return work.queue.HasMore();
    }

    void ForgetSharesNoLongerIndexed(const std::vector<std::string>& shares) {
        for (auto it = shares_.begin(); it != shares_.end();) {
            if (std::find(shares.begin(), shares.end(), it->first) == shares.end()) {
                std::cout << "fileindexd-ref: share " << it->first << " holds no indexed folder; its index is closed" << std::endl;
                it = shares_.erase(it);
            } else {
                ++it;
            }
        }
    }

    static void Report(const std::string& share, const std::string& what, fileindexd_ref::ShareIndexer& indexer) {
        std::cout << "fileindexd-ref: share " << share << ": " << what << ", " << indexer.Count() << " files in the index"
                  << std::endl;
    }

    std::map<std::string, std::unique_ptr<ShareWork>> shares_;
    Json::Value published_;  // what Publish last wrote
    int listener_;
    size_t pace_;
    fileindexd_ref::ExtractorClient extractor_;  // one worker for every share
    long long resume_time_ = -1;
};

}  // namespace

int main(int argc, char** argv) {
    CLI::App app{"Reference stand-in for the indexing daemon (not the production daemon)", "fileindexd-ref"};
    app.set_version_flag("--version", "fileindexd-ref " FILEINDEX_VERSION);
    std::string root;
    int intervalMs = 200;
    size_t pace = 0;
    fileindexd_ref::ExtractorSettings extraction;
    extraction.program = fileindexd_ref::DefaultExtractorProgram();
    long long deadlineMs = extraction.deadline.count();
    app.add_option("--root", root, "Root prefix of the appliance (instead of QIRA_ROOT)");
    app.add_option("--interval", intervalMs, "Milliseconds between passes over the queues")->check(CLI::Range(1, 60000));
    app.add_option("--pace", pace, "At most this many records applied per share and pass, to watch progress move "
                                   "(default: no limit)")->check(CLI::Range(size_t{1}, kBatchSize));
    app.add_option("--extract-memory", extraction.limits.memoryMiB, "Address space of the extraction worker, in MiB")
        ->check(CLI::Range(64, 65536));
    app.add_option("--extract-cpu", extraction.limits.cpuSeconds, "CPU seconds the extraction worker may spend on one file")
        ->check(CLI::Range(1, 3600));
    app.add_option("--extract-deadline", deadlineMs, "Milliseconds the extraction worker may take for one file")
        ->check(CLI::Range(100, 3600000));
    if (const auto ended = tools::Parse(app, argc, argv)) return *ended;
    extraction.deadline = std::chrono::milliseconds(deadlineMs);
    if (!root.empty()) QIRA::FILEINDEX::UseRootPrefix(root);
    if (root.empty()) tools::WarnWithoutAppliance("fileindexd-ref");
    signal(SIGTERM, OnTerm);
    signal(SIGINT, OnTerm);
    signal(SIGPIPE, SIG_IGN);
    const std::string path = QIRA::FILEINDEX::DaemonSocketPath();
    const int listener = Listen(path);
    if (listener < 0) {
        std::cerr << "fileindexd-ref: cannot listen on " << path << "\n";
        return 1;
    }
    std::cout << "fileindexd-ref: listening on " << path << std::endl;
    Daemon(listener, pace, extraction).Serve(intervalMs);
    close(listener);
    unlink(path.c_str());
    std::cout << "fileindexd-ref: stopped" << std::endl;
    return 0;
}
