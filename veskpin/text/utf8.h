// What is valid UTF-8, and the bytes of names that are not.
//
// Thread rule: no state.
#pragma once

#include <cstddef>
#include <cstdint>
#include <string>
#include <string_view>

namespace vesk {
// The character that begins at `at` (inside the text): its number, and its bytes in `*length`; of a
// byte that begins none, -1 and 1. Surrogates and longer forms than needed are no characters.
int32_t Utf8At(std::string_view text, size_t at, size_t *length);

bool Utf8IsValid(std::string_view text);

// With U+FFFD for each byte that belongs to no character.
std::string Utf8Repaired(std::string_view text);

std::string Base64Of(std::string_view bytes);
} // namespace vesk
