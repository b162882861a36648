#include "cli.h"

#include <iostream>

namespace tools {

std::optional<int> Parse(CLI::App& app, int argc, char** argv) {
    try {
        app.parse(argc, argv);
    } catch (const CLI::Success& e) {  // help and --version
        return app.exit(e);
    } catch (const CLI::ParseError& e) {
        if (e.get_name() == "RuntimeError") {
            std::cerr << app.get_name() << ": " << e.what() << "\n";
            return e.get_exit_code();
        }
        std::cerr << app.get_name() << ": " << e.what() << "\n" << app.help();
        return kExitUsage;
    }
    return std::nullopt;
}

}  // namespace tools
