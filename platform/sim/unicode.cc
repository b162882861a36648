// Case-insensitive comparison of UTF-8 strings by simple case folding of code points.
#include <locale.h>
#include <wctype.h>

#include <cstdint>

#include "qira/qlib_core.h"

namespace {

// Decodes one UTF-8 sequence; an invalid byte stands for itself (in a range no letter uses).
uint32_t NextCodePoint(const unsigned char*& s) {
    const unsigned char lead = *s++;
    int extra = 0;
    uint32_t cp = lead;
    if (lead >= 0xF0 && lead < 0xF8) {
        extra = 3;
        cp = lead & 0x07;
    } else if (lead >= 0xE0) {
        extra = 2;
        cp = lead & 0x0F;
    } else if (lead >= 0xC0) {
        extra = 1;
        cp = lead & 0x1F;
    } else if (lead >= 0x80) {
        return 0x110000u + lead;
    }
    for (int i = 0; i < extra; ++i) {
        if ((s[i] & 0xC0) != 0x80) return 0x110000u + lead;
    }
    for (int i = 0; i < extra; ++i) cp = (cp << 6) | (*s++ & 0x3F);
    return cp;
}

uint32_t Fold(uint32_t cp) {
    static const locale_t utf8 = newlocale(LC_CTYPE_MASK, "C.UTF-8", static_cast<locale_t>(0));
    if (cp > 0x10FFFF) return cp;
    if (utf8 == static_cast<locale_t>(0)) return (cp < 0x80) ? static_cast<uint32_t>(towlower(cp)) : cp;
    return static_cast<uint32_t>(towlower_l(static_cast<wint_t>(cp), utf8));
}

}  // namespace

extern "C" int QLIBCUnicodeUTF8StrCaseCmp(const char* s1, const char* s2) {
    auto a = reinterpret_cast<const unsigned char*>(s1 ? s1 : "");
    auto b = reinterpret_cast<const unsigned char*>(s2 ? s2 : "");
    while (*a != 0 && *b != 0) {
        const uint32_t ca = Fold(NextCodePoint(a));
        const uint32_t cb = Fold(NextCodePoint(b));
        if (ca != cb) return ca < cb ? -1 : 1;
    }
    if (*a == 0 && *b == 0) return 0;
    return *a == 0 ? -1 : 1;
}
