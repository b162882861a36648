// A queue (and its companion) of any content: the folder status scan and the duplicate check.
#include "fileindex/fileindex.h"
#include "harness.h"

using namespace QIRA::FILEINDEX;

extern "C" int LLVMFuzzerTestOneInput(const unsigned char* data, size_t size) {
    const std::string queue = fuzzkit::QueuePath();
    static const bool configured = [] {
        fuzzkit::WriteFile(fuzzkit::Root() + "/usr/qira/etc/fileindex/folder.conf", R"({"/music/a": {}})");
        return true;
    }();
    (void)configured;
    fuzzkit::WriteFile(queue, data, size);
    fuzzkit::WriteFile(queue + ".tmp", data, size);
    StatusMgr::GetFolderStatus("/music/a");
    std::string word;
    StatusMgr::GetStatus(word);
    AddCustomEvent(kEventReindex, fuzzkit::MusicDir() + "/a", Json::Value());
    return 0;
}
