#include "text/escape.h"

#include "text/utf8.h"

#include <cstdio>

namespace vesk {
namespace {
bool IsInRange(int32_t number, int32_t first, int32_t last) {
    return number >= first && number <= last;
}

bool IsDangerous(int32_t number) {
    return number < 0x20 || IsInRange(number, 0x7F, 0x9F) || IsInRange(number, 0x200B, 0x200F) ||
           IsInRange(number, 0x2028, 0x202E) || IsInRange(number, 0x2060, 0x206F) ||
           number == 0x061C || number == 0xFEFF;
}
} // namespace

std::string TextEscaped(std::string_view text) {
    std::string escaped;
    size_t length = 0;
    for (size_t at = 0; at < text.size(); at += length) {
        const int32_t number = Utf8At(text, at, &length);
        const std::string_view bytes = text.substr(at, length);
        if (number == '\\') {
            escaped += "\\\\";
        } else if (!IsDangerous(number)) {
            escaped.append(bytes);
        } else {
            for (const char byte : bytes) {
                char digits[5];
                snprintf(digits, sizeof(digits), "\\x%02x", static_cast<unsigned char>(byte));
                escaped += digits;
            }
        }
    }
    return escaped;
}
} // namespace vesk
