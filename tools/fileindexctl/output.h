// How fileindexctl prints results and failures.
#pragma once

#include <string>
#include <vector>

#include <json/value.h>

namespace fileindexctl {

using Table = std::vector<std::vector<std::string>>;

class Output {
public:
    bool json = false;

    // Prints `machine` as JSON with --json, otherwise the table with aligned columns.
    void Emit(const Json::Value& machine, const Table& table) const;
    // Prints `machine` as JSON with --json, otherwise the text.
    void Emit(const Json::Value& machine, const std::string& text) const;
};

// One line on stderr naming the library's error code; returns the failure exit status.
int Fail(const std::string& operation);

// Exit status of a yes/no question (0 yes, 1 no), printing the answer too.
int Answer(const Output& out, bool yes);

constexpr int kExitFailure = 1;
constexpr int kExitUsage = 2;

std::string FormatLocalTime(long long epochSeconds);

}  // namespace fileindexctl
