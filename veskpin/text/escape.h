// Names as a terminal may have them: what others chose cannot move the cursor, forge a line or run
// backwards.
//
// Thread rule: no state.
#pragma once

#include <string>
#include <string_view>

namespace vesk {
// Control characters, what changes the direction of writing, and bytes that are no UTF-8 as "\xNN",
// a backslash as "\\", so that no two names look alike.
std::string TextEscaped(std::string_view text);
} // namespace vesk
