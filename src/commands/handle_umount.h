// What happens to a volume's pins when it is unmounted.
// Thread rule: for one-shot processes; no lock is taken.
#ifndef COMMANDS_HANDLE_UMOUNT_H
#define COMMANDS_HANDLE_UMOUNT_H

// Changes nothing; always 0.
int HandleSpaceUmount(const char *mountPath);

#endif
