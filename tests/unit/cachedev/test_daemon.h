// The daemon in the private world of a test (see private_world.h), run and used as a script would.
#pragma once

#include "base/scoped_fd.h"

#include <cstddef>
#include <cstdint>
#include <fcntl.h>
#include <json/json.h>
#include <string>
#include <sys/types.h>
#include <vector>

namespace vesk {
constexpr const char *kDaemonFolder = "/run/vesk";
constexpr const char *kDaemonDevice = "/run/vesk/cachedev_0";
constexpr const char *kDaemonState = "/run/vesk/cachedev_0.json";
constexpr const char *kDaemonCached = "/run/vesk/cachedev_0.cached";
constexpr const char *kDaemonBacking = "/run/backing.img";
constexpr const char *kDaemonSsd = "/run/ssd.img";

ScopedFd TestOpen(const char *path, int flags = O_RDWR);

// Runs a command; its exit status, 127 where there is no such one. What it wrote is in DaemonOutput
// and DaemonErrors.
int DaemonCommand(std::vector<std::string> command);
std::string DaemonOutput();
std::string DaemonErrors();

// Starts the daemon on the images, with more options; the exit status of the command.
int DaemonStart(const std::vector<std::string> &more = {});

// Makes the images, the backing one with TestByte content, and starts the daemon.
void DaemonStartFresh(uint64_t deviceBytes, uint64_t slots,
                      const std::vector<std::string> &more = {});

// The daemon's state, and one member of it as compact text.
Json::Value DaemonState();
std::string DaemonStateText(const char *member);

// The process that the state names, seen to run the daemon's program; otherwise -1 and a failure.
pid_t DaemonPid();

// The exit status of a child, or the negative number of the signal that ended it. The daemon is
// one, because orphans of a world become children of its first process. INT_MIN and a failure where
// there is no such child.
int DaemonAwaitEnd(pid_t child);

// Sends the signal to the daemon and awaits its end as above.
int DaemonEnd(int signalNumber);

// Ends the daemon with SIGTERM; its exit status.
int DaemonStop();

// Sends one ioctl to the device: 0 or an errno.
int DaemonRequest(unsigned long number, const void *argument);
int DaemonSetBitmap(const std::vector<uint8_t> &bitmap);

// Sends one of the two query requests: the answer or a negative errno.
int DaemonQuery(unsigned long number);

// Reads with an aligned buffer; "error N" when that fails.
std::string TestReadAt(int fd, uint64_t offset, uint64_t size);
} // namespace vesk
