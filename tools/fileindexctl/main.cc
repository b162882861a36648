// fileindexctl: the library's operations as a command, for share hooks, upgrade scripts and
// administrators.
#include <cstdlib>
#include <iostream>

#include "commands.h"

int main(int argc, char** argv) {
    fileindexctl::Context ctx;
    CLI::App app{"Configure and control the file-indexing service", "fileindexctl"};
    app.require_subcommand(1);
    std::string root;
    app.add_option("--root", root, "Root prefix of the appliance (instead of QIRA_ROOT)");
    app.add_flag("--json", ctx.out.json, "Machine-readable output");
    app.add_option("--lock-wait", ctx.lockWait, "Seconds to retry a held configuration lock (0 = fail at once)")
        ->check(CLI::NonNegativeNumber);
    app.parse_complete_callback([&root] {
        if (!root.empty()) setenv("QIRA_ROOT", root.c_str(), 1);
    });
    fileindexctl::AddFolderCommands(app, ctx);
    fileindexctl::AddServiceCommands(app, ctx);
    fileindexctl::AddShareCommands(app, ctx);
    fileindexctl::AddQuestionCommands(app, ctx);
    try {
        app.parse(argc, argv);
    } catch (const CLI::CallForHelp& e) {
        return app.exit(e);
    } catch (const CLI::CallForAllHelp& e) {
        return app.exit(e);
    } catch (const CLI::ParseError& e) {
        std::cerr << "fileindexctl: " << e.what() << "\n" << app.help();
        return fileindexctl::kExitUsage;
    }
    return ctx.status;
}
