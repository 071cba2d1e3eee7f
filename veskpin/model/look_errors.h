// What could not be looked at, and why. The tool's libraries tell causes to their log; while a
// program looks, the log's errors are kept here instead of being written anywhere.
//
// Thread rule: one thread.
#pragma once

#include <cstddef>
#include <cstdint>
#include <string>
#include <vector>

namespace vesk {
struct LookError {
    std::string path; // what could not be looked at; may be empty
    std::string text;
};

const size_t kLookErrorsMax = 100000;

struct LookErrors {
    std::vector<LookError> list; // at most kLookErrorsMax: users can make millions of files
    uint64_t more = 0;           // that are not listed
    // Something that was asked for is not known: a missing answer must not be taken for a "no".
    bool isUnknown = false;
};

// Adds one; the same thing is told once.
void LookErrorAdd(LookErrors *errors, const std::string &path, const std::string &text);

// The same for what makes the answer an unknown one.
void LookUnknownAdd(LookErrors *errors, const std::string &path, const std::string &text);

// Adds all of others.
void LookErrorsAdd(LookErrors *errors, const LookErrors &others);

// Takes the libraries' log from here on.
void LookLogBegin();

// The errors logged since the last call, joined by ": ", the cause first as it was logged first;
// `otherwise` where there were none.
std::string LookLogTake(const std::string &otherwise);
} // namespace vesk
