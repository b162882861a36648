// Simulated services and SMB Spotlight switch, kept in services.json and journalled.
#include <string>

#include "qira/qlib_service.h"
#include "qira_sim/appliance.h"
#include "sim_state.h"

namespace {

int ChangeService(const char* op, const char* szName, const char* state, Json::Value args) {
    using namespace qira_sim::detail;
    const std::string name = szName ? szName : "";
    int result = 0;
    if (Faulted(op, name)) {
        result = -1;
    } else {
        qira_sim::SetServiceState(name, state);
    }
    AppendJournal(op, args, result);
    return result;
}

Json::Value Args(const char* name) {
    Json::Value args(Json::arrayValue);
    args.append(name ? name : "");
    return args;
}

Json::Value Args(const char* name, int flags) {
    Json::Value args = Args(name);
    args.append(flags);
    return args;
}

}  // namespace

extern "C" {

int QLIBServiceStart(const char* szName, int flags) {
    return ChangeService("QLIBServiceStart", szName, "running", Args(szName, flags));
}

int QLIBServiceStop(const char* szName, int flags) {
    return ChangeService("QLIBServiceStop", szName, "stopped", Args(szName, flags));
}

int QLIBServiceRestart(const char* szName) { return ChangeService("QLIBServiceRestart", szName, "running", Args(szName)); }

int QIRASMBIsEnableSpotlight(void) {
    if (qira_sim::detail::Faulted("QIRASMBIsEnableSpotlight")) return -1;
    return qira_sim::SpotlightState() ? 1 : 0;
}

int QIRASMBSetSpotlight(int enable) {
    using namespace qira_sim::detail;
    int result = 0;
    if (Faulted("QIRASMBSetSpotlight")) {
        result = -1;
    } else {
        qira_sim::SetSpotlightState(enable != 0);
    }
    Json::Value args(Json::arrayValue);
    args.append(enable);
    AppendJournal("QIRASMBSetSpotlight", args, result);
    return result;
}
}
