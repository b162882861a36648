// Shared state of the simulated appliance: files under the root, the journal, faults and the
// platform error of this process.
#pragma once

#include <sys/types.h>

#include <ctime>
#include <functional>
#include <map>
#include <string>

#include <json/value.h>

namespace qira_sim {
namespace detail {

std::string StatePath(const std::string& name);

// Reads a state file; a missing or unreadable file reads as `fallback`. The reference stays
// valid until the next read of the same file.
const Json::Value& ReadState(const std::string& name, const Json::Value& fallback);

// A parsed state file with the identity it was read at; `version` changes whenever it is read anew.
struct CachedState {
    ino_t inode = 0;
    off_t size = -1;
    timespec modified{};
    Json::Value value;
    unsigned long long version = 0;
};
const CachedState& ReadCachedState(std::map<std::string, CachedState>& cache, const std::string& name,
                                   const Json::Value& fallback);

// Read-modify-write of a state file under the simulation's lock; the file is replaced atomically.
void UpdateState(const std::string& name, const Json::Value& fallback,
                 const std::function<void(Json::Value&)>& change);

void WriteState(const std::string& name, const Json::Value& value);

void AppendJournal(const std::string& op, const Json::Value& args, const Json::Value& result);

// True when a fault is injected for `op` (optionally only for argument `arg`); the platform
// error is then set to the fault's number.
bool Faulted(const char* op, const std::string& arg = std::string());

void SetError(int code, const char* file, int line);

// The share whose directory is the longest "/"-boundary prefix of fullPath; false when none.
bool FindShareOf(const std::string& fullPath, std::string& name, Json::Value& share);

bool IsUnder(const std::string& path, const std::string& dir);

}  // namespace detail
}  // namespace qira_sim
