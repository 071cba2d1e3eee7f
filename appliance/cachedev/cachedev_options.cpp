#include "cachedev/cachedev_options.h"

#include <cerrno>
#include <cstdlib>
#include <filesystem>
#include <getopt.h>
#include <limits>

namespace vesk {
namespace {
constexpr uint64_t kMostErrno = 4095; // what the kernel takes for an error number
constexpr uint64_t kMostDelayMs = 60000;

enum OptionCode { // above any character
    kDevice = 256,
    kBacking,
    kSsd,
    kMissDelay,
    kForeground,
    kPidFile,
    kFailIoctl,
    kFailRead,
    kShortAt,
    kHelp,
};

const struct option kOptions[] = {
    {"device", required_argument, nullptr, kDevice},
    {"backing", required_argument, nullptr, kBacking},
    {"ssd", required_argument, nullptr, kSsd},
    {"miss-delay-ms", required_argument, nullptr, kMissDelay},
    {"foreground", no_argument, nullptr, kForeground},
    {"pid-file", required_argument, nullptr, kPidFile},
    {"fail-ioctl", required_argument, nullptr, kFailIoctl},
    {"fail-read", required_argument, nullptr, kFailRead},
    {"short-at", required_argument, nullptr, kShortAt},
    {"help", no_argument, nullptr, kHelp},
    {nullptr, 0, nullptr, 0},
};

// A whole text as a number up to `most`: decimal, or hexadecimal after 0x.
bool ParseNumber(const std::string &text, uint64_t most, uint64_t &number) {
    if (text.empty() || text[0] < '0' || text[0] > '9') { // strtoull would take a sign and spaces
        return false;
    }
    char *end = nullptr;
    errno = 0;
    const bool isHex = text.compare(0, 2, "0x") == 0;
    number = strtoull(text.c_str(), &end, isHex ? 16 : 10);
    return errno == 0 && *end == '\0' && number <= most;
}

// NUMBER:ERRNO
bool ParseFault(const std::string &text, uint64_t mostNumber, uint64_t &number, int &error) {
    const size_t colon = text.find(':');
    uint64_t errorNumber = 0;
    if (colon == std::string::npos || !ParseNumber(text.substr(0, colon), mostNumber, number) ||
        !ParseNumber(text.substr(colon + 1), kMostErrno, errorNumber) || errorNumber == 0) {
        return false;
    }
    error = static_cast<int>(errorNumber);
    return true;
}

bool ParseDevice(const std::string &text, CachedevOptions &options) {
    if (text.empty()) {
        return false;
    }
    const std::filesystem::path path = std::filesystem::absolute(text).lexically_normal();
    options.folder = path.parent_path().string();
    options.deviceName = path.filename().string();
    return !options.deviceName.empty() && options.deviceName != "..";
}

bool ParsePidFile(const std::string &text, std::string &pidFile) {
    if (text.empty()) {
        return false;
    }
    pidFile = std::filesystem::absolute(text).string();
    return true;
}

template <typename Number> bool ApplyFault(const std::string &text, std::map<Number, int> &faults) {
    uint64_t number = 0;
    int error = 0;
    if (!ParseFault(text, std::numeric_limits<Number>::max(), number, error)) {
        return false;
    }
    faults[static_cast<Number>(number)] = error;
    return true;
}

bool ApplyMissDelay(const std::string &text, unsigned &milliseconds) {
    uint64_t number = 0;
    if (!ParseNumber(text, kMostDelayMs, number)) {
        return false;
    }
    milliseconds = static_cast<unsigned>(number);
    return true;
}

// Applies one option; false: its value makes no sense.
bool Apply(int code, const std::string &value, CachedevOptions &options) {
    CacheFaults &faults = options.settings.faults;
    switch (code) {
    case kDevice: return ParseDevice(value, options);
    case kBacking: options.backingPath = value; return true;
    case kSsd: options.ssdPath = value; return true;
    case kMissDelay: return ApplyMissDelay(value, options.settings.missDelayMs);
    case kForeground: options.foreground = true; return true;
    case kPidFile: return ParsePidFile(value, options.pidFile);
    case kFailIoctl: return ApplyFault(value, faults.failRequest);
    case kFailRead: return ApplyFault(value, faults.failRead);
    case kShortAt: return ParseNumber(value, UINT64_MAX, faults.shortAt);
    case kHelp: options.help = true; return true;
    default: return false;
    }
}
} // namespace

bool CachedevOptionsParse(int argc, char *const *argv, CachedevOptions &options,
                          std::string &error) {
    options = CachedevOptions();
    optind = 0; // starts getopt afresh, also after an earlier parse
    opterr = 0; // the messages are written here
    int code = 0;
    int index = -1;
    // ':' first: a missing value is told apart from an unknown option.
    while ((code = getopt_long(argc, argv, ":", kOptions, &index)) != -1) {
        if (code == '?' || code == ':') {
            // A letter inside "-xyz" leaves optind where it is.
            const bool isLetter = optopt > 0 && optopt < kDevice;
            error = std::string(code == ':' ? "no value after " : "unknown option ") +
                    (isLetter ? std::string("-") + static_cast<char>(optopt) : argv[optind - 1]);
            return false;
        }
        const std::string value = optarg != nullptr ? optarg : "";
        if (!Apply(code, value, options)) {
            error = "bad value for --" + std::string(kOptions[index].name) + ": " + value;
            return false;
        }
    }
    if (options.help) {
        return true;
    }
    if (optind < argc) {
        error = std::string("unexpected argument ") + argv[optind];
        return false;
    }
    if (options.deviceName.empty() || options.backingPath.empty() || options.ssdPath.empty()) {
        error = "--device, --backing and --ssd are needed";
        return false;
    }
    return true;
}

const char *CachedevUsage() {
    return R"(Usage: veskcachedev --device PATH --backing IMAGE --ssd IMAGE [OPTION]...

Serves an emulated cache device: the file PATH, with a real block cache behind it, and its state
as JSON in PATH.json and as one bit for each cached block in PATH.cached. The folder of PATH becomes
a FUSE mount point; it is created if missing and has to be empty. Goes to the background once the
device can be used.

  --device PATH            the device, for instance /run/vesk/cachedev_0
  --backing IMAGE          what the device holds: a file or block device, its size is the device's
  --ssd IMAGE              where cached blocks of 64 KiB are kept: a file or block device
  --miss-delay-ms N        every block that is not cached takes N milliseconds longer (0 .. 60000)
  --foreground             stay in the foreground
  --pid-file FILE          write the daemon's process id to FILE, remove it at the end
  --help                   show this text

For tests:
  --fail-ioctl NUMBER:ERRNO  refuse that request with that error number; may be repeated
  --fail-read OFFSET:ERRNO   fail reads that touch the byte at OFFSET; may be repeated
  --short-at OFFSET          reads find the end of the device at OFFSET, its size stays as it is

Numbers are decimal, or hexadecimal after 0x. Ends on SIGTERM, SIGINT and when the folder is
unmounted.
)";
}
} // namespace vesk
