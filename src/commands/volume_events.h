// What happens to a volume's pins when it is mounted or unmounted.
//
// Pins are kept only while the volume's cache supports pinning: a volume that comes up without such
// a cache loses its records and its bitmap file, so that stale pins never reach a cache made later.
//
// Thread rule: for one-shot processes. The configuration is changed without the service's lock.
#ifndef COMMANDS_VOLUME_EVENTS_H
#define COMMANDS_VOLUME_EVENTS_H

// 0, or -1 after an error message; records already removed stay removed.
int HandleSpaceMount(const char *configPath, const char *mountPath);

// Changes nothing; always 0.
int HandleSpaceUmount(const char *mountPath);

// Deletes the volume's bitmap file; records and driver keep what they have. 0, also when there is
// none, or -1 after an error message.
int DeleteBitmap(const char *mountPath);

#endif
