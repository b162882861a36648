#include "qira_sim/appliance.h"

#include "fileindex/root.h"

#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <filesystem>
#include <cstdlib>
#include <fstream>
#include <sstream>

#include <json/reader.h>

#include "sim_state.h"

namespace qira_sim {
namespace {

using detail::ReadState;
using detail::StatePath;
using detail::UpdateState;

bool MakeDirs(const std::string& path) {
    std::error_code error;
    std::filesystem::create_directories(path, error);
    return !error;
}

const char kNotifier[] = R"SH(#!/bin/sh
# Simulated notifier: records its arguments, one call per line, separated by tabs.
root="${0%/usr/qira/bin/qiralumnotify}"
state="$root/var/lib/qira-sim"
line=""
for arg in "$@"; do line="$line$arg	"; done
printf '%s\n' "$line" >> "$state/notify.log"
if [ -f "$state/notify.exit" ]; then exit "$(cat "$state/notify.exit")"; fi
exit 0
)SH";

bool WriteNotifier(const std::string& root) {
    const std::string path = root + "/usr/qira/bin/qiralumnotify";
    {
        std::ofstream out(path, std::ios::trunc);
        if (!out) return false;
        out << kNotifier;
    }
    return chmod(path.c_str(), 0755) == 0;
}

Json::Value DefaultServices() {
    Json::Value state(Json::objectValue);
    state["services"]["fileindexd"] = "stopped";
    state["services"]["samba"] = "running";
    state["spotlight"] = false;
    return state;
}

}  // namespace

std::string Root() { return QIRA::FILEINDEX::RootPrefix(); }

std::string StateDir() { return Root() + "/var/lib/qira-sim"; }

bool InitAppliance(const std::string& root) {
    for (const char* dir : {"/usr/qira/etc/fileindex", "/usr/qira/bin", "/tmp", "/var/run", "/var/lib/qira-sim"}) {
        if (!MakeDirs(root + dir)) return false;
    }
    if (!WriteNotifier(root)) return false;
    const std::string state = root + "/var/lib/qira-sim/";
    struct stat st;
    if (stat((state + "services.json").c_str(), &st) != 0) {
        std::ofstream(state + "services.json") << DefaultServices().toStyledString();
    }
    if (stat((state + "shares.json").c_str(), &st) != 0) std::ofstream(state + "shares.json") << "{}\n";
    return true;
}

void PutShare(const std::string& name, const std::string& dir, const Json::Value& props) {
    UpdateState("shares.json", Json::Value(Json::objectValue), [&](Json::Value& shares) {
        Json::Value share = props.isObject() ? props : Json::Value(Json::objectValue);
        share["path"] = dir;
        shares[name] = share;
    });
}

void RemoveShare(const std::string& name) {
    UpdateState("shares.json", Json::Value(Json::objectValue), [&](Json::Value& shares) { shares.removeMember(name); });
}

Json::Value Shares() { return ReadState("shares.json", Json::Value(Json::objectValue)); }

void SetServiceState(const std::string& service, const std::string& state) {
    UpdateState("services.json", DefaultServices(), [&](Json::Value& all) { all["services"][service] = state; });
}

std::string ServiceState(const std::string& service) {
    const Json::Value all = ReadState("services.json", DefaultServices());
    return all["services"].get(service, "stopped").asString();
}

void SetSpotlightState(bool on) {
    UpdateState("services.json", DefaultServices(), [&](Json::Value& all) { all["spotlight"] = on; });
}

bool SpotlightState() { return ReadState("services.json", DefaultServices())["spotlight"].asBool(); }

void InjectFault(const std::string& op, int err, const std::string& arg, const Call& after) {
    UpdateState("faults.json", Json::Value(Json::objectValue), [&](Json::Value& faults) {
        Json::Value fault(Json::objectValue);
        fault["err"] = err;
        if (!arg.empty()) fault["arg"] = arg;
        if (!after.op.empty()) {
            fault["after"]["op"] = after.op;
            if (!after.arg.empty()) fault["after"]["arg"] = after.arg;
            fault["armed"] = false;
        }
        faults[op] = fault;
    });
}

void ClearFault(const std::string& op) {
    UpdateState("faults.json", Json::Value(Json::objectValue), [&](Json::Value& faults) { faults.removeMember(op); });
}

void ClearFaults() {
    UpdateState("faults.json", Json::Value(Json::objectValue), [](Json::Value& faults) { faults = Json::Value(Json::objectValue); });
}

Json::Value Faults() { return ReadState("faults.json", Json::Value(Json::objectValue)); }

std::vector<Json::Value> Journal() {
    std::vector<Json::Value> entries;
    std::ifstream in(StatePath("journal.jsonl"));
    std::string line;
    Json::CharReaderBuilder builder;
    while (std::getline(in, line)) {
        Json::Value entry;
        std::string errors;
        std::istringstream text(line);
        if (Json::parseFromStream(builder, text, &entry, &errors)) entries.push_back(entry);
    }
    return entries;
}

void ClearJournal() { unlink(StatePath("journal.jsonl").c_str()); }

Json::Value Registrations() { return ReadState("monitors.json", Json::Value(Json::arrayValue)); }

std::vector<std::vector<std::string>> NotifierCalls() {
    std::vector<std::vector<std::string>> calls;
    std::ifstream in(StatePath("notify.log"));
    std::string line;
    while (std::getline(in, line)) {
        std::vector<std::string> args;
        std::stringstream fields(line);
        std::string field;
        while (std::getline(fields, field, '\t')) args.push_back(field);
        calls.push_back(args);
    }
    return calls;
}

void SetNotifierExitStatus(int status) { std::ofstream(StatePath("notify.exit"), std::ios::trunc) << status << "\n"; }

}  // namespace qira_sim
