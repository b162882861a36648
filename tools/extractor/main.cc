// fileindex-extractor: the worker that reads what files hold for the indexing daemon, in a
// sandbox, one file at a time. Its standard input is a stream socket to the daemon; each request
// brings a descriptor of a file opened read-only, and each answer is written before the next is
// read. It ends at the end of the stream; a file that breaks it costs only this process.
#include <unistd.h>

#include <iostream>

#include <CLI/CLI.hpp>

#include "cli.h"
#include "content.h"
#include "protocol.h"
#include "worker_sandbox.h"

namespace {

bool Answer(int socket, const extractor::Reply& reply) {
    return extractor::SendFrame(socket, extractor::EncodeReplyHeader(reply)) &&
           extractor::SendAll(socket, reply.text.data(), reply.text.size());
}

}  // namespace

int main(int argc, char** argv) {
    CLI::App app{"Reads what files hold for the indexing daemon, in a sandbox", "fileindex-extractor"};
    app.set_version_flag("--version", "fileindex-extractor " FILEINDEX_VERSION);
    extractor::Limits limits;
    app.add_option("--memory", limits.memoryMiB, "Address space allowed, in MiB")->check(CLI::Range(64, 65536));
    app.add_option("--cpu", limits.cpuSeconds, "CPU seconds allowed per file")->check(CLI::Range(1, 3600));
    if (const auto ended = tools::Parse(app, argc, argv)) return *ended;
    extractor::ContentReader reader;
    if (!reader.Load()) {
        std::cerr << "fileindex-extractor: cannot load libmagic's database\n";
        return 1;
    }
    if (!extractor::EnterSandbox(limits)) {
        std::cerr << "fileindex-extractor: cannot enter the sandbox\n";
        return 1;
    }
    for (;;) {
        std::string payload;
        int fd = -1;
        if (!extractor::ReceiveFrame(STDIN_FILENO, extractor::kMaxRequestBytes, payload, &fd)) return 0;
        extractor::Request request;
        extractor::Reply reply;
        std::string problem;
        if (fd < 0) {
            reply.problem = "no file came with the request";
        } else if (!extractor::DecodeRequest(payload, request, problem)) {
            reply.problem = problem;
        } else if (!extractor::CpuBudget(limits.cpuSeconds)) {
            reply.problem = "the CPU limit cannot be set";
        } else {
            reply = reader.Read(fd, request);
        }
        if (fd >= 0) close(fd);
        if (!Answer(STDIN_FILENO, reply)) return 0;
    }
}
