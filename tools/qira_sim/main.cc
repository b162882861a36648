// qira-sim: set up and inspect a simulated appliance under a root, by hand or from scripts.
#include <cstdlib>
#include <iostream>

#include <CLI/CLI.hpp>

#include "fileindex/json.h"
#include "cli.h"
#include "fileindex/root.h"
#include "qira_sim/appliance.h"

namespace {

void Print(const Json::Value& value) { std::cout << value.toStyledString(); }

void AddShareCommands(CLI::App& app) {
    auto* share = app.add_subcommand("share", "Shares of the appliance");
    share->require_subcommand(1);
    static std::string name, dir;
    static bool encrypted = false, encryption = false, readOnly = false;
    static int fsType = 2;
    static long long quotaFree = -1;
    static std::vector<std::string> mountPoints;
    auto* add = share->add_subcommand("add", "Add or replace a share (its directory must exist)");
    add->add_option("name", name)->required();
    add->add_option("dir", dir, "The share's directory (its full path)")->required()->check(CLI::ExistingDirectory);
    add->add_flag("--encrypted", encrypted, "The share's volume is locked");
    add->add_flag("--encryption", encryption, "The share uses encryption (its directory is a mount)");
    add->add_flag("--read-only", readOnly);
    add->add_option("--fs-type", fsType, "2 ext4, 12 never indexed, 20-29 remote, 30-39 image");
    add->add_option("--quota-free", quotaFree, "Bytes the share's quota still allows");
    add->add_option("--mount-point", mountPoints, "Full paths to report as mount points");
    add->callback([] {
        Json::Value props(Json::objectValue);
        props["encrypted"] = encrypted;
        props["encryption"] = encryption;
        props["read_only"] = readOnly;
        props["fs_type"] = fsType;
        if (quotaFree >= 0) props["quota_free"] = static_cast<Json::Int64>(quotaFree);
        for (const auto& point : mountPoints) props["mount_points"].append(point);
        qira_sim::PutShare(name, dir, props);
    });
    auto* remove = share->add_subcommand("remove", "Remove a share from the share table");
    remove->add_option("name", name)->required();
    remove->callback([] { qira_sim::RemoveShare(name); });
    share->add_subcommand("list", "Show the share table")->callback([] { Print(qira_sim::Shares()); });
}

void AddFaultCommands(CLI::App& app) {
    auto* fault = app.add_subcommand("fault", "Make platform operations fail");
    fault->require_subcommand(1);
    static std::string op, arg;
    static int err = 0x0100, skip = 0;
    auto* set = fault->add_subcommand("set", "Make an operation fail with a platform error number");
    set->add_option("op", op, "Operation, e.g. QLIBServiceStart or MonitorQueue::Upsert")->required();
    set->add_option("--err", err, "Platform error number (e.g. 0x2900)");
    set->add_option("--arg", arg, "Only when the first argument equals this");
    set->add_option("--skip", skip, "Let this many matching calls pass first");
    set->callback([] { qira_sim::InjectFault(op, err, arg, skip); });
    auto* clear = fault->add_subcommand("clear", "Clear one fault, or all");
    clear->add_option("op", op);
    clear->callback([] { op.empty() ? qira_sim::ClearFaults() : qira_sim::ClearFault(op); });
    fault->add_subcommand("list", "Show the faults")->callback([] { Print(qira_sim::Faults()); });
}

void AddInspectCommands(CLI::App& app) {
    static bool clear = false;
    auto* journal = app.add_subcommand("journal", "Show the platform calls the library made");
    journal->add_flag("--clear", clear, "Empty the journal afterwards");
    journal->callback([] {
        for (const auto& entry : qira_sim::Journal()) std::cout << QIRA::FILEINDEX::toString(entry) << "\n";
        if (clear) qira_sim::ClearJournal();
    });
    app.add_subcommand("monitors", "Show the monitor-queue registrations")->callback([] { Print(qira_sim::Registrations()); });
    app.add_subcommand("notices", "Show the administrator notices raised")->callback([] {
        for (const auto& call : qira_sim::NotifierCalls()) {
            for (const auto& arg : call) std::cout << arg << " ";
            std::cout << "\n";
        }
    });
    static std::string service, state;
    auto* svc = app.add_subcommand("service", "Show or set a service's state");
    svc->add_option("name", service)->required();
    svc->add_option("state", state)->check(CLI::IsMember({"running", "stopped"}));
    svc->callback([] {
        if (!state.empty()) qira_sim::SetServiceState(service, state);
        std::cout << qira_sim::ServiceState(service) << "\n";
    });
    static std::string onOff;
    auto* spotlight = app.add_subcommand("spotlight", "Show or set the SMB Spotlight switch");
    spotlight->add_option("state", onOff)->check(CLI::IsMember({"on", "off"}));
    spotlight->callback([] {
        if (!onOff.empty()) qira_sim::SetSpotlightState(onOff == "on");
        std::cout << (qira_sim::SpotlightState() ? "on" : "off") << "\n";
    });
}

}  // namespace

int main(int argc, char** argv) {
    CLI::App app{"Set up and inspect a simulated appliance", "qira-sim"};
    app.require_subcommand(1);
    app.set_version_flag("--version", "qira-sim " FILEINDEX_VERSION);
    std::string root;
    app.add_option("--root", root, "Root of the simulated appliance (instead of QIRA_ROOT)");
    app.parse_complete_callback([&root] {
        if (!root.empty()) QIRA::FILEINDEX::UseRootPrefix(root);
    });
    app.add_subcommand("init", "Create the appliance's directories, notifier and default services")->callback([] {
        // A simulated appliance never goes into the real root.
        if (qira_sim::Root().empty()) throw CLI::ValidationError("--root", "give --root or QIRA_ROOT");
        if (!qira_sim::InitAppliance(qira_sim::Root())) throw CLI::RuntimeError("cannot create the appliance", 1);
    });
    AddShareCommands(app);
    AddFaultCommands(app);
    AddInspectCommands(app);
    return tools::Parse(app, argc, argv).value_or(0);
}
