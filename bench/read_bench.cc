// Reading queues and folder.conf: a folder's status over a large queue, a listing page over busy
// shares and the membership questions, each against the plain cost of reading the same files.

#include "fileindex/fileindex.h"
#include "fileindex/progress.h"
#include "queue_readings.h"
#include "scratch_appliance.h"

namespace {

using namespace QIRA::FILEINDEX;
using bench::ScratchAppliance;

const auto kNothing = [] {};
const auto kForgetReadings = [] { detail::ForgetQueueReadings(); };

// One share whose queue holds about 1,000,000 mixed lines (about 130 MB), all under the folder.
class MillionRecords {
public:
    MillionRecords() {
        app_.AddShare("music");
        app_.WriteFolderConf({"/music/busy"});
        app_.WriteQueue("music", bench::Scaled(130u << 20));
        files_ = {app_.QueueOf("music")};
    }
    bench::Step ReadPlain() const {
        return {kNothing, [this] { benchmark::DoNotOptimize(bench::CountLinesPlain(files_)); }};
    }
    void AppendThousand() { app_.AppendToQueue("music", 1000); }
    void Report(benchmark::State& state) const {
        state.counters["lines"] = static_cast<double>(app_.queueLines("music"));
        state.counters["log_lines"] = static_cast<double>(app_.logLines());
        state.counters["state_bytes"] = static_cast<double>(detail::QueueReadingsFootprint());
    }
    const std::string& queue() const { return files_[0]; }

private:
    ScratchAppliance app_;
    std::vector<std::string> files_;
};

const auto kFolderStatus = [] { benchmark::DoNotOptimize(StatusMgr::GetFolderStatus("/music/busy")); };

// The first question over the queue: every line read, each malformed one logged.
void BM_GetFolderStatus_1MRecords_FirstRead(benchmark::State& state) {
    MillionRecords queue;
    bench::RunAgainstBaseline(state, queue.ReadPlain(), {kForgetReadings, kFolderStatus});
    queue.Report(state);
}
BENCHMARK(BM_GetFolderStatus_1MRecords_FirstRead)->UseManualTime()->Unit(benchmark::kMillisecond)->Iterations(9);

// The same question again over the unchanged queue.
void BM_GetFolderStatus_1MRecords_Unchanged(benchmark::State& state) {
    MillionRecords queue;
    kFolderStatus();
    bench::RunAgainstBaseline(state, queue.ReadPlain(), {kNothing, kFolderStatus});
    queue.Report(state);
}
BENCHMARK(BM_GetFolderStatus_1MRecords_Unchanged)->UseManualTime()->Unit(benchmark::kMillisecond)->Iterations(21);

// Again after 1,000 more lines were appended (untimed) before each question.
void BM_GetFolderStatus_1MRecords_After1000Appended(benchmark::State& state) {
    MillionRecords queue;
    kFolderStatus();
    bench::RunAgainstBaseline(state, queue.ReadPlain(), {[&] { queue.AppendThousand(); }, kFolderStatus});
    queue.Report(state);
}
BENCHMARK(BM_GetFolderStatus_1MRecords_After1000Appended)->UseManualTime()->Unit(benchmark::kMillisecond)->Iterations(21);

// The progress report's count of a share's pending records, read from the start: lines only.
void BM_ProgressCount_1MRecords_FirstRead(benchmark::State& state) {
    MillionRecords queue;
    bench::RunAgainstBaseline(state, queue.ReadPlain(),
                              {kForgetReadings, [&] {
                                  detail::QueueAnswer answer;
                                  benchmark::DoNotOptimize(detail::ReadQueue(queue.queue(), {}, answer));
                              }});
}
BENCHMARK(BM_ProgressCount_1MRecords_FirstRead)->UseManualTime()->Unit(benchmark::kMillisecond)->Iterations(5);

// 1000 folders in 10 shares, each share's queue 10 MB of mixed lines.
class TenBusyQueues {
public:
    TenBusyQueues() {
        std::vector<std::string> paths;
        for (int s = 0; s < 10; ++s) {
            const std::string share = "s" + std::to_string(s);
            app_.AddShare(share);
            shares_.push_back(share);
            for (int f = 0; f < 100; ++f) paths.push_back("/" + share + "/f" + std::to_string(f));
            app_.WriteQueue(share, bench::Scaled(10u << 20));
            files_.push_back(app_.QueueOf(share));
        }
        app_.WriteFolderConf(paths);
    }
    bench::Step ReadPlain() const {
        return {kNothing, [this] { benchmark::DoNotOptimize(bench::CountLinesPlain(files_)); }};
    }
    // 1,000 lines appended in all, a tenth to each queue.
    void AppendThousand() {
        for (const auto& share : shares_) app_.AppendToQueue(share, 100);
    }
    void Report(benchmark::State& state) const {
        state.counters["log_lines"] = static_cast<double>(app_.logLines());
        state.counters["state_bytes"] = static_cast<double>(detail::QueueReadingsFootprint());
    }

private:
    ScratchAppliance app_;
    std::vector<std::string> shares_, files_;
};

// A page of 50 with status and validity, as the console asks for it.
void ListingPage() {
    Json::Value additional(Json::arrayValue);
    additional.append("status");
    additional.append("is_valid");
    Json::Value out;
    IndexMgr::List(out, 100, 50, "name", "ASC", additional);
    benchmark::DoNotOptimize(out);
}

void BM_ListingPage50_TenBusyQueues_FirstRead(benchmark::State& state) {
    TenBusyQueues queues;
    bench::RunAgainstBaseline(state, queues.ReadPlain(), {kForgetReadings, ListingPage});
    queues.Report(state);
}
BENCHMARK(BM_ListingPage50_TenBusyQueues_FirstRead)->UseManualTime()->Unit(benchmark::kMillisecond)->Iterations(5);

void BM_ListingPage50_TenBusyQueues_After1000Appended(benchmark::State& state) {
    TenBusyQueues queues;
    ListingPage();
    bench::RunAgainstBaseline(state, queues.ReadPlain(), {[&] { queues.AppendThousand(); }, ListingPage});
    queues.Report(state);
}
BENCHMARK(BM_ListingPage50_TenBusyQueues_After1000Appended)->UseManualTime()->Unit(benchmark::kMillisecond)->Iterations(21);

// The whole progress report (every share's pending count) as progress --watch asks for it.
void BM_GetProgress_TenBusyQueues_After1000Appended(benchmark::State& state) {
    TenBusyQueues queues;
    const auto progress = [] {
        Json::Value out;
        GetProgress(out);
        benchmark::DoNotOptimize(out);
    };
    progress();
    bench::RunAgainstBaseline(state, queues.ReadPlain(), {[&] { queues.AppendThousand(); }, progress});
    queues.Report(state);
}
BENCHMARK(BM_GetProgress_TenBusyQueues_After1000Appended)->UseManualTime()->Unit(benchmark::kMillisecond)->Iterations(21);

// 1000 folders in 10 shares; the baseline reads and parses the same folder.conf alone.
class Membership {
public:
    Membership() {
        std::vector<std::string> paths;
        for (int s = 0; s < 10; ++s) {
            app_.AddShare("s" + std::to_string(s));
            for (int f = 0; f < 100; ++f) paths.push_back("/s" + std::to_string(s) + "/f" + std::to_string(f));
        }
        app_.WriteFolderConf(paths);
    }
    double ParseAlone() {
        return bench::MedianSeconds(21, kNothing, [this] {
            Json::Value conf;
            fromFile(conf, app_.FolderConf());
            benchmark::DoNotOptimize(conf);
        });
    }
    std::string FullPath(const std::string& inside) const { return app_.root() + "/volume1" + inside; }

private:
    ScratchAppliance app_;
};

void BM_IsPathIndexed_1000Folders(benchmark::State& state) {
    Membership membership;
    bench::RunAgainstBaseline(state, membership.ParseAlone(), kNothing,
                              [] { benchmark::DoNotOptimize(IndexMgr::IsPathIndexed("/s9/f99/x")); });
}
BENCHMARK(BM_IsPathIndexed_1000Folders)->UseManualTime()->Unit(benchmark::kMillisecond)->Iterations(200);

void BM_FILEIDXIsFullPathIndexed_1000Folders(benchmark::State& state) {
    Membership membership;
    const std::string probe = membership.FullPath("/s9/f99/x");
    bench::RunAgainstBaseline(state, membership.ParseAlone(), kNothing,
                              [&] { benchmark::DoNotOptimize(FILEIDXIsFullPathIndexed(probe.c_str())); });
}
BENCHMARK(BM_FILEIDXIsFullPathIndexed_1000Folders)->UseManualTime()->Unit(benchmark::kMillisecond)->Iterations(200);

}  // namespace
