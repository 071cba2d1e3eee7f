#include "text/utf8.h"

namespace vesk {
namespace {
struct Form {
    unsigned char mask;  // of the first byte's bits that tell the form
    unsigned char value; // what they are then
    int32_t least;       // the first character that needs this form
    size_t bytes;
};
const Form kForms[] = {
    {0x80, 0x00, 0, 1}, {0xE0, 0xC0, 0x80, 2}, {0xF0, 0xE0, 0x800, 3}, {0xF8, 0xF0, 0x10000, 4}};

unsigned char ByteAt(std::string_view text, size_t at) {
    return static_cast<unsigned char>(text[at]);
}

bool IsCharacter(int32_t number, const Form &form) {
    return number >= form.least && number <= 0x10FFFF && (number < 0xD800 || number > 0xDFFF);
}
} // namespace

int32_t Utf8At(std::string_view text, size_t at, size_t *length) {
    *length = 1;
    for (const Form &form : kForms) {
        const unsigned char first = ByteAt(text, at);
        if ((first & form.mask) != form.value) {
            continue;
        }
        int32_t number = first & static_cast<unsigned char>(~form.mask);
        for (size_t next = 1; next < form.bytes; ++next) {
            if (at + next >= text.size() || (ByteAt(text, at + next) & 0xC0) != 0x80) {
                return -1;
            }
            number = number << 6 | (ByteAt(text, at + next) & 0x3F);
        }
        if (!IsCharacter(number, form)) {
            return -1;
        }
        *length = form.bytes;
        return number;
    }
    return -1;
}

bool Utf8IsValid(std::string_view text) {
    size_t length = 0;
    for (size_t at = 0; at < text.size(); at += length) {
        if (Utf8At(text, at, &length) < 0) {
            return false;
        }
    }
    return true;
}

std::string Utf8Repaired(std::string_view text) {
    std::string repaired;
    size_t length = 0;
    for (size_t at = 0; at < text.size(); at += length) {
        const bool isCharacter = Utf8At(text, at, &length) >= 0;
        repaired.append(isCharacter ? text.substr(at, length) : "\xEF\xBF\xBD");
    }
    return repaired;
}

std::string Base64Of(std::string_view bytes) {
    static const char kDigits[] =
        "ABCDEFGHIJKLMNOPQRSTUVWXYZabcdefghijklmnopqrstuvwxyz0123456789+/";
    std::string text;
    for (size_t at = 0; at < bytes.size(); at += 3) {
        const size_t count = bytes.size() - at < 3 ? bytes.size() - at : 3;
        unsigned group = 0;
        for (size_t i = 0; i < 3; ++i) {
            group = group << 8 | (i < count ? ByteAt(bytes, at + i) : 0U);
        }
        for (size_t i = 0; i < 4; ++i) {
            text += i <= count ? kDigits[group >> (18 - 6 * i) & 63] : '=';
        }
    }
    return text;
}
} // namespace vesk
