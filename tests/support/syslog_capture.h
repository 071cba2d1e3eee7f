// What the program under test sends to the system log: this test program defines the C library's
// syslog functions itself, so nothing reaches the machine's log.
#pragma once

#include <string>
#include <vector>

namespace vesk {
struct SyslogRecord {
    int priority;
    std::string text; // formatted
};

// Everything since the last clear(), oldest first.
std::vector<SyslogRecord> &SyslogRecords();
} // namespace vesk
