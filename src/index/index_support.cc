#include "index_support.h"

#include "qira/qlib_service.h"

namespace QIRA {
namespace FILEINDEX {
namespace detail {

void StopIndexingServices() {
    if (QLIBServiceStop("fileindexd", 1) < 0) FILEIDX_LOG_PLATFORM("QLIBServiceStop");
    if (QIRASMBIsEnableSpotlight() == 0) return;
    if (QIRASMBSetSpotlight(0) < 0) {
        FILEIDX_LOG_PLATFORM("QIRASMBSetSpotlight");
        return;
    }
    if (QLIBServiceRestart("samba") < 0) FILEIDX_LOG_PLATFORM("QLIBServiceRestart");
}

Json::Value FolderPathData(const std::string& path) {
    Json::Value data(Json::objectValue);
    data["folder_path"] = path;
    return data;
}

}  // namespace detail
}  // namespace FILEINDEX
}  // namespace QIRA
