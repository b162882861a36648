#include "appliance_root.h"

#include <sys/stat.h>

#include <cstdlib>
#include <iostream>

#include "fileindex/root.h"

namespace tools {

void WarnWithoutAppliance(const std::string& tool) {
    const char* variable = std::getenv("QIRA_ROOT");
    if (variable != nullptr && *variable != '\0') return;
    const std::string configDir = QIRA::FILEINDEX::RootPrefix() + "/usr/qira/etc/fileindex";
    struct stat st;
    if (stat(configDir.c_str(), &st) == 0 && S_ISDIR(st.st_mode)) return;
    std::cerr << tool << ": warning: QIRA_ROOT is not set and " << configDir
              << " does not exist: this machine holds no appliance; set QIRA_ROOT (or --root) to a simulated one\n";
}

}  // namespace tools
