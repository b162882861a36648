// Queue records a share's users could write, taken and applied by the daemon stand-in's queue take
// and record applier: whatever the records say, nothing outside the share is opened (an inotify
// watch on the share's neighbours and on a directory outside the appliance's volume tells).
//
// Each input line is a record: one starting with "{" as it stands, any other as the event picked
// by its first byte and a path of the share's directory followed by the rest of the line (so that
// "/../.." climbs), a move taking the next line as its old path.
#include <sys/inotify.h>
#include <sys/stat.h>
#include <unistd.h>

#include <csignal>
#include <cstdlib>
#include <cstring>
#include <string>
#include <vector>

#include <json/value.h>

#include "fileindex/fileindex.h"
#include "harness.h"
#include "queue_take.h"
#include "share_indexer.h"

namespace {

const unsigned kEvents[] = {1, 2, 4, 8, 256, 65536, 131072};
volatile sig_atomic_t g_stop = 0;

struct Appliance {
    int watch = -1;
    std::vector<QIRA::FILEINDEX::Folder> folders;
};

const Appliance& Setup() {
    static const Appliance appliance = [] {
        Appliance made;
        const std::string root = fuzzkit::Root();
        for (const char* dir : {"/outside", "/volume1/other", "/usr", "/usr/qira", "/usr/qira/etc", "/usr/qira/etc/fileindex"}) {
            mkdir((root + dir).c_str(), 0755);
        }
        fuzzkit::WriteFile(root + "/outside/secret.txt", "secret");
        fuzzkit::WriteFile(root + "/volume1/other/secret.txt", "secret");
        fuzzkit::WriteFile(fuzzkit::MusicDir() + "/a/one.txt", "one");
        fuzzkit::WriteFile(fuzzkit::MusicDir() + "/a/b/two.txt", "two");
        fuzzkit::WriteFile(root + "/usr/qira/etc/fileindex/folder.conf", R"({"/music/a": {"document": true}})");
        QIRA::FILEINDEX::IndexMgr::List(made.folders);
        made.watch = inotify_init1(IN_NONBLOCK | IN_CLOEXEC);
        for (const char* dir : {"/outside", "/volume1", "/volume1/other"}) {
            inotify_add_watch(made.watch, (root + dir).c_str(), IN_OPEN | IN_ACCESS);
        }
        return made;
    }();
    return appliance;
}

// Aborts when anything but the share's own directory was opened among its neighbours or outside.
void ExpectNothingOpenedOutside(int watch) {
    alignas(inotify_event) char buffer[4096];
    ssize_t got;
    while ((got = read(watch, buffer, sizeof buffer)) > 0) {
        for (ssize_t at = 0; at < got;) {
            const auto* event = reinterpret_cast<const inotify_event*>(buffer + at);
            if (event->len == 0 || std::strcmp(event->name, "music") != 0) abort();
            at += static_cast<ssize_t>(sizeof(inotify_event) + event->len);
        }
    }
}

std::string QueueText(const std::string& input) {
    std::vector<std::string> lines;
    for (size_t begin = 0; begin <= input.size();) {
        const size_t end = std::min(input.find('\n', begin), input.size());
        lines.push_back(input.substr(begin, end - begin));
        begin = end + 1;
    }
    std::string text;
    for (size_t i = 0; i < lines.size(); ++i) {
        const std::string& line = lines[i];
        if (line.empty() || line[0] == '{') {
            text += line + "\n";
            continue;
        }
        Json::Value record(Json::objectValue);
        record["event"] = kEvents[static_cast<unsigned char>(line[0]) % (sizeof kEvents / sizeof kEvents[0])];
        record["path"] = fuzzkit::MusicDir() + line.substr(1);
        if (record["event"].asUInt() == 256 && i + 1 < lines.size()) record["path_old"] = fuzzkit::MusicDir() + lines[++i];
        text += QIRA::FILEINDEX::toString(record) + "\n";
    }
    return text;
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const uint8_t* data, size_t size) {
    const Appliance& appliance = Setup();
    // Paths are what is fuzzed here: files are indexed by name, no extraction worker being built beside.
    static fileindexd_ref::ExtractorClient extractor({fileindexd_ref::DefaultExtractorProgram(), {}, std::chrono::seconds(10)});
    static fileindexd_ref::ShareIndexer indexer("music", &g_stop, extractor);
    static fileindexd_ref::QueueTake queue("music", fuzzkit::MusicDir());
    fuzzkit::WriteFile(fuzzkit::QueuePath(), QueueText(std::string(reinterpret_cast<const char*>(data), size)));
    queue.Take();
    do {
        queue.ApplyNext(1000, [&](const fileindexd_ref::Batch& batch) { return indexer.Apply(batch, appliance.folders); });
    } while (queue.HasMore());
    ExpectNothingOpenedOutside(appliance.watch);
    return 0;
}
