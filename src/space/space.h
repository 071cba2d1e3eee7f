// Storage spaces (volumes): UUID, reference path, block device path and bitmap file of each.
//
// A reference path is the mount path, the volume's top directory. Every lookup enumerates the
// spaces afresh; nothing is kept between calls. A returned text is malloc'd for the caller (wrap it
// in MallocText); null means not found or, after an error message, failure. Whoever asks for a
// cause is told why.
//
// Thread rule: no state; callable from any thread.
#pragma once

#include "base/log.h"
#include "base/malloc_text.h"

#include <string>
#include <vector>

namespace vesk {
// Why a look-up here or in space/space_cache.h has come to its answer.
enum class SpaceCause {
    Found, // an answer is null or 0 all the same when memory has run out; of pin support: there is
    CannotEnumerate,
    NoSpace,         // no space has this reference path, or none whose UUID can be read this UUID
    NoUuid,          // the space is there, its UUID cannot be read
    NoReferencePath, // a space without one stands before the one that was looked for
    NoCache,         // the cache configuration does not know the space
    NoCacheConfig,   // it cannot be read
    NoSsdPath,       // it names no SSD
    NoCachePath,     // the SSD is there, its cache device is not
    NoCacheStatus,   // as long as a cache is being created, for instance
    CacheNotUp,
    NoPinSupport,
};

char *SpaceGetReferencePath(const char *uuid, SpaceCause *cause = nullptr);
char *SpaceGetDevicePath(const char *referencePath, SpaceCause *cause = nullptr);
char *SpaceGetUUID(const char *referencePath, SpaceCause *cause = nullptr);

// The space's bitmap file, veskcachepinfile.bitmap in its top directory.
char *SpaceGetBitmapPath(const char *uuid);

// The same below this reference path, cut to 511 characters. Null only when memory runs out.
char *BitmapGetPathByReferencePath(const char *referencePath);

// One space, as the platform lists it.
struct SpaceEntry {
    std::string referencePath; // empty: missing
    std::string devicePath;
    std::string uuid; // empty: cannot be read
};

// All spaces in the platform's order. The cause is Found, or CannotEnumerate after an error
// message; then what was listed all the same.
std::vector<SpaceEntry> SpaceList(SpaceCause *cause = nullptr);

// Tells the cause to a caller that has asked for it.
inline void SpaceTell(SpaceCause *asked, SpaceCause cause) {
    if (asked != nullptr) {
        *asked = cause;
    }
}

// Gives the text of a look-up to its owner. Whether there is one: where not, `failure` is logged as
// an error at the caller's place.
bool SpaceTake(char *text, MallocText *owner, const char *failure, const LogPlace &place);
} // namespace vesk
