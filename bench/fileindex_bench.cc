// Speed of the hot queries on a simulated appliance: membership with 1000 folders, a folder's
// status over a 1,000,000-record queue (against a plain read of the same file), and a listing page.
#include <fcntl.h>
#include <ftw.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cstdlib>
#include <fstream>
#include <string>

#include <benchmark/benchmark.h>

#include "fileindex/fileindex.h"
#include "qira_sim/appliance.h"

namespace {

using namespace QIRA::FILEINDEX;

// One appliance for the whole run: share "music" with 1000 folders and a large queue.
class Appliance {
public:
    Appliance() {
        char tmpl[] = "/tmp/fileindex-bench-XXXXXX";
        root_ = mkdtemp(tmpl);
        setenv("QIRA_ROOT", root_.c_str(), 1);
        qira_sim::InitAppliance(root_);
        share_ = root_ + "/volume1/music";
        mkdir((root_ + "/volume1").c_str(), 0755);
        mkdir(share_.c_str(), 0755);
        mkdir((share_ + "/@eaDir").c_str(), 0755);
        qira_sim::PutShare("music", share_);
        Json::Value conf(Json::objectValue);
        for (int i = 0; i < 1000; ++i) {
            const std::string name = "f" + std::to_string(i);
            mkdir((share_ + "/" + name).c_str(), 0755);
            Json::Value folder(Json::objectValue);
            folder["path"] = "/music/" + name;
            folder["name"] = name;
            folder["document"] = folder["audio"] = folder["video"] = folder["photo"] = (i % 2 == 0);
            conf["/music/" + name] = folder;
        }
        toFile(conf, root_ + "/usr/qira/etc/fileindex/folder.conf");
    }
    ~Appliance() {
        nftw(root_.c_str(), [](const char* p, const struct stat*, int, FTW*) { return remove(p); }, 16, FTW_DEPTH | FTW_PHYS);
    }
    std::string QueuePath() const { return share_ + "/@eaDir/QIRA@file_index_queue"; }
    // 1,000,000 records, none under /music/f999 (the scan reads everything).
    void WriteLargeQueue() {
        if (queued_) return;
        std::ofstream out(QueuePath());
        for (int i = 0; i < 1000000; ++i) {
            out << "{\"data\":{\"audio\":true,\"document\":false},\"event\":131072,\"path\":\"" << share_ << "/f"
                << (i % 998) << "/file" << i << "\"}\n";
        }
        queued_ = true;
    }
    const std::string& root() const { return root_; }

private:
    std::string root_;
    std::string share_;
    bool queued_ = false;
};

Appliance& App() {
    static Appliance app;
    return app;
}

void BM_IsPathIndexed_1000Folders(benchmark::State& state) {
    App();
    for (auto _ : state) benchmark::DoNotOptimize(IndexMgr::IsPathIndexed("/music/f999/x"));
}
BENCHMARK(BM_IsPathIndexed_1000Folders)->Unit(benchmark::kMillisecond);

void BM_GetFolderStatus_1MRecordQueue(benchmark::State& state) {
    App().WriteLargeQueue();
    for (auto _ : state) benchmark::DoNotOptimize(StatusMgr::GetFolderStatus("/music/f999"));
    struct stat st;
    stat(App().QueuePath().c_str(), &st);
    state.SetBytesProcessed(static_cast<int64_t>(state.iterations()) * st.st_size);
}
BENCHMARK(BM_GetFolderStatus_1MRecordQueue)->Unit(benchmark::kMillisecond);

// The floor for the scan: reading the same file line by line without parsing.
void BM_PlainSequentialRead_SameQueue(benchmark::State& state) {
    App().WriteLargeQueue();
    for (auto _ : state) {
        FILE* file = fopen(App().QueuePath().c_str(), "r");
        char* line = nullptr;
        size_t capacity = 0;
        size_t lines = 0;
        while (getline(&line, &capacity, file) >= 0) ++lines;
        free(line);
        fclose(file);
        benchmark::DoNotOptimize(lines);
    }
    struct stat st;
    stat(App().QueuePath().c_str(), &st);
    state.SetBytesProcessed(static_cast<int64_t>(state.iterations()) * st.st_size);
}
BENCHMARK(BM_PlainSequentialRead_SameQueue)->Unit(benchmark::kMillisecond);

void BM_ListingPage50_StatusAndValidity(benchmark::State& state) {
    App();
    unlink(App().QueuePath().c_str());
    Json::Value additional(Json::arrayValue);
    additional.append("status");
    additional.append("is_valid");
    for (auto _ : state) {
        Json::Value out;
        IndexMgr::List(out, 100, 50, "name", "ASC", additional);
        benchmark::DoNotOptimize(out);
    }
}
BENCHMARK(BM_ListingPage50_StatusAndValidity)->Unit(benchmark::kMillisecond);

}  // namespace

BENCHMARK_MAIN();
