// folder.conf of any content, then every query on it.
#include "fileindex/fileindex.h"
#include "harness.h"

using namespace QIRA::FILEINDEX;

extern "C" int LLVMFuzzerTestOneInput(const unsigned char* data, size_t size) {
    fuzzkit::WriteFile(fuzzkit::Root() + "/usr/qira/etc/fileindex/folder.conf", data, size);
    std::vector<Folder> list;
    IndexMgr::List(list);
    IndexMgr::IsPathIndexed("/music/a/x");
    IndexMgr::IsPathContainIndexed("/music");
    IndexMgr::IsFullPathIndexed(fuzzkit::MusicDir() + "/a");
    IndexMgr::IsShareIndexed("music");
    FILEIDXIsPathIndexed("/music/a");
    GetMostSuitableCfg(list, fuzzkit::MusicDir() + "/a/b");
    Json::Value out;
    IndexMgr::Get(out, "/music/a");
    Json::Value additional(Json::arrayValue);
    additional.append("status");
    additional.append("is_valid");
    additional.append("other");
    IndexMgr::List(out, 0, 5, "name", "DESC", additional);
    IndexMgr::List(out, 1, 3, "photo", "ASC", additional);
    return 0;
}
