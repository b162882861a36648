// qira-sim: set up and inspect a simulated appliance under a root, by hand or from scripts.
#include <CLI/CLI.hpp>

#include "fileindex/json.h"
#include "appliance_root.h"
#include "cli.h"
#include "output.h"
#include "fileindex/root.h"
#include "qira_sim/appliance.h"

namespace {

// What the command line fills in; one instance lives in main for the whole run.
struct Options {
    tools::Output out{"qira-sim"};
    std::string root;
    std::string name, dir;
    bool encrypted = false, encryption = false, readOnly = false;
    int fsType = 2;
    long long quotaFree = -1;
    std::vector<std::string> mountPoints;
    std::string op, arg;
    int err = 0x0100;
    std::string afterOp, afterArg;
    bool clearJournal = false;
    std::string service, state, onOff;
};

void Show(const Options& options, const Json::Value& value) {
    std::string text = value.toStyledString();
    if (!text.empty() && text.back() == '\n') text.pop_back();
    options.out.Emit(value, text);
}

Json::Value ShareProperties(const Options& o) {
    Json::Value props(Json::objectValue);
    props["encrypted"] = o.encrypted;
    props["encryption"] = o.encryption;
    props["read_only"] = o.readOnly;
    props["fs_type"] = o.fsType;
    if (o.quotaFree >= 0) props["quota_free"] = static_cast<Json::Int64>(o.quotaFree);
    for (const auto& point : o.mountPoints) props["mount_points"].append(point);
    return props;
}

void AddShareCommands(CLI::App& app, Options& o) {
    auto* share = app.add_subcommand("share", "Shares of the appliance");
    share->require_subcommand(1);
    auto* add = share->add_subcommand("add", "Add or replace a share (its directory must exist)");
    add->add_option("name", o.name)->required();
    add->add_option("dir", o.dir, "The share's directory (its full path)")->required()->check(CLI::ExistingDirectory);
    add->add_flag("--encrypted", o.encrypted, "The share's volume is locked");
    add->add_flag("--encryption", o.encryption, "The share uses encryption (its directory is a mount)");
    add->add_flag("--read-only", o.readOnly);
    add->add_option("--fs-type", o.fsType, "2 ext4, 12 never indexed, 20-29 remote, 30-39 image");
    add->add_option("--quota-free", o.quotaFree, "Bytes the share's quota still allows");
    add->add_option("--mount-point", o.mountPoints, "Full paths to report as mount points");
    add->callback([&o] { qira_sim::PutShare(o.name, o.dir, ShareProperties(o)); });
    auto* remove = share->add_subcommand("remove", "Remove a share from the share table");
    remove->add_option("name", o.name)->required();
    remove->callback([&o] { qira_sim::RemoveShare(o.name); });
    share->add_subcommand("list", "Show the share table")->callback([&o] { Show(o, qira_sim::Shares()); });
}

void AddFaultCommands(CLI::App& app, Options& o) {
    auto* fault = app.add_subcommand("fault", "Make platform operations fail");
    fault->require_subcommand(1);
    auto* set = fault->add_subcommand("set", "Make an operation fail with a platform error number");
    set->add_option("op", o.op, "Operation, e.g. QLIBServiceStart or MonitorQueue::Upsert")->required();
    set->add_option("--err", o.err, "Platform error number (e.g. 0x2900)");
    set->add_option("--arg", o.arg, "Only when the first argument equals this");
    set->add_option("--after", o.afterOp, "Only once the library has called this operation");
    set->add_option("--after-arg", o.afterArg, "... with this first argument")->needs("--after");
    set->callback([&o] { qira_sim::InjectFault(o.op, o.err, o.arg, {o.afterOp, o.afterArg}); });
    auto* clear = fault->add_subcommand("clear", "Clear one fault, or all");
    clear->add_option("op", o.op);
    clear->callback([&o] { o.op.empty() ? qira_sim::ClearFaults() : qira_sim::ClearFault(o.op); });
    fault->add_subcommand("list", "Show the faults")->callback([&o] { Show(o, qira_sim::Faults()); });
}

void ShowJournal(const Options& o) {
    Json::Value entries(Json::arrayValue);
    std::string text;
    for (const auto& entry : qira_sim::Journal()) {
        entries.append(entry);
        text += (text.empty() ? "" : "\n") + QIRA::FILEINDEX::toString(entry);
    }
    if (!text.empty() || o.out.json) o.out.Emit(entries, text);
}

void ShowNotices(const Options& o) {
    Json::Value calls(Json::arrayValue);
    std::string text;
    for (const auto& call : qira_sim::NotifierCalls()) {
        Json::Value args(Json::arrayValue);
        for (const auto& arg : call) {
            args.append(arg);
            text += arg + " ";
        }
        calls.append(args);
        text += "\n";
    }
    if (!text.empty()) text.pop_back();
    if (!text.empty() || o.out.json) o.out.Emit(calls, text);
}

void AddInspectCommands(CLI::App& app, Options& o) {
    auto* journal = app.add_subcommand("journal", "Show the platform calls the library made");
    journal->add_flag("--clear", o.clearJournal, "Empty the journal afterwards");
    journal->callback([&o] {
        ShowJournal(o);
        if (o.clearJournal) qira_sim::ClearJournal();
    });
    app.add_subcommand("monitors", "Show the monitor-queue registrations")->callback([&o] {
        Show(o, qira_sim::Registrations());
    });
    app.add_subcommand("notices", "Show the administrator notices raised")->callback([&o] { ShowNotices(o); });
    auto* svc = app.add_subcommand("service", "Show or set a service's state");
    svc->add_option("name", o.service)->required();
    svc->add_option("state", o.state)->check(CLI::IsMember({"running", "stopped"}));
    svc->callback([&o] {
        if (!o.state.empty()) qira_sim::SetServiceState(o.service, o.state);
        const std::string state = qira_sim::ServiceState(o.service);
        o.out.Emit(state, state);
    });
    auto* spotlight = app.add_subcommand("spotlight", "Show or set the SMB Spotlight switch");
    spotlight->add_option("state", o.onOff)->check(CLI::IsMember({"on", "off"}));
    spotlight->callback([&o] {
        if (!o.onOff.empty()) qira_sim::SetSpotlightState(o.onOff == "on");
        o.out.Emit(qira_sim::SpotlightState(), qira_sim::SpotlightState() ? "on" : "off");
    });
}

}  // namespace

