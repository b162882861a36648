// The daemon's side of the extractor: one long-lived worker process (fileindex-extractor), started
// on first use and again after it died. A file the worker cannot answer for (it crashed, ran past
// a limit or the deadline, or answered nonsense) gets a reply whose problem says so; the worker is
// killed and the next file starts a new one, so that no file can stop indexing.
#pragma once

#include <sys/types.h>

#include <chrono>
#include <string>

#include "protocol.h"
#include "worker_sandbox.h"

namespace fileindexd_ref {

struct ExtractorSettings {
    std::string program;                          // the worker's executable
    extractor::Limits limits;                     // passed to it
    std::chrono::milliseconds deadline{10000};    // per file, from the request to the whole answer
};

// Where the worker lies: beside the running program.
std::string DefaultExtractorProgram();

class ExtractorClient {
public:
    explicit ExtractorClient(ExtractorSettings settings) : settings_(std::move(settings)) {}
    ~ExtractorClient() { Stop(); }
    ExtractorClient(const ExtractorClient&) = delete;
    ExtractorClient& operator=(const ExtractorClient&) = delete;

    // What the regular file open as `fd` holds, at most `maxText` bytes of text. On failure the
    // reply's problem is one of "the extractor cannot be started", "the extractor ran past its CPU
    // time limit", "the extractor tried a system call its sandbox forbids", "the extractor was
    // stopped by signal N", "the extractor ended", "the extractor took longer than N ms" or "the
    // extractor's answer is malformed"; the worker is gone then.
    extractor::Reply Extract(int fd, const std::string& name, size_t maxText);

    // The worker's process id; 0 when none runs.
    pid_t Worker() const { return pid_; }

private:
    bool Start();
    // Kills the worker when it still runs and reaps it; the reason it ended.
    std::string Stop();

    ExtractorSettings settings_;
    pid_t pid_ = 0;
    int socket_ = -1;
};

}  // namespace fileindexd_ref
