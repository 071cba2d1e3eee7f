// What every answer has: the frame of its JSON document, or messages beside a table.
//
// Thread rule: one thread.
#pragma once

#include "model/look_errors.h"
#include "text/text_sink.h"
#include "json/json_text.h"

#include <string>
#include <vector>

namespace vesk {
// Begins the document of this command.
void AnswerBegin(JsonWriter &json, const char *command);

// Ends it with what could not be looked at.
void AnswerEnd(JsonWriter &json, TextSink &out, const LookErrors &errors);

// The same for people, on standard error.
void AnswerErrors(const LookErrors &errors);

// A row of a table: the columns end with two blanks, the last without. Widths: characters, negative
// for text, which stands on the left; the last column has none.
std::string TableRow(const std::vector<std::string> &cells, const std::vector<int> &widths);

// The text in the terminal's colour where `color` says so: 31 red, 32 green, 33 yellow, 1 bold.
std::string Colored(const std::string &text, int code, bool color);
} // namespace vesk
