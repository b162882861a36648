// The live appliance: how fast a registered tree becomes searchable, against Debian's recollindex
// indexing the same tree in the same run, and how soon a single write is found while other writes
// go on, against the moment the kernel reports it.
#include <fcntl.h>
#include <poll.h>
#include <signal.h>
#include <sys/inotify.h>
#include <sys/stat.h>
#include <sys/wait.h>
#include <unistd.h>

#include <algorithm>
#include <atomic>
#include <chrono>
#include <filesystem>
#include <fstream>
#include <random>
#include <thread>

#include <benchmark/benchmark.h>

#include "fileindex/fileindex.h"
#include "qira_sim/appliance.h"
#include "search_index.h"

namespace {

using Clock = std::chrono::steady_clock;
using QIRA::FILEINDEX::IndexMgr;

double Scale() {
    const char* scale = std::getenv("FILEINDEX_BENCH_SCALE");
    return scale != nullptr ? std::atof(scale) : 1.0;
}

size_t Scaled(size_t count) { return std::max<size_t>(10, static_cast<size_t>(static_cast<double>(count) * Scale())); }

double Since(Clock::time_point start) { return std::chrono::duration<double>(Clock::now() - start).count(); }

std::string ReadFile(const std::string& path) {
    std::ifstream in(path);
    return std::string(std::istreambuf_iterator<char>(in), std::istreambuf_iterator<char>());
}

void WriteFile(const std::string& path, const std::string& text) { std::ofstream(path) << text; }

pid_t Start(const std::vector<std::string>& argv, const std::string& log) {
    const pid_t pid = fork();
    if (pid == 0) {
        const int fd = open(log.c_str(), O_WRONLY | O_CREAT | O_TRUNC, 0644);
        dup2(fd, 1);
        dup2(fd, 2);
        std::vector<char*> raw;
        for (const auto& arg : argv) raw.push_back(const_cast<char*>(arg.c_str()));
        raw.push_back(nullptr);
        execv(raw[0], raw.data());
        _exit(127);
    }
    return pid;
}

void WaitForText(const std::string& log, const std::string& text) {
    while (ReadFile(log).find(text) == std::string::npos) std::this_thread::sleep_for(std::chrono::milliseconds(5));
}

// Peak resident memory of a process in MiB.
double PeakMiB(pid_t pid) {
    std::ifstream in("/proc/" + std::to_string(pid) + "/status");
    for (std::string line; std::getline(in, line);) {
        if (line.rfind("VmHWM:", 0) == 0) return std::atof(line.c_str() + 6) / 1024.0;
    }
    return 0;
}

const std::vector<std::string> kWords = {"harbour", "meadow", "lantern", "orchard", "granite", "violet", "ember",
                                         "thicket", "compass", "saffron", "quarry", "mosaic", "pebble", "tundra"};

std::string Sentence(std::mt19937& random) {
    std::string text;
    for (int i = 0; i < 12; ++i) text += kWords[random() % kWords.size()] + " ";
    return text + "\n";
}

// A simulated appliance with the two stand-ins running, in a scratch directory.
class LiveAppliance {
public:
    LiveAppliance() {
        char pattern[] = "/tmp/fileindex-live-bench-XXXXXX";
        root_ = mkdtemp(pattern);
        QIRA::FILEINDEX::UseRootPrefix(root_);
        qira_sim::InitAppliance(root_);
        share_ = root_ + "/volume1/music";
        mkdir((root_ + "/volume1").c_str(), 0755);
        mkdir(share_.c_str(), 0755);
        qira_sim::PutShare("music", share_);
        notifier_ = Start({QIRANOTIFYD_SIM}, root_ + "/notifier.log");
        daemon_ = Start({FILEINDEXD_REF, "--interval", "20"}, root_ + "/daemon.log");
        WaitForText(root_ + "/notifier.log", "ready");
        WaitForText(root_ + "/daemon.log", "listening on");
    }
    ~LiveAppliance() {
        for (const pid_t pid : {notifier_, daemon_}) {
            kill(pid, SIGTERM);
            waitpid(pid, nullptr, 0);
        }
        std::filesystem::remove_all(root_);
    }
    LiveAppliance(const LiveAppliance&) = delete;
    LiveAppliance& operator=(const LiveAppliance&) = delete;

