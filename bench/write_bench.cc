// Writing folder.conf: upserts into busy shares and into one share, share removal and rename,
// each against a baseline measured in the same run.
#include <sys/stat.h>
#include <unistd.h>

#include "fileindex/fileindex.h"
#include "scratch_appliance.h"

namespace {

using namespace QIRA::FILEINDEX;
using bench::ScratchAppliance;

Json::Value NewFolders(const std::vector<std::string>& shares, size_t perShare, const std::string& prefix) {
    Json::Value request(Json::arrayValue);
    for (const auto& share : shares) {
        for (size_t i = 0; i < perShare; ++i) {
            Json::Value folder(Json::objectValue);
            folder["path"] = "/" + share + "/" + prefix + std::to_string(i);
            folder["audio"] = true;
            request.append(folder);
        }
    }
    return request;
}

void MakeDirs(const ScratchAppliance& app, const Json::Value& request) {
    for (const auto& folder : request) mkdir((app.root() + "/volume1" + folder["path"].asString()).c_str(), 0755);
}

// 100 new folders in 10 shares whose queues hold 10 MB each; the baseline has no queues.
void BM_Upsert100_TenBusyQueues(benchmark::State& state) {
    ScratchAppliance app;
    std::vector<std::string> shares;
    for (int s = 0; s < 10; ++s) shares.push_back("s" + std::to_string(s));
    std::vector<std::string> existing;
    for (const auto& share : shares) {
        app.AddShare(share);
        existing.push_back("/" + share + "/old");
    }
    app.WriteFolderConf(existing);
    const Json::Value request = NewFolders(shares, 10, "new");
    MakeDirs(app, request);
    std::vector<off_t> sizes(shares.size(), 0);
    const auto reset = [&] {
        app.WriteFolderConf(existing);
        for (size_t i = 0; i < shares.size(); ++i) {
            if (sizes[i] == 0) unlink(app.QueueOf(shares[i]).c_str());
            else if (truncate(app.QueueOf(shares[i]).c_str(), sizes[i]) != 0) state.SkipWithError("truncate");
        }
    };
    const auto run = [&] { benchmark::DoNotOptimize(IndexMgr::Upsert(request)); };
    const double noQueues = bench::MedianSeconds(5, reset, run);
    for (size_t i = 0; i < shares.size(); ++i) sizes[i] = static_cast<off_t>(app.WriteQueue(shares[i], bench::Scaled(10u << 20)));
    bench::RunAgainstBaseline(state, noQueues, reset, run);
}
BENCHMARK(BM_Upsert100_TenBusyQueues)->UseManualTime()->Unit(benchmark::kMillisecond)->Iterations(5);

// k new folders into one share: 1000 against 100.
void BM_Upsert1000_OneShare(benchmark::State& state) {
    ScratchAppliance app;
    app.AddShare("music");
    const Json::Value hundred = NewFolders({"music"}, 100, "f");
    const Json::Value thousand = NewFolders({"music"}, 1000, "f");
    MakeDirs(app, thousand);
    const auto reset = [&] {
        app.WriteFolderConf({});
        unlink(app.QueueOf("music").c_str());
    };
    bench::RunAgainstBaseline(state, {reset, [&] { IndexMgr::Upsert(hundred); }},
                              {reset, [&] { benchmark::DoNotOptimize(IndexMgr::Upsert(thousand)); }});
}
BENCHMARK(BM_Upsert1000_OneShare)->UseManualTime()->Unit(benchmark::kMillisecond)->Iterations(5);

std::vector<std::string> FolderPaths(const std::string& share, size_t count) {
    std::vector<std::string> paths;
    for (size_t i = 0; i < count; ++i) paths.push_back("/" + share + "/f" + std::to_string(i));
    return paths;
}

// Removing a share of 900 folders against one of 100.
void BM_ShareRemove900(benchmark::State& state) {
    ScratchAppliance app;
    app.AddShare("music");
    const auto reset900 = [&] { app.WriteFolderConf(FolderPaths("music", 900)); };
    const auto reset100 = [&] { app.WriteFolderConf(FolderPaths("music", 100)); };
    const auto run = [] { benchmark::DoNotOptimize(IndexMgr::ShareRemove("music")); };
    bench::RunAgainstBaseline(state, {reset100, run}, {reset900, run});
}
BENCHMARK(BM_ShareRemove900)->UseManualTime()->Unit(benchmark::kMillisecond)->Iterations(5);

// Renaming a share of 900 folders (target: at most 150 ms); the ratio is to a share of 100.
void BM_ShareRename900(benchmark::State& state) {
    ScratchAppliance app;
    app.AddShare("music");
    app.AddShare("tunes");
    const auto reset900 = [&] { app.WriteFolderConf(FolderPaths("music", 900)); };
    const auto reset100 = [&] { app.WriteFolderConf(FolderPaths("music", 100)); };
    const auto run = [] { benchmark::DoNotOptimize(IndexMgr::ShareRename("music", "tunes")); };
    bench::RunAgainstBaseline(state, {reset100, run}, {reset900, run});
}
BENCHMARK(BM_ShareRename900)->UseManualTime()->Unit(benchmark::kMillisecond)->Iterations(5);

}  // namespace

BENCHMARK_MAIN();
