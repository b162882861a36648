// Any sequence of changes to a queue and its companion (appends of any bytes, takes, truncations,
// rewrites): after each, the incremental reading must give a full reading's answers.
#include <fcntl.h>
#include <unistd.h>

#include <cstdlib>

#include "harness.h"
#include "queue_reference.h"

using namespace QIRA::FILEINDEX;

namespace {

void Append(const std::string& file, const unsigned char* data, size_t size) {
    const int fd = open(file.c_str(), O_WRONLY | O_CREAT | O_APPEND, 0644);
    if (fd < 0) return;
    if (write(fd, data, size) < 0) {
        // nothing to add: the next comparison sees the file as it is
    }
    close(fd);
}

void Check(const std::string& file, const std::vector<std::string>& prefixes) {
    detail::QueueAnswer incremental, full;
    const bool read = detail::ReadQueue(file, prefixes, incremental);
    if (read != testkit::FullReading(file, prefixes, full)) std::abort();
    if (read && (incremental.lines != full.lines || incremental.under != full.under)) std::abort();
}

}  // namespace

// Each step: one byte naming the change and its size, then that many bytes of payload.
extern "C" int LLVMFuzzerTestOneInput(const unsigned char* data, size_t size) {
    const std::string queue = fuzzkit::QueuePath();
    const std::string companion = queue + ".tmp";
    unlink(queue.c_str());
    unlink(companion.c_str());
    detail::ForgetQueueReadings();
    const std::vector<std::string> prefixes = {fuzzkit::MusicDir() + "/a/", fuzzkit::MusicDir() + "/a/b/",
                                               fuzzkit::MusicDir() + "/ab/"};
    for (size_t at = 0; at < size;) {
        const unsigned char step = data[at++];
        const size_t length = std::min<size_t>(step >> 3, size - at);
        const unsigned char* payload = data + at;
        at += length;
        switch (step & 7) {
            case 0: case 1: case 2:
                Append(queue, payload, length);
                break;
            case 3:
                rename(queue.c_str(), companion.c_str());
                break;
            case 4:
                unlink(companion.c_str());
                break;
            case 5:
                if (truncate(queue.c_str(), length) != 0) unlink(queue.c_str());
                break;
            case 6:
                fuzzkit::WriteFile(queue, payload, length);
                break;
            default:
                Append(companion, payload, length);
        }
        Check(queue, prefixes);
        Check(companion, prefixes);
    }
    return 0;
}
