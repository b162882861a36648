// The live appliance: how fast a registered share of documents, photos, songs, videos and notes
// becomes searchable with its fields, and how fast a search answers from the command line, against
// Debian's recollindex and recollq on the same tree in the same run; and how soon a single write is
// found while other writes go on, against the moment the kernel reports it.
#include <fcntl.h>
#include <poll.h>
#include <signal.h>
#include <sys/inotify.h>
#include <sys/resource.h>
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

#include "appliance_tree.h"
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

// Waits for a process; false unless it exited with status 0. `peakMiB`, when given, receives its
// peak resident memory (and that of its largest waited-for descendant).
bool Finished(pid_t pid, double* peakMiB = nullptr) {
    int status = 0;
    rusage usage{};
    wait4(pid, &status, 0, &usage);
    if (peakMiB != nullptr) *peakMiB = static_cast<double>(usage.ru_maxrss) / 1024.0;
    return WIFEXITED(status) && WEXITSTATUS(status) == 0;
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

// The first child of `parent`, -1 when it has none.
pid_t ChildOf(pid_t parent) {
    for (const auto& entry : std::filesystem::directory_iterator("/proc")) {
        if (!std::isdigit(static_cast<unsigned char>(entry.path().filename().c_str()[0]))) continue;
        std::ifstream in(entry.path() / "stat");
        std::string stat((std::istreambuf_iterator<char>(in)), std::istreambuf_iterator<char>());
        const size_t end = stat.rfind(')');
        if (end != std::string::npos && std::atoi(stat.c_str() + stat.find(' ', end + 2) + 1) == parent) {
            return std::atoi(entry.path().filename().c_str());
        }
    }
    return -1;
}

std::string Sentence(std::mt19937& random) {
    std::string text;
    for (int i = 0; i < 12; ++i) text += bench::kCommonWords[random() % bench::kCommonWords.size()] + " ";
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

    void Index(const std::string& sharePath) {
        Json::Value request(Json::arrayValue);
        request.append(Json::Value(Json::objectValue));
        request[0]["path"] = sharePath;
        for (const char* kind : {"document", "audio", "video", "photo"}) request[0][kind] = true;
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

double Median(std::vector<double> values) {
    std::sort(values.begin(), values.end());
    return values[values.size() / 2];
}

double Percentile(std::vector<double> values, double fraction) {
    std::sort(values.begin(), values.end());
    return values[std::min(values.size() - 1, static_cast<size_t>(fraction * static_cast<double>(values.size())))];
}

double Seconds(const std::vector<std::string>& argv, const std::string& log) {
    const auto start = Clock::now();
    return Finished(Start(argv, log)) ? Since(start) : -1;
}

// A share holding the generated tree, indexed by the daemon and by recollindex (with its default
// settings and filters), kept for the search benchmark.
struct IndexedTree {
    LiveAppliance appliance;
    bench::TreeCounts counts = bench::ApplianceCounts(Scale());
    std::string recollConf = appliance.root() + "/recoll";
    double recollSeconds = -1;
    double recollPeakMiB = 0;
    double seconds = 0;
    double daemonPeakMiB = 0;
    double workerPeakMiB = 0;
    std::string error;  // why the index does not hold what the tree holds
};
std::unique_ptr<IndexedTree> g_tree;

// Whether the index holds what the tree holds: each kind, typed by content, and the cameras read.
std::string IndexError(IndexedTree& tree) {
    const std::pair<std::string, size_t> expected[] = {
        {"type:audio", tree.counts.songs}, {"type:photo", tree.counts.photos}, {"type:video", tree.counts.videos},
        {"type:document", tree.counts.documents + tree.counts.notes}, {"camera:fujifilm", (tree.counts.photos + 4) / 5}};
    for (const auto& [query, count] : expected) {
        long long found = 0;
        std::string error;
        if (!tree.appliance.Index().CountHits(query, "", found, error) || found != static_cast<long long>(count)) {
            return query + ": " + std::to_string(found) + " hits, not " + std::to_string(count) + " " + error;
        }
    }
    return "";
}

IndexedTree& IndexTree() {
    g_tree.reset(new IndexedTree);
    IndexedTree& tree = *g_tree;
    const std::string dir = tree.appliance.share() + "/tree";
    bench::MakeApplianceTree(dir, tree.counts);
    std::filesystem::create_directories(tree.recollConf);
    // recollindex runs its filters by name: Debian's python3 and perl, which have the modules.
    setenv("PATH", ("/usr/bin:/bin:" + std::string(std::getenv("PATH") ? std::getenv("PATH") : "")).c_str(), 1);
    WriteFile(tree.recollConf + "/recoll.conf", "topdirs = " + dir + "\nloglevel = 1\n");
    const auto recollStart = Clock::now();
    if (Finished(Start({"/usr/bin/recollindex", "-c", tree.recollConf}, tree.recollConf + "/recollindex.log"), &tree.recollPeakMiB)) {
        tree.recollSeconds = Since(recollStart);
    }
    sync();  // recollindex's database written out, not while the daemon runs
    const auto start = Clock::now();
    tree.appliance.Index("/music/tree");
    while (tree.appliance.Index().Count() < static_cast<long long>(tree.counts.Total())) {
        std::this_thread::sleep_for(std::chrono::milliseconds(10));
    }
    tree.seconds = Since(start);
    tree.daemonPeakMiB = PeakMiB(tree.appliance.daemon());
    tree.workerPeakMiB = PeakMiB(ChildOf(tree.appliance.daemon()));
    tree.error = IndexError(tree);
    return tree;
}

// From the folder's registration to every file of the generated tree searchable with its fields,
// against recollindex indexing the same tree just before, and the peak memory of each.
void BM_ApplianceTreeSearchable_AgainstRecollindex(benchmark::State& state) {
    for (auto _ : state) {
        const IndexedTree& tree = IndexTree();
        if (!tree.error.empty() || tree.recollSeconds < 0) {
            state.SkipWithError((tree.error.empty() ? "recollindex failed" : tree.error).c_str());
            return;
        }
        const double files = static_cast<double>(tree.counts.Total());
        state.SetIterationTime(tree.seconds);
        state.counters["files"] = files;
        state.counters["files_per_s"] = files / tree.seconds;
        state.counters["recoll_files_per_s"] = files / tree.recollSeconds;
        state.counters["ratio"] = tree.recollSeconds / tree.seconds;
        state.counters["daemon_peak_MiB"] = tree.daemonPeakMiB;
        state.counters["worker_peak_MiB"] = tree.workerPeakMiB;
        state.counters["recoll_peak_MiB"] = tree.recollPeakMiB;
    }
}
BENCHMARK(BM_ApplianceTreeSearchable_AgainstRecollindex)->UseManualTime()->Unit(benchmark::kMillisecond)->Iterations(1);

// Each search a whole fileindexctl process over the indexed tree, twice: 13 common and 13 rare
// words, filters, and facets; the words also through recollq over recollindex's index.
void BM_SearchFromTheCommandLine_AgainstRecollq(benchmark::State& state) {
    IndexedTree& tree = g_tree ? *g_tree : IndexTree();
    std::vector<std::string> words(bench::kCommonWords.begin(), bench::kCommonWords.begin() + 13);
    for (size_t i = 0; i < 13; ++i) words.push_back(bench::RareWord(i * tree.counts.notes / 13));
    const std::vector<std::string> filters = {
        "miles davis type:audio year:1959", "taken:2019-06..2019-08 camera:fuji", "invoice type:document size:>1K modified:<2030-01-01",
        "duration:>1h", "type:photo taken:2021", "artist:coltrane album:\"album 3\"", "author:marsh type:document pages:1",
        "year:1960..1965 type:audio", "camera:canon taken:>2022-06", "harbour size:<1M"};
    const std::vector<std::string> facets = {"harbour", "type:photo", "coltrane", "taken:2019", "meadow type:document"};
    const std::string log = tree.appliance.root() + "/query.log";
    const auto search = [&log](const std::string& query, bool withFacets) {
        std::vector<std::string> argv = {FILEINDEXCTL, "search", query, "--limit", "20"};
        if (withFacets) argv.push_back("--facets");
        return Seconds(argv, log);
    };
    std::vector<double> ours, recoll, filtered, faceted;
    for (auto _ : state) {
        for (int round = 0; round < 2; ++round) {
            for (const auto& word : words) ours.push_back(search(word, false));
            for (const auto& word : words) recoll.push_back(Seconds({"/usr/bin/recollq", "-c", tree.recollConf, "-n", "20", word}, log));
            for (const auto& query : filters) filtered.push_back(search(query, false));
            for (const auto& query : facets) faceted.push_back(search(query, true));
        }
        state.SetIterationTime(Median(ours));
    }
    for (const auto* times : {&ours, &recoll, &filtered, &faceted}) {
        if (*std::min_element(times->begin(), times->end()) < 0) return state.SkipWithError("a search failed");
    }
    const std::pair<const char*, const std::vector<double>*> kinds[] = {
        {"words", &ours}, {"recollq_words", &recoll}, {"filters", &filtered}, {"facets", &faceted}};
    for (const auto& [name, times] : kinds) {
        state.counters[std::string(name) + "_p50_ms"] = Percentile(*times, 0.5) * 1e3;
        state.counters[std::string(name) + "_p99_ms"] = Percentile(*times, 0.99) * 1e3;
    }
    state.counters["ratio_p99"] = Percentile(ours, 0.99) / Percentile(recoll, 0.99);
}
BENCHMARK(BM_SearchFromTheCommandLine_AgainstRecollq)->UseManualTime()->Unit(benchmark::kMillisecond)->Iterations(1);

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