int main(int argc, char** argv) {
    CLI::App app{"Set up and inspect a simulated appliance", "qira-sim"};
    app.require_subcommand(1);
    app.fallthrough();
    app.set_version_flag("--version", "qira-sim " FILEINDEX_VERSION);
    Options options;
    app.add_option("--root", options.root, "Root of the simulated appliance (instead of QIRA_ROOT)");
    app.add_flag("--json", options.out.json, "Print one JSON object: {\"ok\", \"result\", ...}");
    app.parse_complete_callback([&options, &app] {
        if (!options.root.empty()) QIRA::FILEINDEX::UseRootPrefix(options.root);
        if (options.root.empty() && !app.got_subcommand("init")) tools::WarnWithoutAppliance("qira-sim");
    });
    app.add_subcommand("init", "Create the appliance's directories, notifier and default services")->callback([] {
        // A simulated appliance never goes into the real root.
        if (qira_sim::Root().empty()) throw CLI::ValidationError("--root", "give --root or QIRA_ROOT");
        if (!qira_sim::InitAppliance(qira_sim::Root())) throw CLI::RuntimeError("cannot create the appliance", 1);
    });
    AddShareCommands(app, options);
    AddFaultCommands(app, options);
    AddInspectCommands(app, options);
    return tools::Parse(app, argc, argv).value_or(0);
}
