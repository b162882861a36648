// The console's token: writes must carry it. Made on first start under the root, mode 0600.
#pragma once

#include <string>

namespace web {

// The token stored in `file`, made (and `created` set) when there is none. Empty when it can be
// neither read nor made, or when the file is not a regular file of this user that only this user
// can read and write (a token others could read protects nothing).
std::string LoadOrCreateToken(const std::string& file, bool& created);

// Whether `given` is the token, in a time that does not depend on how much of it matches.
bool TokenMatches(const std::string& given, const std::string& token);

}  // namespace web
