// What the parts of the object that lets calls fail share.
#ifndef TESTS_FAULTS_FAIL_CALL_H
#define TESTS_FAULTS_FAIL_CALL_H

// Whether this is the call that must fail; sets errno then.
bool FailsNow(const char *kind);

#endif
