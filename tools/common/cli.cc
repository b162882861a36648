#include "cli.h"

#include <cstring>
#include <iostream>

#include "envelope.h"
#include "fileindex/json.h"

namespace tools {
namespace {

bool AsksForJson(int argc, char** argv) {
    for (int i = 1; i < argc; ++i) {
        if (std::strcmp(argv[i], "--json") == 0) return true;
    }
    return false;
}

int Refuse(const CLI::App& app, const std::string& what, int status, bool json, bool withUsage) {
    std::cerr << app.get_name() << ": " << what << "\n";
    if (withUsage) std::cerr << app.help();
    if (json) {
        const Cause cause{status == kExitUsage ? "USAGE" : "REFUSED", 0, what, 400};
        std::cout << QIRA::FILEINDEX::toString(FailureEnvelope(cause, what, {}, false)) << "\n";
    }
    return status;
}

}  // namespace

std::optional<int> Parse(CLI::App& app, int argc, char** argv) {
    try {
        app.parse(argc, argv);
    } catch (const CLI::Success& e) {  // help and --version
        return app.exit(e);
    } catch (const CLI::ParseError& e) {
        const bool refusedRun = e.get_name() == "RuntimeError";
        return Refuse(app, e.what(), refusedRun ? e.get_exit_code() : kExitUsage, AsksForJson(argc, argv), !refusedRun);
    }
    return std::nullopt;
}

}  // namespace tools
