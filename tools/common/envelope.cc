#include "envelope.h"

#include "captured_log.h"

namespace tools {
namespace {

Json::Value Strings(const std::vector<std::string>& items) {
    Json::Value array(Json::arrayValue);
    for (const auto& item : items) array.append(item);
    return array;
}

}  // namespace

ErrorText DescribeError(QIRA::FILEINDEX::_tag_fileindex_err_ code) {
    using namespace QIRA::FILEINDEX;
    switch (code) {
        case FILEINDEX_ERR_NONE:
            return {"FILEINDEX_ERR_NONE", "the library set no error code; the cause is in its log"};
        case FILEINDEX_ERR_BAD_PARAM:
            return {"FILEINDEX_ERR_BAD_PARAM", "the request is malformed or names an unknown item"};
        case FILEINDEX_ERR_PATH:
            return {"FILEINDEX_ERR_PATH", "a share or path could not be resolved"};
        case FILEINDEX_ERR_NO_SUCH_FOLDER:
            return {"FILEINDEX_ERR_NO_SUCH_FOLDER", "no indexed folder has that path"};
        case FILEINDEX_ERR_EXCEED_MAX_FOLDER:
            return {"FILEINDEX_ERR_EXCEED_MAX_FOLDER", "at most 1000 folders can be indexed"};
        case FILEINDEX_ERR_LOAD_JSON:
            return {"FILEINDEX_ERR_LOAD_JSON", "a configuration file could not be read or is not JSON"};
        case FILEINDEX_ERR_SAVE_JSON:
            return {"FILEINDEX_ERR_SAVE_JSON", "a configuration file could not be written"};
        case FILEINDEX_ERR_MALFORMED_FOLDERS:
            return {"FILEINDEX_ERR_MALFORMED_FOLDERS", "folder.conf is JSON but not a folder list"};
        case FILEINDEX_ERR_LOCK:
            return {"FILEINDEX_ERR_LOCK", "the configuration lock is held by another process; try again"};
    }
    return {"FILEINDEX_ERR_UNKNOWN", "unknown error code"};
}

std::string FailureMessage(const std::string& operation, const Cause& cause, const std::vector<std::string>& saved) {
    const std::string what = cause.name + (cause.number != 0 ? " (" + std::to_string(cause.number) + ")" : "") + ": " + cause.text;
    return saved.empty() ? operation + " failed: " + what : operation + ": saved; not applied: " + what;
}

Json::Value SuccessEnvelope(const Json::Value& result, bool verbose) {
    Json::Value envelope(Json::objectValue);
    envelope["ok"] = true;
    envelope["result"] = result;
    envelope["error"]["name"] = DescribeError(QIRA::FILEINDEX::FILEINDEX_ERR_NONE).name;
    envelope["error"]["number"] = 0;
    envelope["message"] = "";
    envelope["log"] = Strings(verbose ? CapturedMessages(true) : std::vector<std::string>());
    envelope["saved"] = Json::Value(Json::arrayValue);
    return envelope;
}

Json::Value FailureEnvelope(const Cause& cause, const std::string& message, const std::vector<std::string>& saved,
                            bool verbose) {
    Json::Value envelope(Json::objectValue);
    envelope["ok"] = false;
    envelope["result"] = Json::Value();
    envelope["error"]["name"] = cause.name;
    envelope["error"]["number"] = cause.number;
    envelope["message"] = message;
    envelope["log"] = Strings(CapturedMessages(verbose));
    envelope["saved"] = Strings(saved);
    return envelope;
}

}  // namespace tools
