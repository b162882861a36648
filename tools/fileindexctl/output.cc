#include "output.h"

#include <algorithm>
#include <ctime>
#include <iostream>

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
            return {"FILEINDEX_ERR_NONE", "no library error recorded (a platform step or the daemon failed; see the system log)"};
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

}  // namespace

void Output::Emit(const Json::Value& machine, const Table& table) const {
    if (json) {
        std::cout << QIRA::FILEINDEX::toString(machine) << "\n";
        return;
    }
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

void Output::Emit(const Json::Value& machine, const std::string& text) const {
    if (json) {
        std::cout << QIRA::FILEINDEX::toString(machine) << "\n";
    } else {
        std::cout << text << "\n";
    }
}

int Fail(const std::string& operation) {
    const auto code = QIRA::FILEINDEX::ErrorHandler::GetError();
    const ErrorText text = Describe(code);
    std::cerr << "fileindexctl: " << operation << " failed: " << text.name << " (" << static_cast<int>(code)
              << "): " << text.explanation << "\n";
    return kExitFailure;
}

int Answer(const Output& out, bool yes) {
    out.Emit(Json::Value(yes), yes ? "yes" : "no");
    return yes ? 0 : 1;
}

std::string FormatLocalTime(long long epochSeconds) {
    const time_t when = static_cast<time_t>(epochSeconds);
    struct tm local;
    if (localtime_r(&when, &local) == nullptr) return std::to_string(epochSeconds);
    char buffer[64];
    strftime(buffer, sizeof buffer, "%Y-%m-%d %H:%M:%S %Z", &local);
    return buffer;
}

}  // namespace fileindexctl
