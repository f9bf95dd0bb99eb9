// Case-insensitive comparison of UTF-8 text by Unicode's full case folding.
#include "platform/unicode.h"

#include <unicase.h>
#include <unistr.h>

#include <cstdint>
#include <cstring>
#include <optional>

#include "api.h"
#include "faults.h"

namespace VEXO {
namespace EMULATION {
namespace {

unsigned char AsciiLower(unsigned char c)
{
    return c >= 'A' && c <= 'Z' ? static_cast<unsigned char>(c - 'A' + 'a') : c;
}

// For text that is not UTF-8: bytes compared as unsigned values, ASCII letters folded.
int CompareBytesFoldingAscii(const char *a, const char *b)
{
    const unsigned char *x = reinterpret_cast<const unsigned char *>(a);
    const unsigned char *y = reinterpret_cast<const unsigned char *>(b);
    while (*x != '\0' && AsciiLower(*x) == AsciiLower(*y)) {
        ++x;
        ++y;
    }
    return static_cast<int>(AsciiLower(*x)) - static_cast<int>(AsciiLower(*y));
}

}  // namespace
}  // namespace EMULATION
}  // namespace VEXO

using namespace VEXO::EMULATION;

extern "C" VEXOEMU_API int VLIBCUnicodeUTF8StrCaseCmp(const char *szA, const char *szB)
{
    return Guarded(0, [&] {
        if (const std::optional<int> forced = ForcedResult("VLIBCUnicodeUTF8StrCaseCmp", szA)) {
            return *forced;
        }
        if (szA == nullptr || szB == nullptr) {
            return szA == szB ? 0 : (szA == nullptr ? -1 : 1);  // no text sorts first
        }
        const uint8_t *a = reinterpret_cast<const uint8_t *>(szA);
        const uint8_t *b = reinterpret_cast<const uint8_t *>(szB);
        const size_t lengthA = std::strlen(szA);
        const size_t lengthB = std::strlen(szB);
        int order = 0;
        if (u8_check(a, lengthA) == nullptr && u8_check(b, lengthB) == nullptr &&
            u8_casecmp(a, lengthA, b, lengthB, nullptr, nullptr, &order) == 0) {
            return order;
        }
        return CompareBytesFoldingAscii(szA, szB);
    });
}
