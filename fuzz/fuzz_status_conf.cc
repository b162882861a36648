// status.conf of any content, then every Status operation on it (in memory) and the readers.
#include "fileindex/fileindex.h"
#include "harness.h"
#include "qira_sim/appliance.h"

using namespace QIRA::FILEINDEX;

extern "C" int LLVMFuzzerTestOneInput(const unsigned char* data, size_t size) {
    fuzzkit::WriteFile(fuzzkit::Root() + "/usr/qira/etc/fileindex/status.conf", data, size);
    long long resume = 0;
    StatusMgr::GetPauseInfo(resume);
    StatusMgr::ShareIsNoSpace("music");
    StatusMgr::ShareIsNeedReindex("music");
    StatusMgr::IsUpdated("marker");
    Status status;
    if (status.Load()) {
        status.GetPauseInfo(resume);
        status.ShareIsNoSpace("music");
        status.ShareIsNeedReindex("music");
        status.IsUpdated("no_space");
        status.ShareSetNoSpace("music", true);
        status.ShareSetNoSpace("other", false);
        status.ShareSetNeedReindex("music", true);
        status.ShareSetNeedReindex("music", false);
        status.SetUpdated("marker");
        status.IsUpdated("marker");
        status.Pause(0);
        status.Resume();
        status.GetPauseInfo(resume);
    }
    qira_sim::ClearJournal();
    return 0;
}
