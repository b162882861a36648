// fileindexctl: the library's operations as a command, for share hooks, upgrade scripts and
// administrators.
#include <sys/stat.h>

#include <cstdlib>

#include "appliance_root.h"
#include "captured_log.h"
#include "cli.h"
#include "commands.h"
#include "fileindex/root.h"

namespace {

// The root prefix in force, from --root or the environment, must be a directory.
void UseRoot(const std::string& option) {
    if (!option.empty() && !QIRA::FILEINDEX::UseRootPrefix(option)) {
        throw CLI::ValidationError("--root", "this build uses the appliance's own paths");
    }
    const std::string root = QIRA::FILEINDEX::RootPrefix();
    struct stat st;
    if (!root.empty() && (stat(root.c_str(), &st) != 0 || !S_ISDIR(st.st_mode))) {
        throw CLI::ValidationError(option.empty() ? "the root prefix" : "--root", "no such directory: " + root);
    }
    if (option.empty()) tools::WarnWithoutAppliance("fileindexctl");
}

}  // namespace

int main(int argc, char** argv) {
    tools::CaptureLibraryLog();
    fileindexctl::Context ctx;
    CLI::App app{"Configure and control the file-indexing service", "fileindexctl"};
    app.require_subcommand(1);
    app.fallthrough();  // the options below are accepted after the command too
    app.set_version_flag("--version", "fileindexctl " FILEINDEX_VERSION);
    std::string root;
    app.add_option("--root", root, "Root prefix of the appliance (instead of QIRA_ROOT)");
    app.add_flag("--json", ctx.out.json, "One JSON object on stdout, for success and failure alike");
    app.add_flag("-q,--quiet", ctx.out.quiet, "Do not show the library's log lines with a failure");
    app.add_flag("-v,--verbose", ctx.out.verbose, "Show the library's log lines with their source file and line");
    app.add_option("--lock-wait", ctx.lockWait, "Seconds to retry a held configuration lock (0 = fail at once)")
        ->check(CLI::NonNegativeNumber);
    app.parse_complete_callback([&root] { UseRoot(root); });
    fileindexctl::AddFolderCommands(app, ctx);
    fileindexctl::AddServiceCommands(app, ctx);
    fileindexctl::AddShareCommands(app, ctx);
    fileindexctl::AddQuestionCommands(app, ctx);
    fileindexctl::AddInsightCommands(app, ctx);
    fileindexctl::AddSearchCommand(app, ctx);
    if (const auto ended = tools::Parse(app, argc, argv)) return *ended;
    return ctx.status;
}
