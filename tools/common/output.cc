#include "output.h"

#include <algorithm>
#include <ctime>
#include <iostream>

#include "captured_log.h"
#include "envelope.h"
#include "fileindex/error.h"
#include "fileindex/json.h"

namespace tools {

void Output::EmitEnvelope(bool ok, const Json::Value& result, const std::string& message,
                          const std::vector<std::string>& saved) const {
    std::cout << QIRA::FILEINDEX::toString(Envelope(ok, result, message, saved)) << "\n";
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
    const std::string message = FailureMessage(operation);
    if (json) {
        EmitEnvelope(false, Json::Value(), message, saved);
        return kExitFailure;
    }
    std::cerr << tool << ": " << message << "\n";
    if (!quiet) {
        for (const auto& line : CapturedLog()) std::cerr << tool << ": log: " << line << "\n";
    }
    for (const auto& file : saved) {
        std::cerr << tool << ": " << file << " was already saved with the change; the steps after it did "
                     "not all succeed\n";
    }
    return kExitFailure;
}

namespace {

std::string FormatTime(long long epochSeconds, struct tm* (*convert)(const time_t*, struct tm*), const char* format) {
    const time_t when = static_cast<time_t>(epochSeconds);
    struct tm broken;
    if (convert(&when, &broken) == nullptr) return std::to_string(epochSeconds);
    char buffer[64];
    strftime(buffer, sizeof buffer, format, &broken);
    return buffer;
}

}  // namespace

std::string FormatLocalTime(long long epochSeconds) { return FormatTime(epochSeconds, localtime_r, "%Y-%m-%d %H:%M:%S %Z"); }

std::string FormatUtc(long long epochSeconds) { return FormatTime(epochSeconds, gmtime_r, "%Y-%m-%dT%H:%M:%SZ"); }

}  // namespace tools
