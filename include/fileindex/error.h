// Process-wide error code and log level of libfileindex.
#pragma once

#include "fileindex/export.h"

#include <cstdint>

namespace QIRA {
namespace FILEINDEX {

enum _tag_fileindex_err_ : int32_t {
    FILEINDEX_ERR_NONE = 0,
    FILEINDEX_ERR_BAD_PARAM = 1,
    FILEINDEX_ERR_PATH = 2,
    FILEINDEX_ERR_NO_SUCH_FOLDER = 4,
    FILEINDEX_ERR_EXCEED_MAX_FOLDER = 5,
    FILEINDEX_ERR_LOAD_JSON = 6,
    FILEINDEX_ERR_SAVE_JSON = 7,
    FILEINDEX_ERR_MALFORMED_FOLDERS = 8,
    FILEINDEX_ERR_LOCK = 9,
};

// 7 turns on the debug-only log lines; a host may assign it.
extern FILEINDEX_EXPORT int LOG_LEVEL;

// The cause of the last failure. Sticky: success never resets it; not synchronised between
// threads.
class FILEINDEX_EXPORT ErrorHandler {
public:
    ErrorHandler() = delete;
    static void SetError(_tag_fileindex_err_ code);
    static _tag_fileindex_err_ GetError();

private:
    static _tag_fileindex_err_ g_error_code;
};

}  // namespace FILEINDEX
}  // namespace QIRA
