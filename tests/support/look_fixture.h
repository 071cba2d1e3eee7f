// The fixture of tests that look at the world as the companion does: against the fakes, and what
// the libraries log is kept for those who ask for a cause.
#pragma once

#include "model/look_errors.h"
#include "tests/support/leak_checked_test.h"
#include "tests/support/temp_dir.h"

#include <string>
#include <vector>

namespace vesk {
class LookTest : public LeakCheckedTest {
protected:
    void SetUp() override {
        LeakCheckedTest::SetUp();
        LookLogBegin();
        LookLogTake("");
    }
    void TearDown() override {
        LookLogTake("");
        LeakCheckedTest::TearDown();
    }
};

using Texts = std::vector<std::string>;

// Each error as "path: text"; behind them "unknown" where the answer is.
inline Texts TextsOf(const LookErrors &errors) {
    Texts texts;
    for (const LookError &error : errors.list) {
        texts.push_back(error.path + ": " + error.text);
    }
    if (errors.isUnknown) {
        texts.emplace_back("unknown");
    }
    return texts;
}
} // namespace vesk
