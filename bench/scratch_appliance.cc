#include "scratch_appliance.h"

#include <fcntl.h>
#include <ftw.h>
#include <poll.h>
#include <sys/socket.h>
#include <sys/stat.h>
#include <sys/un.h>
#include <unistd.h>

#include <algorithm>
#include <cstdio>
#include <chrono>
#include <cstdlib>
#include <cstring>
#include <fstream>

#include "fileindex/json.h"
#include "queue_mix.h"
#include "qira_sim/appliance.h"

namespace bench {

double Scale() {
    const char* text = std::getenv("FILEINDEX_BENCH_SCALE");
    const double scale = text ? std::atof(text) : 1.0;
    return scale > 0 ? scale : 1.0;
}

size_t Scaled(size_t count) { return std::max<size_t>(1, static_cast<size_t>(static_cast<double>(count) * Scale())); }

namespace {

std::string ScratchRoot() {
    char tmpl[] = "/tmp/fileindex-bench-XXXXXX";
    return mkdtemp(tmpl);
}

}  // namespace

ScratchAppliance::ScratchAppliance() : root_(ScratchRoot()), log_(root_ + "/log.sock") {
    setenv("QIRA_ROOT", root_.c_str(), 1);
    qira_sim::InitAppliance(root_);
    mkdir((root_ + "/volume1").c_str(), 0755);
    listener_ = socket(AF_UNIX, SOCK_STREAM | SOCK_CLOEXEC, 0);
    sockaddr_un address{};
    address.sun_family = AF_UNIX;
    std::strncpy(address.sun_path, (root_ + "/var/run/fileindexd.sock").c_str(), sizeof address.sun_path - 1);
    bind(listener_, reinterpret_cast<sockaddr*>(&address), sizeof address);
    listen(listener_, 64);
    daemon_ = std::thread([this] { ServeDaemon(); });
}

ScratchAppliance::~ScratchAppliance() {
    stopping_ = true;
    daemon_.join();
    close(listener_);
    nftw(root_.c_str(), [](const char* p, const struct stat*, int, FTW*) { return remove(p); }, 16,
         FTW_DEPTH | FTW_PHYS);
}

void ScratchAppliance::ServeDaemon() {
    char buffer[65536];
    while (!stopping_) {
        pollfd ready{listener_, POLLIN, 0};
        if (poll(&ready, 1, 20) <= 0) continue;
        const int client = accept4(listener_, nullptr, nullptr, SOCK_CLOEXEC);
        if (client < 0) continue;
        while (read(client, buffer, sizeof buffer) > 0) {
        }
        close(client);
    }
}

std::string ScratchAppliance::AddShare(const std::string& name) {
    const std::string dir = root_ + "/volume1/" + name;
    mkdir(dir.c_str(), 0755);
    mkdir((dir + "/@eaDir").c_str(), 0755);
    mkdir((dir + "/busy").c_str(), 0755);
    qira_sim::PutShare(name, dir);
    return dir;
}

std::string ScratchAppliance::FolderConf() const { return root_ + "/usr/qira/etc/fileindex/folder.conf"; }

void ScratchAppliance::WriteFolderConf(const std::vector<std::string>& paths) {
    Json::Value conf(Json::objectValue);
    for (const auto& path : paths) {
        mkdir((root_ + "/volume1" + path).c_str(), 0755);
        Json::Value folder(Json::objectValue);
        folder["path"] = path;
        folder["name"] = path.substr(path.rfind('/') + 1);
        folder["document"] = folder["photo"] = true;
        folder["audio"] = folder["video"] = false;
        conf[path] = folder;
    }
    QIRA::FILEINDEX::toFile(conf, FolderConf());
}

std::string ScratchAppliance::QueueOf(const std::string& share) const {
    return root_ + "/volume1/" + share + "/@eaDir/QIRA@file_index_queue";
}

size_t ScratchAppliance::WriteQueue(const std::string& share, size_t bytes) {
    std::ofstream out(QueueOf(share), std::ios::trunc);
    const std::string dir = root_ + "/volume1/" + share + "/busy";
    size_t written = 0, lines = 0;
    for (; written < bytes; ++lines) {
        const std::string line = MixedQueueLine(dir, lines);
        out << line;
        written += line.size();
    }
    queueLines_[share] = lines;
    return written;
}

void ScratchAppliance::AppendToQueue(const std::string& share, size_t count) {
    std::ofstream out(QueueOf(share), std::ios::app);
    const std::string dir = root_ + "/volume1/" + share + "/busy";
    size_t& lines = queueLines_[share];
    for (const size_t end = lines + count; lines < end; ++lines) out << MixedQueueLine(dir, lines);
}

size_t ScratchAppliance::queueLines(const std::string& share) const {
    const auto found = queueLines_.find(share);
    return found == queueLines_.end() ? 0 : found->second;
}

namespace {

double Seconds(const std::function<void()>& run) {
    const auto start = std::chrono::steady_clock::now();
    run();
    return std::chrono::duration<double>(std::chrono::steady_clock::now() - start).count();
}

double Median(std::vector<double> times) {
    std::sort(times.begin(), times.end());
    return times[times.size() / 2];
}

void Report(benchmark::State& state, double medianSeconds, double baselineSeconds) {
    state.counters["median_ms"] = medianSeconds * 1e3;
    state.counters["baseline_ms"] = baselineSeconds * 1e3;
    state.counters["ratio"] = medianSeconds / baselineSeconds;
}

}  // namespace

double MedianSeconds(int runs, const std::function<void()>& reset, const std::function<void()>& run) {
    std::vector<double> times;
    for (int i = 0; i < runs; ++i) {
        reset();
        times.push_back(Seconds(run));
    }
    return Median(times);
}

namespace {

// The benchmark loop: `untimed` before each timed `run`; the run's times.
std::vector<double> Iterate(benchmark::State& state, const std::function<void()>& untimed,
                            const std::function<void()>& run) {
    std::vector<double> times;
    for (auto _ : state) {
        untimed();
        times.push_back(Seconds(run));
        state.SetIterationTime(times.back());
    }
    return times;
}

}  // namespace

void RunAgainstBaseline(benchmark::State& state, double baselineSeconds, const std::function<void()>& reset,
                        const std::function<void()>& run) {
    Report(state, Median(Iterate(state, reset, run)), baselineSeconds);
}

void RunAgainstBaseline(benchmark::State& state, const Step& baseline, const Step& measured) {
    std::vector<double> baselineTimes;
    const auto untimed = [&] {
        baseline.reset();
        baselineTimes.push_back(Seconds(baseline.run));
        measured.reset();
    };
    const std::vector<double> times = Iterate(state, untimed, measured.run);
    std::vector<double> ratios;
    for (size_t i = 0; i < times.size(); ++i) ratios.push_back(times[i] / baselineTimes[i]);
    Report(state, Median(times), Median(baselineTimes));
    state.counters["ratio"] = Median(ratios);  // of each iteration's pair
}

size_t CountLinesPlain(const std::vector<std::string>& files) {
    static char buffer[1 << 20];
    size_t lines = 0;
    for (const auto& file : files) {
        const int fd = open(file.c_str(), O_RDONLY | O_CLOEXEC);
        ssize_t got;
        while ((got = read(fd, buffer, sizeof buffer)) > 0) {
            for (const char* p = buffer; (p = static_cast<const char*>(std::memchr(p, '\n', buffer + got - p))) != nullptr; ++p) {
                ++lines;
            }
        }
        close(fd);
    }
    return lines;
}

}  // namespace bench
