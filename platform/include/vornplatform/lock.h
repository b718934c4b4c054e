#ifndef VORNPLATFORM_LOCK_H
#define VORNPLATFORM_LOCK_H

// Opens (creating) the lock file and takes a non-blocking flock, exclusive or shared.
// 1 with *fd set when got; 0 when another holder has it (*fd = -1); -1 on error.
int VLIBCFileLockByFile(const char* path, int exclusive, int* fd);
// Releases and closes a descriptor from VLIBCFileLockByFile. 1 success, 0 failure.
int VLIBCFileUnlockByFile(int fd);
// Closes every lock descriptor of this process (a forked child before exec). 0.
int VLIBCFileCloseLock();

#endif
