// The root the tools work on, checked before they start.
#pragma once

#include <string>

namespace tools {

// Warns on stderr when QIRA_ROOT is unset and "/" holds no appliance (no configuration directory
// "/usr/qira/etc/fileindex"): the tool would then work on the real system paths of a machine that
// is no appliance.
void WarnWithoutAppliance(const std::string& tool);

}  // namespace tools
