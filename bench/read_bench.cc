// Reading queues and folder.conf: a folder's status over a large queue, a listing page over busy
// shares and the membership questions, each against the plain cost of reading the same files.
#include <memory>

#include "fileindex/fileindex.h"
#include "queue_count.h"
#include "scratch_appliance.h"

namespace {

using namespace QIRA::FILEINDEX;
using bench::ScratchAppliance;

const auto kNothing = [] {};

// 1,000,000 records (about 130 MB), 1% malformed, all under the folder: every line is read.
void BM_GetFolderStatus_1MRecords(benchmark::State& state) {
    ScratchAppliance app;
    app.AddShare("music");
    app.WriteFolderConf({"/music/busy"});
    app.WriteQueue("music", bench::Scaled(130u << 20), 100);
    const std::vector<std::string> files = {app.QueueOf("music")};
    bench::RunAgainstBaseline(state, {kNothing, [&] { benchmark::DoNotOptimize(bench::CountLinesPlain(files)); }},
                              {kNothing, [] { benchmark::DoNotOptimize(StatusMgr::GetFolderStatus("/music/busy")); }});
}
BENCHMARK(BM_GetFolderStatus_1MRecords)->UseManualTime()->Unit(benchmark::kMillisecond)->Iterations(9);

// The progress report's count of a share's pending records: lines, without parsing.
void BM_ProgressCount_1MRecords(benchmark::State& state) {
    ScratchAppliance app;
    app.AddShare("music");
    app.WriteQueue("music", bench::Scaled(130u << 20), 100);
    const std::vector<std::string> files = {app.QueueOf("music")};
    bench::RunAgainstBaseline(state, {kNothing, [&] { benchmark::DoNotOptimize(bench::CountLinesPlain(files)); }},
                              {kNothing, [&] { benchmark::DoNotOptimize(detail::CountLines(app.QueueOf("music"))); }});
}
BENCHMARK(BM_ProgressCount_1MRecords)->UseManualTime()->Unit(benchmark::kMillisecond)->Iterations(5);

// 1000 folders in 10 shares, each share's queue 10 MB; a page of 50 with status and validity.
void BM_ListingPage50_TenBusyQueues(benchmark::State& state) {
    ScratchAppliance app;
    std::vector<std::string> paths, files;
    for (int s = 0; s < 10; ++s) {
        const std::string share = "s" + std::to_string(s);
        app.AddShare(share);
        for (int f = 0; f < 100; ++f) paths.push_back("/" + share + "/f" + std::to_string(f));
        app.WriteQueue(share, bench::Scaled(10u << 20));
        files.push_back(app.QueueOf(share));
    }
    app.WriteFolderConf(paths);
    Json::Value additional(Json::arrayValue);
    additional.append("status");
    additional.append("is_valid");
    const auto page = [&] {
        Json::Value out;
        IndexMgr::List(out, 100, 50, "name", "ASC", additional);
        benchmark::DoNotOptimize(out);
    };
    bench::RunAgainstBaseline(state, {kNothing, [&] { benchmark::DoNotOptimize(bench::CountLinesPlain(files)); }},
                              {kNothing, page});
}
BENCHMARK(BM_ListingPage50_TenBusyQueues)->UseManualTime()->Unit(benchmark::kMillisecond)->Iterations(5);

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
