#include "output.h"

#include <algorithm>
#include <ctime>
#include <iostream>

#include "captured_log.h"
#include "envelope.h"
#include "fileindex/error.h"
#include "fileindex/json.h"

namespace tools {

void Output::Emit(const Json::Value& result, const Table& table) const {
    if (json) {
        std::cout << QIRA::FILEINDEX::toString(SuccessEnvelope(result, verbose)) << "\n";
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

void Output::Emit(const Json::Value& result, const std::string& text) const {
    if (json) {
        std::cout << QIRA::FILEINDEX::toString(SuccessEnvelope(result, verbose)) << "\n";
        return;
    }
    std::cout << text << "\n";
}

void Output::Warn(const std::string& text) const {
    if (!json) std::cerr << tool << ": warning: " << text << "\n";
}

int Output::Fail(const std::string& operation, const std::vector<std::string>& saved) const {
    return Tell(operation, CauseOfFailure(), saved, saved.empty() ? kExitFailure : kExitNotApplied);
}

int Output::Fail(const std::string& operation, const Cause& cause, int status) const {
    return Tell(operation, cause, {}, status);
}

int Output::Tell(const std::string& operation, const Cause& cause, const std::vector<std::string>& saved,
                 int status) const {
    const std::string message = FailureMessage(operation, cause, saved);
    if (json) {
        std::cout << QIRA::FILEINDEX::toString(FailureEnvelope(cause, message, saved, verbose)) << "\n";
        return status;
    }
    std::cerr << tool << ": " << message << "\n";
    if (!quiet) {
        for (const auto& line : CapturedMessages(verbose)) std::cerr << tool << ": log: " << line << "\n";
    }
    for (const auto& file : saved) std::cerr << tool << ": " << file << " was saved with the change\n";
    return status;
}

}  // namespace tools
