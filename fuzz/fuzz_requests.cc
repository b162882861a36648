// JSON requests of upsert, delete, reindex and the listing's additional facts.
#include "fileindex/fileindex.h"
#include <unistd.h>

#include "harness.h"
#include "qira_sim/appliance.h"

using namespace QIRA::FILEINDEX;

extern "C" int LLVMFuzzerTestOneInput(const unsigned char* data, size_t size) {
    Json::Value request;
    if (!fromString(request, std::string(reinterpret_cast<const char*>(data), size))) return 0;
    const std::string conf = fuzzkit::Root() + "/usr/qira/etc/fileindex/folder.conf";
    fuzzkit::WriteFile(conf, R"({"/music/a": {"name": "A", "audio": true}, "/music/a/b": {}})");
    IndexMgr::Upsert(request);
    fuzzkit::WriteFile(conf, R"({"/music/a": {"name": "A", "audio": true}, "/music/a/b": {}})");
    IndexMgr::Delete(request);
    IndexMgr::Reindex(request);
    Json::Value out;
    IndexMgr::List(out, 0, 2, "name", "ASC", request);
    Folder folder;
    folder.Reload("/music/a", request);
    folder.GetAdditional(out, request);
    unlink(fuzzkit::QueuePath().c_str());
    qira_sim::ClearJournal();
    return 0;
}
