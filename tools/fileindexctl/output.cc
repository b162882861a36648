#include "output.h"

#include <algorithm>
#include <ctime>
#include <iostream>

#include "captured_log.h"
#include "fileindex/error.h"
#include "fileindex/json.h"

namespace fileindexctl {
namespace {

using QIRA::FILEINDEX::_tag_fileindex_err_;

struct ErrorText {
    const char* name;
    const char* explanation;
};

ErrorText Describe(_tag_fileindex_err_ code) {
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

Json::Value Strings(const std::vector<std::string>& items) {
    Json::Value array(Json::arrayValue);
    for (const auto& item : items) array.append(item);
    return array;
}

}  // namespace

void Output::EmitEnvelope(bool ok, const Json::Value& result, const std::string& message,
                          const std::vector<std::string>& saved) const {
    const auto code = QIRA::FILEINDEX::ErrorHandler::GetError();
    Json::Value envelope(Json::objectValue);
    envelope["ok"] = ok;
    envelope["result"] = result;
    envelope["error"]["name"] = Describe(code).name;
    envelope["error"]["number"] = static_cast<int>(code);
    envelope["message"] = message;
    envelope["log"] = Strings(CapturedLog());
    envelope["saved"] = Strings(saved);
    std::cout << QIRA::FILEINDEX::toString(envelope) << "\n";
}

void Output::Emit(const Json::Value& result, const Table& table) const {
    if (json) return EmitEnvelope(true, result, "", {});
    std::vector<size_t> widths;
    for (const auto& row : table) {
        widths.resize(std::max(widths.size(), row.size()), 0);
        for (size_t i = 0; i < row.size(); ++i) widths[i] = std::max(widths[i], row[i].size());
    }
    for (const auto& row : table) {
        std::string line;
        for (size_t i = 0; i < row.size(); ++i) {
            line += row[i];
            if (i + 1 < row.size()) line += std::string(widths[i] - row[i].size() + 2, ' ');
        }
        std::cout << line << "\n";
    }
}

void Output::Emit(const Json::Value& result, const std::string& text) const {
    if (json) return EmitEnvelope(true, result, "", {});
    std::cout << text << "\n";
}

int Output::Fail(const std::string& operation, const std::vector<std::string>& saved) const {
    const auto code = QIRA::FILEINDEX::ErrorHandler::GetError();
    const ErrorText text = Describe(code);
    const std::string message = operation + " failed: " + text.name + " (" + std::to_string(static_cast<int>(code)) +
                                "): " + text.explanation;
    if (json) {
        EmitEnvelope(false, Json::Value(), message, saved);
        return kExitFailure;
    }
    std::cerr << "fileindexctl: " << message << "\n";
    if (!quiet) {
        for (const auto& line : CapturedLog()) std::cerr << "fileindexctl: log: " << line << "\n";
    }
    for (const auto& file : saved) {
        std::cerr << "fileindexctl: " << file << " was already saved with the change; the steps after it did "
                     "not all succeed\n";
    }
    return kExitFailure;
}

std::string FormatLocalTime(long long epochSeconds) {
    const time_t when = static_cast<time_t>(epochSeconds);
    struct tm local;
    if (localtime_r(&when, &local) == nullptr) return std::to_string(epochSeconds);
    char buffer[64];
    strftime(buffer, sizeof buffer, "%Y-%m-%d %H:%M:%S %Z", &local);
    return buffer;
}

std::string FormatUtc(long long epochSeconds) {
    const time_t when = static_cast<time_t>(epochSeconds);
    struct tm utc;
    if (gmtime_r(&when, &utc) == nullptr) return std::to_string(epochSeconds);
    char buffer[64];
    strftime(buffer, sizeof buffer, "%Y-%m-%dT%H:%M:%SZ", &utc);
    return buffer;
}

}  // namespace fileindexctl