    // `files` small text files in directories of 50, under the share's "tree".
    std::string MakeTree(size_t files) {
        std::mt19937 random(7);
        const std::string tree = share_ + "/tree";
        mkdir(tree.c_str(), 0755);
        for (size_t i = 0; i < files; ++i) {
            const std::string dir = tree + "/d" + std::to_string(i / 50);
            if (i % 50 == 0) mkdir(dir.c_str(), 0755);
            WriteFile(dir + "/note" + std::to_string(i) + ".txt", Sentence(random));
        }
        return tree;
    }
    void Index(const std::string& sharePath) {
        Json::Value request(Json::arrayValue);
        request.append(Json::Value(Json::objectValue));
        request[0]["path"] = sharePath;
        request[0]["document"] = true;
        IndexMgr::Upsert(request);
    }
    // The share's index, once the daemon has made it.
    tools::SearchIndex& Index() {
        while (!index_) {
            tools::IndexProblem problem;
            std::string error;
            index_ = tools::SearchIndex::Open(share_, false, problem, error);
            if (!index_) std::this_thread::sleep_for(std::chrono::milliseconds(5));
        }
        return *index_;
    }
    const std::string& share() const { return share_; }
    const std::string& root() const { return root_; }
    pid_t notifier() const { return notifier_; }
    pid_t daemon() const { return daemon_; }

private:
    std::string root_;
    std::string share_;
    pid_t notifier_ = -1;
    pid_t daemon_ = -1;
    std::unique_ptr<tools::SearchIndex> index_;
};

// recollindex over the tree, a full pass with its default settings (names and the text of
// plain-text files); its time in seconds.
double RecollIndex(const std::string& tree, const std::string& confDir) {
    std::filesystem::create_directories(confDir);
    WriteFile(confDir + "/recoll.conf", "topdirs = " + tree + "\nloglevel = 1\n");
    const auto start = Clock::now();
    const pid_t pid = Start({"/usr/bin/recollindex", "-c", confDir}, confDir + "/recollindex.log");
    int status = 0;
    waitpid(pid, &status, 0);
    return WIFEXITED(status) && WEXITSTATUS(status) == 0 ? Since(start) : -1;
}

double Median(std::vector<double> values) {
    std::sort(values.begin(), values.end());
    return values[values.size() / 2];
}

double Percentile(std::vector<double> values, double fraction) {
    std::sort(values.begin(), values.end());
    return values[std::min(values.size() - 1, static_cast<size_t>(fraction * static_cast<double>(values.size())))];
}

// From the folder's registration to every file of a generated tree searchable, against
// recollindex indexing the same tree in the same iteration.
void BM_TreeSearchable_AgainstRecollindex(benchmark::State& state) {
    const size_t files = Scaled(20000);
    std::vector<double> ours, recoll, ratios;
    for (auto _ : state) {
        LiveAppliance appliance;
        const std::string tree = appliance.MakeTree(files);
        const double recollSeconds = RecollIndex(tree, appliance.root() + "/recoll");
        const auto start = Clock::now();
        appliance.Index("/music/tree");
        while (appliance.Index().Count() < static_cast<long long>(files)) std::this_thread::sleep_for(std::chrono::milliseconds(10));
        const double seconds = Since(start);
        state.SetIterationTime(seconds);
        ours.push_back(static_cast<double>(files) / seconds);
        recoll.push_back(static_cast<double>(files) / recollSeconds);
        ratios.push_back(ours.back() / recoll.back());
    }
    state.counters["files"] = static_cast<double>(files);
    state.counters["files_per_s"] = Median(ours);
    state.counters["recoll_files_per_s"] = Median(recoll);
    state.counters["ratio"] = Median(ratios);
}
BENCHMARK(BM_TreeSearchable_AgainstRecollindex)->UseManualTime()->Unit(benchmark::kMillisecond)->Iterations(3);

// One file written at a time, each found by a word of its own, while 100 other writes a second go
// on; against the moment the kernel tells a watcher of the same write.
void BM_WriteToSearchable_UnderLoad(benchmark::State& state) {
    const size_t probes = Scaled(100);
    for (auto _ : state) {
        LiveAppliance appliance;
        const std::string live = appliance.share() + "/live";
        mkdir(live.c_str(), 0755);
        mkdir((live + "/noise").c_str(), 0755);
        appliance.Index("/music/live");
        WaitForText(appliance.root() + "/notifier.log", "watching " + live + " (");
        const int kernel = inotify_init1(IN_CLOEXEC);
        inotify_add_watch(kernel, live.c_str(), IN_CLOSE_WRITE);
        std::atomic<bool> stop{false};
        std::thread noise([&] {
            std::mt19937 random(11);
            for (int i = 0; !stop; ++i) {
                WriteFile(live + "/noise/n" + std::to_string(i % 500) + ".txt", Sentence(random));
                std::this_thread::sleep_for(std::chrono::milliseconds(10));
            }
        });
        std::vector<double> latencies, floors;
        for (size_t k = 0; k < probes; ++k) {
            const std::string word = "probe" + std::to_string(k) + "x";
            const std::string name = word + ".txt";
            const auto start = Clock::now();
            WriteFile(live + "/" + name, word + "\n");
            alignas(inotify_event) char buffer[4096];
            for (bool seen = false; !seen;) {
                const ssize_t got = read(kernel, buffer, sizeof buffer);
                for (ssize_t at = 0; at < got;) {
                    const auto* event = reinterpret_cast<const inotify_event*>(buffer + at);
                    seen = seen || (event->len > 0 && name == event->name);
                    at += static_cast<ssize_t>(sizeof(inotify_event) + event->len);
                }
            }
            floors.push_back(Since(start));
            std::vector<tools::SearchHit> hits;
            std::string error;
            while (hits.empty()) {
                appliance.Index().Search(word, "", 1, hits, error);
                if (hits.empty()) std::this_thread::sleep_for(std::chrono::milliseconds(1));
            }
            latencies.push_back(Since(start));
            std::this_thread::sleep_for(std::chrono::milliseconds(20));
        }
        stop = true;
        noise.join();
        close(kernel);
        state.SetIterationTime(Median(latencies));
        state.counters["p50_ms"] = Percentile(latencies, 0.5) * 1e3;
        state.counters["p99_ms"] = Percentile(latencies, 0.99) * 1e3;
        state.counters["kernel_p99_ms"] = Percentile(floors, 0.99) * 1e3;
        state.counters["ratio"] = Percentile(latencies, 0.99) / Percentile(floors, 0.99);
        state.counters["notifier_peak_MiB"] = PeakMiB(appliance.notifier());
        state.counters["daemon_peak_MiB"] = PeakMiB(appliance.daemon());
    }
}
BENCHMARK(BM_WriteToSearchable_UnderLoad)->UseManualTime()->Unit(benchmark::kMillisecond)->Iterations(1);

}  // namespace

BENCHMARK_MAIN();
