// Arrays of strings inside the configuration document. Thread rule: no state.
#pragma once

#include <json/value.h>
#include <string>

namespace vesk {
// Whether some element, taken as a string, equals `text`. Anything but an array answers false.
// Elements must be scalars: others make jsoncpp throw.
bool JsonArrayHasString(Json::Value array, const char *text);

// Removes the one element equal to `text`; the others keep their order, as strings. 0, or -1 after
// an error message when none or several match: which of two to remove is not for this function to
// guess, and the array stays as it was. Elements must be scalars.
int JsonArrayRemoveString(Json::Value &array, const std::string &text);
} // namespace vesk
