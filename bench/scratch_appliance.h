// A simulated appliance in a scratch directory for one benchmark, with a daemon stand-in that
// accepts and discards every command and a socket that receives the library's log lines, and
// helpers that time a benchmark against its baseline.
#pragma once

#include <atomic>
#include <functional>
#include <map>
#include <string>
#include <thread>
#include <vector>

#include <benchmark/benchmark.h>

#include "log_socket.h"

namespace bench {

// Data sizes are multiplied by FILEINDEX_BENCH_SCALE (default 1); CI runs with a small scale.
double Scale();
size_t Scaled(size_t count);

class ScratchAppliance {
public:
    ScratchAppliance();
    ~ScratchAppliance();
    ScratchAppliance(const ScratchAppliance&) = delete;
    ScratchAppliance& operator=(const ScratchAppliance&) = delete;

    // Creates <root>/volume1/<name> with its "@eaDir" and registers the share.
    std::string AddShare(const std::string& name);
    // Creates the directories and writes folder.conf holding these share paths.
    void WriteFolderConf(const std::vector<std::string>& paths);
    std::string QueueOf(const std::string& share) const;
    // Fills the share's queue with about `bytes` of mixed lines (queue_mix.h) under the share's
    // directory "busy"; returns the file size. The lines written are counted in queueLines().
    size_t WriteQueue(const std::string& share, size_t bytes);
    // Appends `count` more such lines to the share's queue, as writers do.
    void AppendToQueue(const std::string& share, size_t count);
    size_t queueLines(const std::string& share) const;
    // The library's log lines received so far.
    size_t logLines() const { return log_.received(); }
    std::string FolderConf() const;
    const std::string& root() const { return root_; }

private:
    void ServeDaemon();

    std::string root_;
    LogSocket log_;
    std::map<std::string, size_t> queueLines_;
    int listener_ = -1;
    std::atomic<bool> stopping_{false};
    std::thread daemon_;
};

// Median wall time of `runs` runs of `run`, each after an untimed `reset`.
double MedianSeconds(int runs, const std::function<void()>& reset, const std::function<void()>& run);

// Runs the benchmark loop with manual timing (reset untimed) and reports the median time per
// iteration, the baseline's and their ratio.
void RunAgainstBaseline(benchmark::State& state, double baselineSeconds, const std::function<void()>& reset,
                        const std::function<void()>& run);

// An untimed reset, then the timed run.
struct Step {
    std::function<void()> reset;
    std::function<void()> run;
};

// The same with the baseline timed in every iteration just before the measured step, so that a
// spell in which the machine runs slower slows both alike; the ratio is the median of the
// iterations' own ratios.
void RunAgainstBaseline(benchmark::State& state, const Step& baseline, const Step& measured);

// One read()+memchr pass over the files, counting lines: the floor for reading them.
size_t CountLinesPlain(const std::vector<std::string>& files);

}  // namespace bench
