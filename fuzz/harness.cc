#include "harness.h"

#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cstdlib>

#include "qira_sim/appliance.h"

namespace fuzzkit {

const std::string& Root() {
    static const std::string root = [] {
        // Under TMPDIR when given, so that a run's clean-up removes its own roots only.
        const char* tmp = std::getenv("TMPDIR");
        std::string tmpl = std::string(tmp && *tmp ? tmp : "/tmp") + "/fileindex-fuzz-XXXXXX";
        const std::string dir = mkdtemp(&tmpl[0]);
        setenv("QIRA_ROOT", dir.c_str(), 1);
        qira_sim::InitAppliance(dir);
        for (const char* sub : {"/volume1", "/volume1/music", "/volume1/music/a", "/volume1/music/a/b",
                                "/volume1/music/@eaDir"}) {
            mkdir((dir + sub).c_str(), 0755);
        }
        qira_sim::PutShare("music", dir + "/volume1/music");
        // The no-space notice would fork for every flagged share: let it fail at once instead.
        qira_sim::InjectFault("QLIBCExecv", 0x0F00);
        return dir;
    }();
    return root;
}

std::string MusicDir() { return Root() + "/volume1/music"; }

std::string QueuePath() { return MusicDir() + "/@eaDir/QIRA@file_index_queue"; }

void WriteFile(const std::string& path, const unsigned char* data, size_t size) {
    const int fd = open(path.c_str(), O_WRONLY | O_CREAT | O_TRUNC, 0644);
    if (fd < 0) return;
    if (size > 0 && write(fd, data, size) < 0) {
        // A short corpus entry is still a valid input.
    }
    close(fd);
}

void WriteFile(const std::string& path, const std::string& text) {
    WriteFile(path, reinterpret_cast<const unsigned char*>(text.data()), text.size());
}

}  // namespace fuzzkit

// The library's log lines would flood the system log; drop them.
extern "C" void syslog(int, const char*, ...) {}
