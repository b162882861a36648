#include "sim_state.h"

#include <fcntl.h>
#include <sys/file.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cstdlib>
#include <fstream>
#include <map>
#include <memory>
#include <sstream>

#include <json/reader.h>
#include <json/writer.h>

#include "qira/qlib_core.h"
#include "qira_sim/appliance.h"

namespace qira_sim {
namespace detail {
namespace {

bool ParseJson(const std::string& text, Json::Value& out) {
    Json::CharReaderBuilder builder;
    builder["collectComments"] = false;
    std::unique_ptr<Json::CharReader> reader(builder.newCharReader());
    std::string errors;
    try {
        return reader->parse(text.data(), text.data() + text.size(), &out, &errors);
    } catch (const std::exception&) {
        return false;
    }
}

std::string Serialise(const Json::Value& value) {
    Json::StreamWriterBuilder builder;
    builder["indentation"] = "";
    builder["emitUTF8"] = true;
    return Json::writeString(builder, value);
}

// Holds the simulation's lock file for the lifetime of the object.
class StateLock {
public:
    StateLock() : fd_(open(StatePath("sim.lock").c_str(), O_RDWR | O_CREAT | O_CLOEXEC, 0644)) {
        if (fd_ >= 0) flock(fd_, LOCK_EX);
    }
    ~StateLock() {
        if (fd_ >= 0) close(fd_);
    }
    StateLock(const StateLock&) = delete;
    StateLock& operator=(const StateLock&) = delete;

private:
    int fd_;
};

int g_error_code = 0;
std::string g_error_file;
int g_error_line = 0;

}  // namespace

std::string StatePath(const std::string& name) { return StateDir() + "/" + name; }

// State files are read far more often than written: keep the parsed value while the file's
// identity (inode, size, modification time) stays the same.
const Json::Value& ReadState(const std::string& name, const Json::Value& fallback) {
    static std::map<std::string, CachedState> cache;
    return ReadCachedState(cache, name, fallback).value;
}

const CachedState& ReadCachedState(std::map<std::string, CachedState>& cache, const std::string& name,
                                   const Json::Value& fallback) {
    using Cached = CachedState;
    static unsigned long long versions = 0;
    const std::string path = StatePath(name);
    Cached& entry = cache[path];
    struct stat st;
    if (stat(path.c_str(), &st) != 0) {
        if (entry.size != -1 || entry.version == 0) {
            entry = Cached{};
            entry.value = fallback;
            entry.version = ++versions;
        }
        return entry;
    }
    if (entry.inode == st.st_ino && entry.size == st.st_size && entry.modified.tv_sec == st.st_mtim.tv_sec &&
        entry.modified.tv_nsec == st.st_mtim.tv_nsec) {
        return entry;
    }
    std::ifstream in(path);
    std::stringstream text;
    text << in.rdbuf();
    Json::Value value;
    if (!ParseJson(text.str(), value)) value = fallback;
    entry = Cached{st.st_ino, st.st_size, st.st_mtim, value, ++versions};
    return entry;
}

void WriteState(const std::string& name, const Json::Value& value) {
    const std::string path = StatePath(name);
    const std::string tmp = path + ".tmp." + std::to_string(getpid());
    {
        std::ofstream out(tmp, std::ios::trunc);
        out << Serialise(value) << "\n";
    }
    rename(tmp.c_str(), path.c_str());
}

void UpdateState(const std::string& name, const Json::Value& fallback,
                 const std::function<void(Json::Value&)>& change) {
    StateLock lock;
    Json::Value value = ReadState(name, fallback);  // a copy to change
    change(value);
    WriteState(name, value);
}

void AppendJournal(const std::string& op, const Json::Value& args, const Json::Value& result) {
    Json::Value entry(Json::objectValue);
    entry["op"] = op;
    entry["args"] = args;
    entry["result"] = result;
    const std::string line = Serialise(entry) + "\n";
    StateLock lock;
    const int fd = open(StatePath("journal.jsonl").c_str(), O_WRONLY | O_CREAT | O_APPEND | O_CLOEXEC, 0644);
    if (fd < 0) return;
    if (write(fd, line.data(), line.size()) < 0) {
        // The journal is best effort: a full disk must not change the platform's answer.
    }
    close(fd);
}

namespace {

bool Matches(const Json::Value& call, const char* op, const std::string& arg) {
    return call.isObject() && call.get("op", "").asString() == op &&
           (!call.isMember("arg") || call["arg"].asString() == arg);
}

// Arms the faults waiting for this call; they apply to the calls after it.
void ArmFaultsAfter(const Json::Value& faults, const char* op, const std::string& arg) {
    bool waiting = false;
    for (const auto& fault : faults) waiting = waiting || (fault.isObject() && !fault.get("armed", true).asBool() &&
                                                           Matches(fault["after"], op, arg));
    if (!waiting) return;
    UpdateState("faults.json", Json::Value(Json::objectValue), [&](Json::Value& all) {
        for (const auto& name : all.getMemberNames()) {
            Json::Value& fault = all[name];
            const bool wasWaiting = faults.isMember(name) && faults[name] == fault;  // not set since the call began
            if (wasWaiting && fault.isObject() && fault.isMember("after") && Matches(fault["after"], op, arg)) {
                fault["armed"] = true;
            }
        }
    });
}

}  // namespace

bool Faulted(const char* op, const std::string& arg) {
    static const Json::Value kNone(Json::objectValue);
    const Json::Value& current = ReadState("faults.json", kNone);
    if (!current.isObject() || current.empty()) return false;
    const Json::Value faults = current;  // arming below rewrites the state
    ArmFaultsAfter(faults, op, arg);
    if (!faults.isMember(op)) return false;
    const Json::Value& fault = faults[op];
    if (!fault.isObject() || !fault.get("armed", true).asBool()) return false;
    if (fault.isMember("arg") && fault["arg"].isString() && fault["arg"].asString() != arg) return false;
    const int err = fault.get("err", 0x0100).isInt() ? fault.get("err", 0x0100).asInt() : 0x0100;
    SetError(err, (std::string("sim/") + op).c_str(), 1);
    return true;
}

void SetError(int code, const char* file, int line) {
    g_error_code = code;
    g_error_file = file ? file : "";
    g_error_line = line;
}

bool IsUnder(const std::string& path, const std::string& dir) {
    const std::string prefix = dir + "/";
    const std::string probe = path + "/";
    return probe.compare(0, prefix.size(), prefix) == 0;
}

// The share table indexed by directory, rebuilt when shares.json changes.
const std::map<std::string, std::string>& SharesByDirectory() {
    static std::map<std::string, CachedState> cache;
    static unsigned long long builtFrom = 0;
    static std::map<std::string, std::string> byDirectory;
    static const Json::Value kNone(Json::objectValue);
    const CachedState& state = ReadCachedState(cache, "shares.json", kNone);
    if (state.version != builtFrom) {
        byDirectory.clear();
        if (state.value.isObject()) {
            for (auto it = state.value.begin(); it != state.value.end(); ++it) {
                if (it->isObject() && (*it)["path"].isString() && !(*it)["path"].asString().empty()) {
                    byDirectory[(*it)["path"].asString()] = it.name();  // the last name of a directory wins
                }
            }
        }
        builtFrom = state.version;
    }
    return byDirectory;
}

bool FindShareOf(const std::string& fullPath, std::string& name, Json::Value& share) {
    const auto& byDirectory = SharesByDirectory();
    // The longest directory first: fullPath itself, then each prefix ending before a "/".
    for (size_t end = fullPath.size();; end = fullPath.rfind('/', end - 1)) {
        const auto found = byDirectory.find(fullPath.substr(0, end));
        if (found != byDirectory.end()) {
            static const Json::Value kNone(Json::objectValue);
            name = found->second;
            share = ReadState("shares.json", kNone)[name];
            return true;
        }
        if (end == 0 || end == std::string::npos) return false;
    }
}

}  // namespace detail
}  // namespace qira_sim

extern "C" {

int QLIBCErrGet(void) { return qira_sim::detail::g_error_code; }

void QLIBCErrSetEx(int code, const char* szFile, int line) { qira_sim::detail::SetError(code, szFile, line); }

const char* QLIBCErrorGetFile(void) { return qira_sim::detail::g_error_file.c_str(); }

int QLIBCErrorGetLine(void) { return qira_sim::detail::g_error_line; }
}
