// Control of the simulated appliance: set-up, inspection and fault injection. Not part of the
// appliance's API; used by tests, benchmarks and the sim tool.
#pragma once

#include <string>
#include <vector>

#include <json/value.h>

namespace qira_sim {

// The root prefix in force (QIRA::FILEINDEX::RootPrefix: "" when QIRA_ROOT is unset, empty or "/").
std::string Root();
// Where the simulation keeps its state: <root>/var/lib/qira-sim.
std::string StateDir();

// Creates the directories of the appliance under `root`, the notifier program and the default
// service states ("fileindexd" stopped, "samba" running, Spotlight off). Idempotent.
bool InitAppliance(const std::string& root);

// Adds or replaces a share. `props` may hold "encrypted", "encryption", "read_only" (booleans),
// "fs_type" (integer), "quota_free" (bytes) and "mount_points" (array of full paths).
void PutShare(const std::string& name, const std::string& dir, const Json::Value& props = Json::Value());
void RemoveShare(const std::string& name);
Json::Value Shares();

void SetServiceState(const std::string& service, const std::string& state);
std::string ServiceState(const std::string& service);
void SetSpotlightState(bool on);
bool SpotlightState();

// A trigger for a fault: the call of operation `op` whose first argument is `arg` (any argument
// when `arg` is empty).
struct Call {
    std::string op;
    std::string arg;
};

// Makes platform operation `op` fail with platform error `err`; with `arg`, only when the
// operation's first argument equals it; with `after`, only once the library has made that call.
void InjectFault(const std::string& op, int err, const std::string& arg = std::string(), const Call& after = Call());
void ClearFault(const std::string& op);
void ClearFaults();
Json::Value Faults();

// Every state-changing platform call, in call order: {"op", "args", "result"}.
std::vector<Json::Value> Journal();
void ClearJournal();

// Monitor-queue registrations: [{"queue", "owner", "type", "description"}].
Json::Value Registrations();

// Argument lists (without the program path) the notifier program was run with.
std::vector<std::vector<std::string>> NotifierCalls();
// Exit status the notifier program answers with from now on.
void SetNotifierExitStatus(int status);

}  // namespace qira_sim
