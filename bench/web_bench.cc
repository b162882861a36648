// The console under a flood of connections that never finish a request: how long real requests
// wait while 500 connections sit idle or send their head a byte at a time, against the same
// requests with no flood, in the same run; and what the flood costs the console in memory. And
// how long they wait while ten clients keep the console busy with searches that each run up to
// their deadline.
#include <fcntl.h>
#include <netinet/in.h>
#include <signal.h>
#include <sys/socket.h>
#include <sys/wait.h>
#include <unistd.h>

#include <algorithm>
#include <atomic>
#include <chrono>
#include <cstring>
#include <filesystem>
#include <fstream>
#include <mutex>
#include <regex>
#include <thread>
#include <vector>

#include <benchmark/benchmark.h>
#include <httplib.h>

#include "qira_sim/appliance.h"
#include "search_index.h"

namespace {

using Clock = std::chrono::steady_clock;

std::string ReadFile(const std::string& path) {
    std::ifstream in(path);
    return std::string(std::istreambuf_iterator<char>(in), std::istreambuf_iterator<char>());
}

// Resident memory of a process in KiB, from the line `field` of its status.
double MemoryKiB(pid_t pid, const std::string& field) {
    std::ifstream in("/proc/" + std::to_string(pid) + "/status");
    for (std::string line; std::getline(in, line);) {
        if (line.rfind(field, 0) == 0) return std::atof(line.c_str() + field.size());
    }
    return 0;
}

// A console on a scratch appliance, on a free loopback port.
class Console {
public:
    Console() {
        char pattern[] = "/tmp/fileindex-web-bench-XXXXXX";
        root_ = mkdtemp(pattern);
        qira_sim::InitAppliance(root_);
        const std::string log = root_ + "/web.log";
        pid_ = fork();
        if (pid_ == 0) {
            const int fd = open(log.c_str(), O_WRONLY | O_CREAT | O_TRUNC, 0644);
            dup2(fd, 1);
            dup2(fd, 2);
            execl(FILEINDEX_WEB, FILEINDEX_WEB, "--root", root_.c_str(), "--listen", "127.0.0.1:0", nullptr);
            _exit(127);
        }
        std::smatch port;
        std::string text;
        while (!std::regex_search(text = ReadFile(log), port, std::regex("listening on http://127.0.0.1:([0-9]+)/"))) {
            std::this_thread::sleep_for(std::chrono::milliseconds(5));
        }
        port_ = std::stoi(port[1]);
    }
    ~Console() {
        kill(pid_, SIGTERM);
        waitpid(pid_, nullptr, 0);
        std::filesystem::remove_all(root_);
    }
    int Connect() const {
        const int fd = socket(AF_INET, SOCK_STREAM | SOCK_CLOEXEC, 0);
        sockaddr_in address{};
        address.sin_family = AF_INET;
        address.sin_port = htons(static_cast<uint16_t>(port_));
        address.sin_addr.s_addr = htonl(INADDR_LOOPBACK);
        connect(fd, reinterpret_cast<sockaddr*>(&address), sizeof address);
        return fd;
    }
    // Seconds each of `count` GET /api/status took, one after another, each on a new connection.
    std::vector<double> TimeRequests(int count) const {
        std::vector<double> times;
        for (int i = 0; i < count; ++i) {
            httplib::Client client("127.0.0.1", port_);
            const auto start = Clock::now();
            const auto result = client.Get("/api/status");
            times.push_back(std::chrono::duration<double>(Clock::now() - start).count());
            if (!result || result->status != 200) times.back() = 1e9;  // a failure counts as endless
        }
        return times;
    }
    pid_t pid() const { return pid_; }
    const std::string& root() const { return root_; }
    int port() const { return port_; }

private:
    std::string root_;
    pid_t pid_ = -1;
    int port_ = 0;
};

// 500 connections: half idle after connecting, half sending a request head a byte every 10 ms
// and never ending it.
class Flood {
public:
    explicit Flood(const Console& console) {
        for (int i = 0; i < 500; ++i) {
            const int fd = console.Connect();
            (i % 2 == 0 ? idle_ : trickling_).push_back(fd);
        }
        const std::string start = "GET /api/status HTTP/1.1\r\nHost: 127.0.0.1\r\nX-Slow: ";
        for (const int fd : trickling_) (void)send(fd, start.data(), start.size(), MSG_NOSIGNAL);
        trickler_ = std::thread([this] {
            while (!stopping_) {
                for (const int fd : trickling_) (void)send(fd, "a", 1, MSG_NOSIGNAL | MSG_DONTWAIT);
                std::this_thread::sleep_for(std::chrono::milliseconds(10));
            }
        });
    }
    ~Flood() {
        stopping_ = true;
        trickler_.join();
        for (const int fd : idle_) close(fd);
        for (const int fd : trickling_) close(fd);
    }

private:
    std::vector<int> idle_, trickling_;
    std::atomic<bool> stopping_{false};
    std::thread trickler_;
};

double Percentile(std::vector<double> times, double fraction) {
    std::sort(times.begin(), times.end());
    return times[std::min(times.size() - 1, static_cast<size_t>(fraction * static_cast<double>(times.size())))];
}

void BM_RequestsDuringAFloodOfSlowConnections(benchmark::State& state) {
    const int requests = static_cast<int>(std::max(20.0, 400 * (std::getenv("FILEINDEX_BENCH_SCALE") ? std::atof(std::getenv("FILEINDEX_BENCH_SCALE")) : 1.0)));
    Console console;
    std::vector<double> quiet, flooded;
    double quietKiB = 0, floodKiB = 0;
    for (auto _ : state) {
        quiet = console.TimeRequests(requests);
        quietKiB = MemoryKiB(console.pid(), "VmRSS:");
        Flood flood(console);
        flooded = console.TimeRequests(requests);
        floodKiB = MemoryKiB(console.pid(), "VmRSS:");
        state.SetIterationTime(Percentile(flooded, 0.99));
    }
    state.counters["quiet_p50_ms"] = Percentile(quiet, 0.5) * 1e3;
    state.counters["quiet_p99_ms"] = Percentile(quiet, 0.99) * 1e3;
    state.counters["flood_p50_ms"] = Percentile(flooded, 0.5) * 1e3;
    state.counters["flood_p99_ms"] = Percentile(flooded, 0.99) * 1e3;
    state.counters["p99_ratio"] = Percentile(flooded, 0.99) / Percentile(quiet, 0.99);
    state.counters["quiet_rss_MiB"] = quietKiB / 1024;
    state.counters["flood_rss_MiB"] = floodKiB / 1024;
}
BENCHMARK(BM_RequestsDuringAFloodOfSlowConnections)->UseManualTime()->Unit(benchmark::kMillisecond)->Iterations(1);

double Scale() { return std::getenv("FILEINDEX_BENCH_SCALE") ? std::atof(std::getenv("FILEINDEX_BENCH_SCALE")) : 1.0; }

// Share "music" with one indexed folder and an index of `files` files whose every name and text
// share the word "common": a search for "c" ranks them all.
void MakeSlowIndex(const std::string& root, int files) {
    const std::string share = root + "/volume1/music";
    std::filesystem::create_directories(share + "/@eaDir/QIRA@.fileindexdb");
    qira_sim::PutShare("music", share);
    std::filesystem::create_directories(root + "/usr/qira/etc/fileindex");
    std::ofstream(root + "/usr/qira/etc/fileindex/folder.conf") << R"({"/music": {"document": true}})";
    tools::IndexProblem problem;
    std::string error;
    const auto index = tools::SearchIndex::Open(share, true, problem, error);
    index->Begin();
    for (int i = 0; i < files; ++i) {
        index->Put({"/music/common-" + std::to_string(i) + ".txt", "document", 100, 0,
                    "common words of a common file, number " + std::to_string(i), "", Json::Value(Json::objectValue)});
    }
    index->Commit();
}

void BM_StatusWhileTenSearchesRun(benchmark::State& state) {
    const int requests = static_cast<int>(std::max(20.0, 400 * Scale()));
    Console console;
    setenv("QIRA_ROOT", console.root().c_str(), 1);
    MakeSlowIndex(console.root(), static_cast<int>(std::max(1000.0, 300000 * Scale())));
    std::string token = ReadFile(console.root() + "/usr/qira/etc/fileindex/web.token");
    token.erase(token.find_last_not_of("\n") + 1);
    std::vector<double> quiet, busy, searches;
    for (auto _ : state) {
        quiet = console.TimeRequests(requests);
        std::atomic<bool> stopping{false};
        std::mutex timesMutex;
        std::vector<std::thread> searchers;
        for (int i = 0; i < 10; ++i) {
            searchers.emplace_back([&] {
                httplib::Client client("127.0.0.1", console.port());
                client.set_read_timeout(30, 0);
                while (!stopping) {
                    const auto start = Clock::now();
                    client.Get("/api/search?q=c&limit=200", {{"X-Fileindex-Token", token}});
                    std::lock_guard<std::mutex> lock(timesMutex);
                    searches.push_back(std::chrono::duration<double>(Clock::now() - start).count());
                }
            });
        }
        std::this_thread::sleep_for(std::chrono::milliseconds(200));  // the searches under way
        busy = console.TimeRequests(requests);
        stopping = true;
        for (auto& searcher : searchers) searcher.join();
        state.SetIterationTime(Percentile(busy, 0.99));
    }
    state.counters["quiet_p99_ms"] = Percentile(quiet, 0.99) * 1e3;
    state.counters["busy_p50_ms"] = Percentile(busy, 0.5) * 1e3;
    state.counters["busy_p99_ms"] = Percentile(busy, 0.99) * 1e3;
    state.counters["search_p50_ms"] = Percentile(searches, 0.5) * 1e3;
    state.counters["searches"] = static_cast<double>(searches.size());
}
BENCHMARK(BM_StatusWhileTenSearchesRun)->UseManualTime()->Unit(benchmark::kMillisecond)->Iterations(1);

}  // namespace

BENCHMARK_MAIN();
