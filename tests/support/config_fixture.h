// What the tests of the configuration share: one private configuration file, the service state as
// the service starts with it, and small makers of records and documents.
#pragma once

#include "tests/support/captured_log.h"
#include "tests/support/fake_appliance.h"
#include "tests/support/fake_libc.h"
#include "tests/support/leak_checked_test.h"
#include "tests/support/messages_of.h"
#include "tests/support/ordinary_user.h"
#include "tests/support/temp_dir.h"

#include "request/request_record.h"

#include <gtest/gtest.h>
#include <json/value.h>
#include <string>

namespace vesk {
// The document that a text holds; a text that holds none fails the test.
Json::Value ParseDocument(const std::string &text);

// A request record with NUL-terminated texts.
RequestRecord MakeRecord(int type, const std::string &mountPath, const std::string &data = "");

// Whether nobody holds the service lock. (One that is held is waited for, for half a minute.)
bool ServiceLockIsFree();

class ConfigTest : public LeakCheckedTest {
protected:
    void SetUp() override;
    void TearDown() override; // also: the service lock is free

    // Writes the configuration file, and reads it back: kNoFile where there is none.
    void Store(const std::string &text) const { WriteWhole(path_, text); }
    std::string Stored() const;
    Json::Value StoredDocument() const { return ParseDocument(Stored()); }
    // Whether the file holds this document in the library's styled form.
    void ExpectStored(const std::string &document) const;

    // Creates a file below the volume's top directory; its inode number in decimal.
    std::string CreateFile(const std::string &relativePath) const;

    const TempDir folder_;
    const std::string path_ = folder_.Path("conf.json");
    const std::string volume_ = folder_.Path("volume1"); // a folder
};

inline const char kNoFile[] = "(no file)";

// Two pins on /volume1 (0 is done, 1 is queued) and a reload request.
extern const char kExampleDocument[];
} // namespace vesk
