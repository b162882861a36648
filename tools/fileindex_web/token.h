// The console's token: writes must carry it. Made on first start under the root, mode 0600.
#pragma once

#include <string>

namespace web {

// The token stored in `file`, made (and `created` set) when there is none. Empty when it can be
// neither read nor made.
std::string LoadOrCreateToken(const std::string& file, bool& created);

}  // namespace web
