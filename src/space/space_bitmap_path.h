// Where a volume keeps its pin bitmap: the file veskcachepinfile.bitmap in its top directory.
//
// A returned text is malloc'd for the caller; null means failure. Thread rule: no state.
#pragma once

namespace vesk {

// The path for the space with this UUID. Null after an error message when the space is not there.
char *SpaceGetBitmapPath(const char *uuid);

// The path below this reference path, cut to 511 characters. Null only when memory runs out.
char *BitmapGetPathByReferencePath(const char *referencePath);

} // namespace vesk
