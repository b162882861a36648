// Names and text from a share, shown without letting their bytes act: a share's users choose file
// names, and a name may hold control characters or bytes that are not UTF-8.
#pragma once

#include <string>

namespace tools {

bool IsValidUtf8(const std::string& text);

// `text` with every byte of a broken UTF-8 sequence, and every NUL, replaced by `replacement`.
std::string ValidUtf8(const std::string& text, const std::string& replacement);

// For a terminal, in the manner of `ls --quoting-style=escape`: "\\" for a backslash, "\n", "\t"
// and the like for the usual control characters, "\ooo" (octal) for the other C0 and C1 controls,
// DEL and every byte that is not part of valid UTF-8. Valid UTF-8 otherwise stays as it is.
std::string EscapeForTerminal(const std::string& text);

// Two lower-case hexadecimal digits per byte: the reversible form of a name that is not UTF-8.
std::string Hex(const std::string& bytes);
// The bytes of Hex's output; a stray last digit or a non-digit pair is skipped.
std::string FromHex(const std::string& hex);

}  // namespace tools
