#include "text_safety.h"

#include <simdjson.h>

namespace tools {
namespace {

// The length of the valid UTF-8 sequence starting at `i`, or 0.
size_t SequenceAt(const std::string& text, size_t i) {
    const auto c = static_cast<unsigned char>(text[i]);
    const size_t length = c < 0x80 ? 1 : (c >> 5) == 0x6 ? 2 : (c >> 4) == 0xE ? 3 : (c >> 3) == 0x1E ? 4 : 0;
    if (length == 0 || i + length > text.size()) return 0;
    return simdjson::validate_utf8(text.data() + i, length) ? length : 0;
}

std::string Octal(unsigned char c) {
    std::string out = "\\";
    out += static_cast<char>('0' + ((c >> 6) & 7));
    out += static_cast<char>('0' + ((c >> 3) & 7));
    out += static_cast<char>('0' + (c & 7));
    return out;
}

std::string EscapeOfControl(unsigned char c) {
    switch (c) {
        case '\a': return "\\a";
        case '\b': return "\\b";
        case '\f': return "\\f";
        case '\n': return "\\n";
        case '\r': return "\\r";
        case '\t': return "\\t";
        case '\v': return "\\v";
        case '\\': return "\\\\";
        default: return Octal(c);
    }
}

}  // namespace

bool IsValidUtf8(const std::string& text) { return simdjson::validate_utf8(text.data(), text.size()); }

std::string ValidUtf8(const std::string& text, const std::string& replacement) {
    if (IsValidUtf8(text) && text.find('\0') == std::string::npos) return text;  // the usual case, in one pass
    std::string out;
    out.reserve(text.size());
    for (size_t i = 0; i < text.size();) {
        const size_t length = SequenceAt(text, i);
        if (length > 0 && text[i] != '\0') {
            out.append(text, i, length);
            i += length;
        } else {
            out += replacement;
            ++i;
        }
    }
    return out;
}

std::string EscapeForTerminal(const std::string& text) {
    std::string out;
    out.reserve(text.size());
    for (size_t i = 0; i < text.size();) {
        const auto c = static_cast<unsigned char>(text[i]);
        const size_t length = SequenceAt(text, i);
        const bool c1 = length == 2 && c == 0xC2 && static_cast<unsigned char>(text[i + 1]) < 0xA0;
        if (length == 0 || c < 0x20 || c == 0x7F || c == '\\') {
            out += EscapeOfControl(c);
            ++i;
        } else if (c1) {
            out += Octal(c) + Octal(static_cast<unsigned char>(text[i + 1]));
            i += 2;
        } else {
            out.append(text, i, length);
            i += length;
        }
    }
    return out;
}

std::string Hex(const std::string& bytes) {
    static const char kDigits[] = "0123456789abcdef";
    std::string out;
    out.reserve(bytes.size() * 2);
    for (const char byte : bytes) {
        const auto c = static_cast<unsigned char>(byte);
        out += kDigits[c >> 4];
        out += kDigits[c & 15];
    }
    return out;
}

std::string FromHex(const std::string& hex) {
    std::string bytes;
    for (size_t i = 0; i + 1 < hex.size(); i += 2) {
        const std::string pair = hex.substr(i, 2);
        if (pair.find_first_not_of("0123456789abcdefABCDEF") == std::string::npos) {
            bytes += static_cast<char>(std::stoi(pair, nullptr, 16));
        }
    }
    return bytes;
}

}  // namespace tools
